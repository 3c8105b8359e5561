#pragma once

#include <cstdint>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Log.h"
#include "platform/foundation/PropertyList.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/files/LinuxApplicationSupport.h"

namespace marrowdale::host {

// Notices when the extension's list of app libraries was lost, damaged or restored. Such a list is
// made anew by the next refresh, and its versions begin again from 1; an anchor from before would
// then stand for another list than its holder was told of. So the history gets another UUID, which
// every anchor carries, and all of them are expired.
//
// So it is when applications declare other packages than before: what was a folder is one document
// then, or the other way round, and nothing else tells of that.
//
// What the list was when it was last seen is kept in the state folder; when that is lost, the UUID
// is another one as well. Any thread.
class LibraryWitness {
  public:
    // Looks at the list, before the extension does. One that does not go on from what was seen is
    // removed, and so is what the working set knew of it, which could not be told from what is to
    // come. `dataHome`: where the extension keeps its lists; `packageExtensions`: those that count
    // in this run. The log may be null.
    LibraryWitness(const std::string& stateFolder, const std::string& dataHome,
                   const std::vector<std::string>& packageExtensions, Log* log);

    // The UUID that a history has for holders of anchors.
    [[nodiscard]] UUID marked(const UUID& history) const;

    // Looks at the list again, after a refresh.
    void lookAgain();

  private:
    // One state of the list.
    struct Seen {
        std::uint64_t version = 0;  // 0: there was none, or none that could be read
        std::uint64_t size = 0;
        std::uint64_t checksum = 0;

        [[nodiscard]] bool goesOnFrom(const Seen& earlier) const;
        friend bool operator==(const Seen&, const Seen&) = default;
    };
    [[nodiscard]] Seen look();
    [[nodiscard]] bool readWitness();
    void write();

    Log* const log_;
    native::LinuxApplicationSupport state_;
    native::LinuxApplicationSupport lists_;
    const PropertyList packages_;
    const URL witnessURL_;
    const URL mainListURL_;
    const URL workingSetListURL_;
    mutable std::mutex mutex_;
    bool arePackagesKnown_ = false;  // whether they were the same when the list was last seen
    UUID mark_;                      // guarded by mutex_
    Seen seen_;                      // guarded by mutex_
    bool isLost_ = false;  // in this run; what is on disk stays as it was, for the next. By mutex_
};

}  // namespace marrowdale::host
