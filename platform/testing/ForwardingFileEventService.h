#pragma once

#include <memory>
#include <utility>

#include "platform/services/FileEventService.h"

namespace marrowdale {

// Hands every call on to another service; derive and override what the test is about.
class ForwardingFileEventService : public FileEventService {
  public:
    explicit ForwardingFileEventService(FileEventService& target) : target_(target) {}

    Expected<EventID> currentEventID() override { return target_.currentEventID(); }
    Expected<UUID> volumeUUID(const URL& url) override { return target_.volumeUUID(url); }
    std::unique_ptr<FileEventStream> makeStream(FileEventStreamRequest request) override {
        return target_.makeStream(std::move(request));
    }

  private:
    FileEventService& target_;
};

}  // namespace marrowdale
