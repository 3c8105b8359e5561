#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <map>
#include <memory>
#include <set>
#include <thread>
#include <vector>

#include "platform/linux/store/EventHistory.h"
#include "platform/linux/store/Mutex.h"

namespace marrowdale::native {

class StreamCore;

// Wakes the streams of one history: the one thread of them all, which sleeps without a deadline
// while nothing is held back. Streams hold it, so that one that outlives the service ends well. Any
// thread.
class StreamHub {
  public:
    using TimePoint = std::chrono::steady_clock::time_point;

    StreamHub() = default;
    StreamHub(const StreamHub&) = delete;
    StreamHub& operator=(const StreamHub&) = delete;

    // Once, before anything else.
    void open(EventHistory& history);
    // Once. No stream looks at the history when it returns. Waits for one that does.
    void close() MARROWDALE_EXCLUDES(mutex_);

    // Permission to look at the history, as long as it lives. Nothing else is waited for within.
    class Use {
      public:
        explicit Use(StreamHub& hub) : hub_(hub), history_(hub.enter()) {}
        ~Use() { hub_.leave(); }
        Use(const Use&) = delete;
        Use& operator=(const Use&) = delete;
        // Null when the history is closed.
        [[nodiscard]] EventHistory* history() const { return history_; }

      private:
        StreamHub& hub_;
        EventHistory* history_;
    };

    // From now on the stream hears of commits.
    void add(const std::shared_ptr<StreamCore>& stream) MARROWDALE_EXCLUDES(mutex_);
    void remove(const std::shared_ptr<StreamCore>& stream) MARROWDALE_EXCLUDES(mutex_);
    // The stream is to read at that time, or earlier where that was said before.
    void schedule(const std::shared_ptr<StreamCore>& stream, TimePoint when)
        MARROWDALE_EXCLUDES(mutex_);

  private:
    // What the thread has to do next.
    struct Work {
        bool committed = false;
        bool broken = false;
        bool closing = false;
        std::vector<std::shared_ptr<StreamCore>> streams;  // that hear of it
        std::vector<std::shared_ptr<StreamCore>> due;
    };

    [[nodiscard]] EventHistory* enter() MARROWDALE_EXCLUDES(mutex_);
    void leave() MARROWDALE_EXCLUDES(mutex_);
    void take(EventHistory::News news) MARROWDALE_EXCLUDES(mutex_);
    void serve() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Work waitForWork() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] bool hasWork() const MARROWDALE_REQUIRES(mutex_);
    void pass(const Work& work) MARROWDALE_EXCLUDES(mutex_);
    void letGoOfHistory() MARROWDALE_EXCLUDES(mutex_);

    Mutex mutex_;
    std::condition_variable_any changed_;
    std::condition_variable_any unused_;
    EventHistory* history_ MARROWDALE_GUARDED_BY(mutex_) = nullptr;
    bool historyCloses_ MARROWDALE_GUARDED_BY(mutex_) = false;  // it said so itself
    std::uint64_t users_ MARROWDALE_GUARDED_BY(mutex_) = 0;
    bool committed_ MARROWDALE_GUARDED_BY(mutex_) = false;
    bool broken_ MARROWDALE_GUARDED_BY(mutex_) = false;
    bool closing_ MARROWDALE_GUARDED_BY(mutex_) = false;
    std::set<std::shared_ptr<StreamCore>> streams_ MARROWDALE_GUARDED_BY(mutex_);
    std::map<std::shared_ptr<StreamCore>, TimePoint> due_ MARROWDALE_GUARDED_BY(mutex_);
    std::uint64_t listener_ = 0;
    EventHistory* source_ = nullptr;  // where the listener is
    std::thread thread_;
};

}  // namespace marrowdale::native
