#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <span>

#include "platform/foundation/SerialQueue.h"
#include "platform/linux/store/Mutex.h"
#include "platform/linux/streams/StreamHub.h"
#include "platform/linux/streams/StreamReader.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::native {

// Carries what a StreamReader reads to the stream's queue: never more than one block at a time, so
// whoever is slow holds up only the stream itself. The block reads and then calls back, without any
// lock. Held by the stream, by the hub while it runs, and by the block that waits. Any thread.
class StreamCore : public std::enable_shared_from_this<StreamCore> {
  public:
    StreamCore(std::shared_ptr<StreamHub> hub, FileEventStreamRequest request, Log* log);

    void start();
    void stop() MARROWDALE_EXCLUDES(mutex_);
    void invalidate() MARROWDALE_EXCLUDES(mutex_);

    // For the hub. Puts a block on the queue, if none is there.
    void post() MARROWDALE_EXCLUDES(mutex_);
    // How long to hold the news back; no value when a block is there that will see to it.
    [[nodiscard]] std::optional<std::chrono::milliseconds> noteNews(bool broken)
        MARROWDALE_EXCLUDES(mutex_);
    // No Use is given out any more and none is left.
    void historyIsGone();

  private:
    using Callback = std::function<void(std::span<const FileEvent>)>;

    void run() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] StreamReader::Step read(bool broken);
    void handOver(std::span<const FileEvent> batch) MARROWDALE_EXCLUDES(mutex_);
    void endTurn(bool more) MARROWDALE_EXCLUDES(mutex_);
    void postBlock() MARROWDALE_REQUIRES(mutex_);

    const std::shared_ptr<StreamHub> hub_;
    const std::chrono::milliseconds latency_;
    StreamReader reader_;  // the block's that runs
    Mutex mutex_;
    std::optional<SerialQueue> queue_ MARROWDALE_GUARDED_BY(mutex_);
    std::shared_ptr<const Callback> callback_ MARROWDALE_GUARDED_BY(mutex_);
    bool posted_ MARROWDALE_GUARDED_BY(mutex_) = false;  // a block waits or runs
    bool stopped_ MARROWDALE_GUARDED_BY(mutex_) = false;
    bool news_ MARROWDALE_GUARDED_BY(mutex_) = false;  // since the block began
    bool broken_ MARROWDALE_GUARDED_BY(mutex_) = false;
};

}  // namespace marrowdale::native
