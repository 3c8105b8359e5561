#include "platform/linux/store/StoreLock.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <climits>
#include <fcntl.h>
#include <poll.h>
#include <sys/inotify.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace marrowdale::native {

namespace {

using Clock = std::chrono::steady_clock;
using Deadline = std::optional<Clock::time_point>;

// False when another has it.
Expected<bool> tryLock(const DiskFile& file) {
    struct flock whole{};
    whole.l_type = F_WRLCK;
    whole.l_whence = SEEK_SET;
    if (::fcntl(file.descriptor(), F_OFD_SETLK, &whole) == 0) {
        return true;
    }
    if (errno == EAGAIN || errno == EACCES) {
        return false;
    }
    return Unexpected(errorWithPOSIXCode(errno, "lock", file.path()));
}

// The process number in the file; 0 when there is none (yet).
pid_t ownerOf(const DiskFile& file) {
    std::array<std::byte, 16> room{};
    const auto count = file.read(room, 0);
    pid_t owner = 0;
    if (count) {
        const char* text = reinterpret_cast<const char*>(room.data());
        std::from_chars(text, text + *count, owner);
    }
    return owner;
}

Unexpected held(const DiskFile& file) {
    const pid_t owner = ownerOf(file);
    std::string subject = file.path();
    if (owner > 0) {
        subject += " (held by process " + std::to_string(owner) + ")";
    }
    return Unexpected(errorWithPOSIXCode(EWOULDBLOCK, "lock", subject));
}

int millisecondsUntil(const Deadline& deadline) {
    if (!deadline) {
        return -1;
    }
    const auto left =
        std::chrono::ceil<std::chrono::milliseconds>(*deadline - Clock::now()).count();
    return static_cast<int>(std::clamp<long>(left, 0, INT_MAX));
}

void drain(int descriptor) {
    alignas(inotify_event) std::array<std::byte, 4096> events{};
    while (::read(descriptor, events.data(), events.size()) > 0) {
    }
}

// Sleeps until the owner lets go, ends, or writes its number (which says whose end to wait for).
// An owner that closes unlocks first, so that its closing is seen after the unlocking; of an owner
// that is killed the closing is seen too early, but its end is not.
void waitForOwner(int watch, pid_t owner, int timeout) {
    const UniqueFD process(owner > 0 ? static_cast<int>(::syscall(SYS_pidfd_open, owner, 0)) : -1);
    std::array<pollfd, 2> waits{pollfd{watch, POLLIN, 0}, pollfd{process.get(), POLLIN, 0}};
    // An owner whose end can't be watched (another process namespace) may have let go just behind
    // its closing.
    constexpr int unseenOwnerTimeout = 1000;
    if (!process) {
        timeout = timeout < 0 ? unseenOwnerTimeout : std::min(timeout, unseenOwnerTimeout);
    }
    ::poll(waits.data(), waits.size(), timeout);
    drain(watch);
}

Expected<void> writeOwner(const DiskFile& file) {
    const std::string text = std::to_string(::getpid()) + "\n";
    if (auto cut = file.truncate(0); !cut) {
        return cut;
    }
    return file.write(std::as_bytes(std::span(text)), 0);
}

}  // namespace

Expected<StoreLock> StoreLock::take(const std::string& path,
                                    std::optional<std::chrono::milliseconds> wait,
                                    const std::function<bool()>& isServed) {
    auto file = DiskFile::open(path, O_RDWR | O_CREAT);
    if (!file) {
        return Unexpected(file.error());
    }
    const Deadline deadline = wait ? Deadline(Clock::now() + *wait) : Deadline();
    const UniqueFD watch(::inotify_init1(IN_CLOEXEC | IN_NONBLOCK));
    ::inotify_add_watch(watch.get(), path.c_str(), IN_CLOSE | IN_MODIFY);
    if (isServed) {
        const std::string folder = path.substr(0, path.rfind('/'));
        ::inotify_add_watch(watch.get(), folder.c_str(), IN_CREATE | IN_MOVED_TO | IN_ONLYDIR);
    }
    while (true) {
        const pid_t owner = ownerOf(*file);
        auto locked = tryLock(*file);
        if (!locked) {
            return Unexpected(locked.error());
        }
        if (*locked) {
            break;
        }
        if (isServed && isServed()) {
            return Unexpected(errorWithPOSIXCode(EALREADY, "lock", path));
        }
        const int timeout = millisecondsUntil(deadline);
        if (timeout == 0) {
            return held(*file);
        }
        waitForOwner(watch.get(), owner, timeout);
    }
    if (auto written = writeOwner(*file); !written && written.error().code != ENOSPC) {
        return Unexpected(written.error());
    }
    return StoreLock(std::move(*file));
}

StoreLock::~StoreLock() {
    if (file_) {
        struct flock whole{};
        whole.l_type = F_UNLCK;
        whole.l_whence = SEEK_SET;
        ::fcntl(file_.descriptor(), F_OFD_SETLK, &whole);
    }
}

}  // namespace marrowdale::native
