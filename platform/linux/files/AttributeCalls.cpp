#include "platform/linux/files/AttributeCalls.h"

#include <cerrno>
#include <condition_variable>
#include <fcntl.h>
#include <mutex>
#include <sched.h>
#include <sys/syscall.h>
#include <sys/xattr.h>
#include <thread>
#include <unistd.h>

namespace marrowdale::native {

namespace {

// Younger than the system's headers; the numbers are the same on every architecture we build for.
#ifdef SYS_getxattrat
constexpr long getxattrat = SYS_getxattrat;
constexpr long listxattrat = SYS_listxattrat;
#else
constexpr long getxattrat = 464;
constexpr long listxattrat = 465;
#endif

// The kernel's struct xattr_args.
struct ValueArguments {
    std::uint64_t value;
    std::uint32_t size;
    std::uint32_t flags;
};

AttributeCalls::Method bestMethod() {
    // Refused by a filter counts as missing too.
    const long answer = ::syscall(listxattrat, AT_FDCWD, "/", AT_SYMLINK_NOFOLLOW, nullptr, 0UL);
    return answer >= 0 || errno == EOPNOTSUPP ? AttributeCalls::Method::relativeCalls
                                              : AttributeCalls::Method::worker;
}

}  // namespace

ssize_t AttributeCalls::InFolder::list(const char* name, std::span<char> buffer) const {
    if (error_ != 0) {
        errno = error_;
        return -1;
    }
    if (how_ == How::relative) {
        return ::syscall(listxattrat, directory_, name, AT_SYMLINK_NOFOLLOW, buffer.data(),
                         buffer.size());
    }
    return ::llistxattr(name, buffer.data(), buffer.size());
}

ssize_t AttributeCalls::InFolder::get(const char* name, const char* attribute,
                                      std::span<std::uint8_t> buffer) const {
    if (error_ != 0) {
        errno = error_;
        return -1;
    }
    if (how_ == How::relative) {
        ValueArguments arguments{reinterpret_cast<std::uintptr_t>(buffer.data()),
                                 static_cast<std::uint32_t>(buffer.size()), 0};
        return ::syscall(getxattrat, directory_, name, AT_SYMLINK_NOFOLLOW, attribute, &arguments,
                         sizeof arguments);
    }
    return ::lgetxattr(name, attribute, buffer.data(), buffer.size());
}

// Runs one function after the other on a thread with a current directory of its own.
class AttributeCalls::Worker {
  public:
    Worker() : thread_([this] { loop(); }) {}
    ~Worker() {
        {
            const std::lock_guard lock(mutex_);
            stopping_ = true;
        }
        changed_.notify_all();
        thread_.join();
    }
    Worker(const Worker&) = delete;
    Worker& operator=(const Worker&) = delete;

    // `job` gets 0 where the folder is the current one, else why it is not.
    void run(int directory, const std::function<void(int error)>& job) {
        const std::lock_guard turn(turn_);
        std::unique_lock lock(mutex_);
        directory_ = directory;
        job_ = &job;
        changed_.notify_all();
        changed_.wait(lock, [this] { return job_ == nullptr; });
    }

  private:
    void loop() {
        const int refused = ::unshare(CLONE_FS) == 0 ? 0 : errno;
        std::unique_lock lock(mutex_);
        while (true) {
            changed_.wait(lock, [this] { return stopping_ || job_ != nullptr; });
            if (stopping_) {
                return;
            }
            (*job_)(refused != 0 ? refused : enter(directory_));
            leave(refused);
            job_ = nullptr;
            changed_.notify_all();
        }
    }
    // A current directory would keep the folder's file system busy. Where "/" can't be entered, the
    // next job leaves the folder.
    static void leave(int refused) {
        [[maybe_unused]] const bool left = refused == 0 && ::chdir("/") == 0;
    }
    static int enter(int directory) { return ::fchdir(directory) == 0 ? 0 : errno; }

    std::mutex turn_;  // one job at a time
    std::mutex mutex_;
    std::condition_variable changed_;
    int directory_ = -1;                             // guarded by mutex_
    const std::function<void(int)>* job_ = nullptr;  // guarded by mutex_
    bool stopping_ = false;                          // guarded by mutex_
    std::thread thread_;
};

AttributeCalls::AttributeCalls(std::optional<Method> method)
    : method_(method.value_or(bestMethod())) {
    if (method_ == Method::worker) {
        worker_ = std::make_unique<Worker>();
    }
}

AttributeCalls::~AttributeCalls() = default;

void AttributeCalls::inFolder(int directory, const std::function<void(const InFolder&)>& body) {
    using How = InFolder::How;
    if (directory == AT_FDCWD) {
        body(InFolder(AT_FDCWD, How::byPath, 0));
    } else if (!worker_) {
        body(InFolder(directory, How::relative, 0));
    } else {
        worker_->run(directory, [&](int error) { body(InFolder(AT_FDCWD, How::byPath, error)); });
    }
}

}  // namespace marrowdale::native
