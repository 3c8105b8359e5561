#include "platform/linux/operations/WorkerPool.h"

#include <utility>

namespace marrowdale::native {

void WorkerPool::async(std::move_only_function<void()> block) {
    {
        const MutexLock lock(mutex_);
        if (!isFinished_) {
            blocks_.push_back(std::move(block));
            if (blocks_.size() > idle_ && threads_.size() < mostThreads_) {
                threads_.emplace_back([this] { work(); });
            }
            changed_.notifyOne();
            return;
        }
    }
    block();
}

void WorkerPool::finish() {
    std::vector<std::thread> threads;
    {
        const MutexLock lock(mutex_);
        isFinished_ = true;
        threads.swap(threads_);
        changed_.notifyAll();
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

void WorkerPool::work() {
    while (true) {
        std::move_only_function<void()> block;
        {
            MutexLock lock(mutex_);
            ++idle_;
            while (blocks_.empty() && !isFinished_) {
                changed_.wait(lock);
            }
            --idle_;
            if (blocks_.empty()) {
                return;
            }
            block = std::move(blocks_.front());
            blocks_.pop_front();
        }
        block();
    }
}

}  // namespace marrowdale::native
