#include "platform/foundation/Semaphore.h"

#include "platform/foundation/FatalError.h"

// Every notification is made under the lock: a waiter may destroy the object as soon as it returns.

namespace marrowdale {

void Semaphore::signal() {
    const MutexLock lock(mutex_);
    ++count_;
    changed_.notifyOne();
}

void Semaphore::wait() {
    MutexLock lock(mutex_);
    while (count_ == 0) {
        changed_.wait(lock);
    }
    --count_;
}

bool Semaphore::waitUntil(std::chrono::steady_clock::time_point deadline) {
    MutexLock lock(mutex_);
    bool isInTime = true;
    while (count_ == 0 && isInTime) {
        isInTime = changed_.waitUntil(lock, deadline);
    }
    if (count_ == 0) {
        return false;
    }
    --count_;
    return true;
}

void WorkGroup::enter() {
    const MutexLock lock(mutex_);
    ++pending_;
}

void WorkGroup::leave() {
    const MutexLock lock(mutex_);
    if (pending_ == 0) {
        fatalError("a work group was left more often than entered");
    }
    if (--pending_ == 0) {
        changed_.notifyAll();
    }
}

void WorkGroup::wait() {
    MutexLock lock(mutex_);
    while (pending_ > 0) {
        changed_.wait(lock);
    }
}

}  // namespace marrowdale
