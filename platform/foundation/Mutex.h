#pragma once

#include <chrono>
#include <condition_variable>
#include <mutex>

// A mutex whose use clang checks (-Wthread-safety): a member that is marked as guarded can only be
// touched where the mutex is provably held. Other compilers see plain standard types.
#if defined(__clang__)
#define MARROWDALE_THREAD_SAFETY(attribute) __attribute__((attribute))
#else
#define MARROWDALE_THREAD_SAFETY(attribute)
#endif
// On a member: only touched with `mutex` held.
#define MARROWDALE_GUARDED_BY(mutex) MARROWDALE_THREAD_SAFETY(guarded_by(mutex))
// On a function: only called with `mutex` held.
#define MARROWDALE_REQUIRES(mutex) MARROWDALE_THREAD_SAFETY(requires_capability(mutex))

namespace marrowdale {

class MARROWDALE_THREAD_SAFETY(capability("mutex")) Mutex {
  private:
    friend class MutexLock;
    std::mutex mutex_;
};

// Holds a mutex from construction to destruction.
class MARROWDALE_THREAD_SAFETY(scoped_lockable) MutexLock {
  public:
    explicit MutexLock(Mutex& mutex) MARROWDALE_THREAD_SAFETY(acquire_capability(mutex))
        : lock_(mutex.mutex_) {}
    ~MutexLock() MARROWDALE_THREAD_SAFETY(release_capability()) = default;
    MutexLock(const MutexLock&) = delete;
    MutexLock& operator=(const MutexLock&) = delete;

  private:
    friend class Condition;
    std::unique_lock<std::mutex> lock_;
};

// What threads that hold a mutex wait for. Waits end for no reason at times: wait in a loop that
// looks at the condition itself. (There is no form with a predicate, because the check does not
// follow the mutex into one.)
class Condition {
  public:
    void notifyOne() { changed_.notify_one(); }
    void notifyAll() { changed_.notify_all(); }
    // Gives the mutex up while it waits.
    void wait(MutexLock& lock) { changed_.wait(lock.lock_); }
    // False once the deadline has passed.
    [[nodiscard]] bool waitUntil(MutexLock& lock, std::chrono::steady_clock::time_point deadline) {
        return changed_.wait_until(lock.lock_, deadline) == std::cv_status::no_timeout;
    }

  private:
    std::condition_variable changed_;
};

}  // namespace marrowdale
