#include "host/daemon/TrashWatch.h"

#include <algorithm>
#include <span>
#include <utility>

#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

constexpr std::string_view trashName = ".Trash";

std::vector<std::string> trashesIn(const std::vector<std::string>& documentsFolders) {
    std::vector<std::string> trashes;
    for (const std::string& folder : documentsFolders) {
        trashes.push_back(folder + (folder.ends_with('/') ? "" : "/") + std::string(trashName));
    }
    return trashes;
}

// That older events have been told is no news of a trash; that some were lost may be.
bool isNews(const FileEvent& event) {
    return event.flags != FileEventFlag::historyDone;
}

}  // namespace

TrashWatch::TrashWatch(FileEventService& events, SignalHub& signals, Log& log,
                       const std::vector<std::string>& documentsFolders) {
    const auto since = events.currentEventID();
    if (!since) {
        log.error("the trash can't be watched; " + since.error().description());
        return;
    }
    FileEventStreamRequest request{.paths = trashesIn(documentsFolders),
                                   .device = {},
                                   .since = *since,
                                   .queue = queue_,
                                   .callback = [&signals](std::span<const FileEvent> batch) {
                                       if (std::ranges::any_of(batch, isNews)) {
                                           signals.signal(VantrelWorkingSetContainerItemIdentifier);
                                       }
                                   }};
    stream_ = events.makeStream(std::move(request));
    if (!stream_) {
        log.error("the trash can't be watched; the system has no means for another stream");
        return;
    }
    stream_->start();
}

TrashWatch::~TrashWatch() {
    if (stream_) {
        stream_->stop();
        queue_.sync([] {});
        stream_->invalidate();
    }
}

}  // namespace marrowdale::host
