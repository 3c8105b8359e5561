#include "providers/marrowdale/fs/FSNewestDeletion.h"

#include <algorithm>
#include <memory>

#include "platform/foundation/Semaphore.h"
#include "providers/marrowdale/fs/FSEventReader.h"

namespace marrowdale {

namespace {

// Reads a history to its end.
class Finder : public FSEventReaderDelegate {
  public:
    // Touched on the reader's queue alone.
    EventID newest{};
    bool isLost = false;
    Semaphore sema{0};

    // What left and came back left all the same.
    void fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& /*item*/,
                                    const FileEvent& event) override {
        if ((event.flags & FileEventFlag::gone) != 0) {
            newest = std::max(newest, event.id);
        }
    }
    void fsEventReaderDidDeleteItem(const std::string& /*identifier*/, const std::string& /*path*/,
                                    const FileEvent& event) override {
        newest = std::max(newest, event.id);
    }
    void fsEventReaderDidFinishHistory(EventID /*eventID*/) override { sema.signal(); }
    void fsEventReaderMustReset() override {
        isLost = true;
        sema.signal();
    }
};

}  // namespace

std::optional<EventID> newestDeletion(const Platform& platform, const URL& folder, EventID since) {
    const auto finder = std::make_shared<Finder>();
    const auto reader = FSEventReader::make(platform, {.urls = {folder},
                                                       .mode = FSEventReaderMode::pathBased,
                                                       .lastProcessedFSEventID = since,
                                                       .verbose = false,
                                                       .delegate = finder});
    reader->start();
    finder->sema.wait();
    // Behind the batch in which the history ended, so that nothing of it is left out.
    reader->streamQueue().sync([&] { reader->stop(); });
    return finder->isLost ? std::nullopt : std::optional(finder->newest);
}

}  // namespace marrowdale
