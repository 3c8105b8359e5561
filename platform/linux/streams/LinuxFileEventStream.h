#pragma once

#include <memory>

#include "platform/linux/streams/StreamCore.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::native {

// One stream of LinuxFileEvents: the owner's end of a StreamCore.
class LinuxFileEventStream final : public FileEventStream {
  public:
    explicit LinuxFileEventStream(std::shared_ptr<StreamCore> core) : core_(std::move(core)) {}
    ~LinuxFileEventStream() override {
        core_->stop();
        core_->invalidate();
    }
    LinuxFileEventStream(const LinuxFileEventStream&) = delete;
    LinuxFileEventStream& operator=(const LinuxFileEventStream&) = delete;

    void start() override { core_->start(); }
    void stop() override { core_->stop(); }
    void invalidate() override { core_->invalidate(); }

  private:
    const std::shared_ptr<StreamCore> core_;
};

}  // namespace marrowdale::native
