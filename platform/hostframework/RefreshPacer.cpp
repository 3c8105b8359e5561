#include "platform/hostframework/RefreshPacer.h"

#include <algorithm>
#include <optional>
#include <system_error>
#include <thread>
#include <utility>

#include "platform/foundation/FatalError.h"
#include "platform/foundation/Mutex.h"

namespace marrowdale {

namespace {

using Clock = std::chrono::steady_clock;

// Requests that are made together come to be one event.
constexpr std::chrono::milliseconds gathering{10};

}  // namespace

// When events may begin. Shared by the pacer, its thread, and the events that wait on the queue.
class RefreshPacer::Schedule : public std::enable_shared_from_this<Schedule> {
  public:
    Schedule(SerialQueue queue, Clock::duration interval)
        : interval_(interval), queue_(std::move(queue)) {}

    void setBlock(std::function<void()> block) {
        const MutexLock lock(mutex_);
        block_ = std::move(block);
    }
    void resume() {
        const MutexLock lock(mutex_);
        resumed_ = true;
        changed_.notifyAll();
    }
    void signal() {
        const MutexLock lock(mutex_);
        if (!signalled_) {
            nextBegin_ = std::max(nextBegin_, Clock::now() + gathering);
        }
        signalled_ = true;
        changed_.notifyAll();
    }

    // The body of the pacer's thread.
    void serve() {
        while (waitForTurn()) {
            queue_->async([self = shared_from_this()] { self->fire(); });
        }
    }
    void startThread() {
        thread_ = std::thread([self = shared_from_this()] { self->serve(); });
    }
    void close() {
        std::optional<SerialQueue> queue;
        {
            const MutexLock lock(mutex_);
            closed_ = true;
            block_ = nullptr;
            changed_.notifyAll();
        }
        thread_.join();
        // The queue may end with its last copy, and waits for its blocks then.
        std::swap(queue, queue_);
    }

  private:
    // False when the pacer is gone; otherwise an event is to be put on the queue.
    bool waitForTurn() {
        MutexLock lock(mutex_);
        while (!closed_ && !isDue()) {
            if (isWanted()) {
                (void)changed_.waitUntil(lock, nextBegin_);
            } else {
                changed_.wait(lock);
            }
        }
        queued_ = !closed_;
        return !closed_;
    }
    [[nodiscard]] bool isWanted() const MARROWDALE_REQUIRES(mutex_) {
        return resumed_ && signalled_ && !queued_;
    }
    [[nodiscard]] bool isDue() const MARROWDALE_REQUIRES(mutex_) {
        return isWanted() && Clock::now() >= nextBegin_;
    }

    // On the queue.
    void fire() {
        std::function<void()> block;
        {
            const MutexLock lock(mutex_);
            queued_ = false;
            signalled_ = false;
            nextBegin_ = Clock::now() + interval_;
            block = block_;
            changed_.notifyAll();
        }
        if (block) {
            block();
        }
    }

    const Clock::duration interval_;
    std::optional<SerialQueue> queue_;  // the thread's, then `close`'s
    std::thread thread_;
    Mutex mutex_;
    Condition changed_;
    std::function<void()> block_ MARROWDALE_GUARDED_BY(mutex_);
    Clock::time_point nextBegin_ MARROWDALE_GUARDED_BY(mutex_) = Clock::time_point::min();
    bool resumed_ MARROWDALE_GUARDED_BY(mutex_) = false;
    bool signalled_ MARROWDALE_GUARDED_BY(mutex_) = false;
    bool queued_ MARROWDALE_GUARDED_BY(mutex_) = false;  // an event waits on the queue
    bool closed_ MARROWDALE_GUARDED_BY(mutex_) = false;
};

std::unique_ptr<RefreshPacer> RefreshPacer::makePacer(
    std::string_view name, const SerialQueue& queue,
    std::chrono::steady_clock::duration minimumFireInterval) {
    auto schedule = std::make_shared<Schedule>(queue, minimumFireInterval);
    try {
        schedule->startThread();
    } catch (const std::system_error& error) {
        fatalError("no thread for the pacer \"" + std::string(name) + "\": " + error.what());
    }
    return std::unique_ptr<RefreshPacer>(new RefreshPacer(name, std::move(schedule)));
}

RefreshPacer::RefreshPacer(std::string_view name, std::shared_ptr<Schedule> schedule)
    : name_(name), schedule_(std::move(schedule)) {}

RefreshPacer::~RefreshPacer() {
    schedule_->close();
}

void RefreshPacer::setEventBlock(std::function<void()> block) {
    schedule_->setBlock(std::move(block));
}

void RefreshPacer::resume() {
    schedule_->resume();
}

void RefreshPacer::signal() {
    schedule_->signal();
}

}  // namespace marrowdale
