#include "platform/linux/streams/LinuxFileEvents.h"

#include <utility>

#include "platform/linux/streams/LinuxFileEventStream.h"
#include "platform/linux/streams/StreamHub.h"

namespace marrowdale::native {

LinuxFileEvents::LinuxFileEvents(EventHistory& history, Log* log)
    : history_(history), log_(log), hub_(std::make_shared<StreamHub>()) {
    hub_->open(history);
}

LinuxFileEvents::~LinuxFileEvents() {
    hub_->close();
}

Expected<EventID> LinuxFileEvents::currentEventID() {
    return history_.barrier();
}

Expected<UUID> LinuxFileEvents::volumeUUID(const URL& url) {
    return history_.volumeUUID(url);
}

std::unique_ptr<FileEventStream> LinuxFileEvents::makeStream(FileEventStreamRequest request) {
    return std::make_unique<LinuxFileEventStream>(
        std::make_shared<StreamCore>(hub_, std::move(request), log_));
}

}  // namespace marrowdale::native
