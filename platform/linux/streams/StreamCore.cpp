#include "platform/linux/streams/StreamCore.h"

#include <utility>

namespace marrowdale::native {

StreamCore::StreamCore(std::shared_ptr<StreamHub> hub, FileEventStreamRequest request, Log* log)
    : hub_(std::move(hub)),
      latency_(request.latency),
      reader_(std::move(request.paths), request.device, request.since, log),
      queue_(std::move(request.queue)),
      callback_(std::make_shared<const Callback>(std::move(request.callback))) {}

void StreamCore::start() {
    // Before the barrier, so that no commit falls between.
    hub_->add(shared_from_this());
    post();
}

void StreamCore::stop() {
    {
        const MutexLock lock(mutex_);
        stopped_ = true;
    }
    hub_->remove(shared_from_this());
}

void StreamCore::invalidate() {
    // They go without the lock: the queue may wait for its blocks, and they take it.
    std::optional<SerialQueue> queue;
    std::shared_ptr<const Callback> callback;
    const MutexLock lock(mutex_);
    queue_.swap(queue);
    callback_.swap(callback);
}

void StreamCore::post() {
    const MutexLock lock(mutex_);
    if (!posted_ && !stopped_ && queue_) {
        postBlock();
    }
}

void StreamCore::postBlock() {
    posted_ = true;
    queue_->async([self = shared_from_this()] { self->run(); });
}

std::optional<std::chrono::milliseconds> StreamCore::noteNews(bool broken) {
    const MutexLock lock(mutex_);
    news_ = true;
    broken_ = broken_ || broken;
    if (posted_ || stopped_) {
        return std::nullopt;
    }
    return broken_ ? std::chrono::milliseconds(0) : latency_;
}

void StreamCore::historyIsGone() {
    reader_.releaseCursor();
    const MutexLock lock(mutex_);
    news_ = true;
    if (!posted_ && !stopped_ && queue_) {
        postBlock();
    }
}

void StreamCore::run() {
    bool broken = false;
    {
        const MutexLock lock(mutex_);
        if (stopped_) {
            posted_ = false;
            return;
        }
        news_ = false;
        broken = std::exchange(broken_, false);
    }
    const StreamReader::Step step = read(broken);
    if (broken && !step.toldBroken) {
        const MutexLock lock(mutex_);
        broken_ = true;
    }
    if (!step.batch.empty()) {
        handOver(step.batch);
    }
    endTurn(step.more);
}

StreamReader::Step StreamCore::read(bool broken) {
    const StreamHub::Use use(*hub_);
    return use.history() != nullptr ? reader_.next(*use.history(), broken) : reader_.close();
}

void StreamCore::handOver(std::span<const FileEvent> batch) {
    std::shared_ptr<const Callback> callback;
    {
        const MutexLock lock(mutex_);
        if (stopped_) {
            return;
        }
        callback = callback_;
    }
    if (callback) {
        (*callback)(batch);
    }
}

void StreamCore::endTurn(bool more) {
    {
        const MutexLock lock(mutex_);
        posted_ = false;
        if (stopped_ || !queue_) {
            return;
        }
        if (more) {
            postBlock();
            return;
        }
        if (!news_) {
            return;
        }
    }
    hub_->schedule(shared_from_this(), std::chrono::steady_clock::now() + latency_);
}

}  // namespace marrowdale::native
