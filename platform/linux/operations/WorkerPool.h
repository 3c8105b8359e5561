#pragma once

#include <cstddef>
#include <deque>
#include <functional>
#include <thread>
#include <vector>

#include "platform/foundation/Mutex.h"

namespace marrowdale::native {

// Runs blocks on up to as many threads, in the order in which they came. Threads are started as
// they are needed. Any thread may hand blocks over, those of the pool among them.
class WorkerPool {
  public:
    explicit WorkerPool(std::size_t mostThreads) : mostThreads_(mostThreads) {}
    ~WorkerPool() { finish(); }
    WorkerPool(const WorkerPool&) = delete;
    WorkerPool& operator=(const WorkerPool&) = delete;

    // After `finish` the block runs at once, on the caller's thread.
    void async(std::move_only_function<void()> block);
    // Returns when every block was run and the threads have ended. Not from a block of the pool.
    void finish();

  private:
    void work();

    const std::size_t mostThreads_;
    Mutex mutex_;
    Condition changed_;
    std::deque<std::move_only_function<void()>> blocks_ MARROWDALE_GUARDED_BY(mutex_);
    std::vector<std::thread> threads_ MARROWDALE_GUARDED_BY(mutex_);
    std::size_t idle_ MARROWDALE_GUARDED_BY(mutex_) = 0;
    bool isFinished_ MARROWDALE_GUARDED_BY(mutex_) = false;
};

}  // namespace marrowdale::native
