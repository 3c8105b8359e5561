#pragma once

#include <mutex>

// Clang's thread-safety annotations; nothing under other compilers.
#if defined(__clang__)
#define MARROWDALE_THREAD_ANNOTATION(x) __attribute__((x))
#else
#define MARROWDALE_THREAD_ANNOTATION(x)
#endif
#define MARROWDALE_CAPABILITY(x) MARROWDALE_THREAD_ANNOTATION(capability(x))
#define MARROWDALE_SCOPED_CAPABILITY MARROWDALE_THREAD_ANNOTATION(scoped_lockable)
#define MARROWDALE_GUARDED_BY(x) MARROWDALE_THREAD_ANNOTATION(guarded_by(x))
#define MARROWDALE_REQUIRES(...) MARROWDALE_THREAD_ANNOTATION(requires_capability(__VA_ARGS__))
#define MARROWDALE_EXCLUDES(...) MARROWDALE_THREAD_ANNOTATION(locks_excluded(__VA_ARGS__))
#define MARROWDALE_ACQUIRE(...) MARROWDALE_THREAD_ANNOTATION(acquire_capability(__VA_ARGS__))
#define MARROWDALE_RELEASE(...) MARROWDALE_THREAD_ANNOTATION(release_capability(__VA_ARGS__))
#define MARROWDALE_NO_THREAD_SAFETY_ANALYSIS MARROWDALE_THREAD_ANNOTATION(no_thread_safety_analysis)

namespace marrowdale::native {

// A std::mutex whose use the compiler checks. Works with std::condition_variable_any.
class MARROWDALE_CAPABILITY("mutex") Mutex {
  public:
    void lock() MARROWDALE_ACQUIRE() { mutex_.lock(); }
    void unlock() MARROWDALE_RELEASE() { mutex_.unlock(); }

  private:
    std::mutex mutex_;
};

// Holds a Mutex from here to the end of the block.
class MARROWDALE_SCOPED_CAPABILITY MutexLock {
  public:
    explicit MutexLock(Mutex& mutex) MARROWDALE_ACQUIRE(mutex) : mutex_(mutex) { mutex_.lock(); }
    ~MutexLock() MARROWDALE_RELEASE() { mutex_.unlock(); }
    MutexLock(const MutexLock&) = delete;
    MutexLock& operator=(const MutexLock&) = delete;

  private:
    Mutex& mutex_;
};

}  // namespace marrowdale::native
