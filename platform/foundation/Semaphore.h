#pragma once

#include <chrono>
#include <cstdint>

#include "platform/foundation/Mutex.h"

namespace marrowdale {

// A counting semaphore without an upper bound. Any thread.
class Semaphore {
  public:
    explicit Semaphore(std::uint64_t count = 0) : count_(count) {}
    void signal();
    void wait();
    // False when the deadline passed first.
    [[nodiscard]] bool waitUntil(std::chrono::steady_clock::time_point deadline);

  private:
    Mutex mutex_;
    Condition changed_;
    std::uint64_t count_ MARROWDALE_GUARDED_BY(mutex_);
};

// Counts work that has begun and not ended; waits for all of it. Any thread.
class WorkGroup {
  public:
    void enter();
    // Ends the process when nothing was entered.
    void leave();
    // Returns once as many leaves as enters were seen.
    void wait();

  private:
    Mutex mutex_;
    Condition changed_;
    std::uint64_t pending_ MARROWDALE_GUARDED_BY(mutex_) = 0;
};

}  // namespace marrowdale
