#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Platform.h"
#include "platform/foundation/Mutex.h"
#include "platform/foundation/UUID.h"
#include "providers/marrowdale/fs/FSEventReader.h"

namespace marrowdale {

// Tells the host that something changed in the trees of one enumerator, by signalling the working
// set and, but for the working set's own enumerator, the root before it. Never the enumerator's own
// container: a host reads changes through these two.
//
// It is made stopped. From its first start on, everything is signalled that happened since it was
// made, and from a later start what happened since the stop: nobody has to look for what came
// between. Lost events are signalled like a change, because there may have been one.
//
// Any thread. Signals come on the reader's queue, one round for each event.
class FSChangesNotifier : public FSEventReaderDelegate,
                          public std::enable_shared_from_this<FSChangesNotifier> {
    struct Private {};

  public:
    // `urls` is not empty: an empty one is a mistake of the caller and ends the process. Null,
    // after one line in the log, when the history of the first URL's volume can't be read.
    // `platform` lives longer.
    [[nodiscard]] static std::shared_ptr<FSChangesNotifier> make(const Platform& platform,
                                                                 std::string container,
                                                                 const std::vector<URL>& urls);
    FSChangesNotifier(Private, const Platform& platform, std::string container, UUID deviceUUID);
    FSChangesNotifier(const FSChangesNotifier&) = delete;
    FSChangesNotifier& operator=(const FSChangesNotifier&) = delete;
    // Stopped, if it was not.
    ~FSChangesNotifier() override;

    void start();
    // No signal begins once a block begins that was handed to the reader's queue later.
    void stop();

    // Of the volume of the first URL, as it was when the notifier was made.
    [[nodiscard]] const UUID& deviceUUID() const { return deviceUUID_; }
    [[nodiscard]] const std::string& container() const { return container_; }
    [[nodiscard]] const FSEventReader& reader() const { return *reader_; }

    void fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& item,
                                    const FileEvent& event) override;
    void fsEventReaderDidDeleteItem(const std::string& identifier, const std::string& path,
                                    const FileEvent& event) override;
    void fsEventReaderDidFinishHistory(EventID eventID) override;
    void fsEventReaderMustReset() override;

  private:
    enum class Signalling : std::uint8_t { off, on };
    void setShouldSignalChange(Signalling signalling);
    void signalChange() const;
    void signal(std::string_view identifier) const;

    const Platform& platform_;
    const std::string container_;
    std::shared_ptr<FSEventReader> reader_;  // set once, by make
    const UUID deviceUUID_;
    bool shouldSignalChange_ = false;  // touched on the reader's queue alone
    Mutex mutex_;                      // one start or stop at a time
    bool wasStarted_ MARROWDALE_GUARDED_BY(mutex_) = false;
};

}  // namespace marrowdale
