#pragma once

#include <cstddef>
#include <cstdint>
#include <sys/inotify.h>
#include <unistd.h>

namespace marrowdale::native {

// The system calls of inotify, as they are; a test derives from it for the faults and the bytes
// that no real kernel gives on demand. Any thread.
class InotifyCalls {
  public:
    InotifyCalls() = default;
    InotifyCalls(const InotifyCalls&) = delete;
    InotifyCalls& operator=(const InotifyCalls&) = delete;
    virtual ~InotifyCalls() = default;

    [[nodiscard]] virtual int init(int flags) { return ::inotify_init1(flags); }
    [[nodiscard]] virtual int add(int group, const char* path, std::uint32_t mask) {
        return ::inotify_add_watch(group, path, mask);
    }
    [[nodiscard]] virtual int remove(int group, int watch) {
        return ::inotify_rm_watch(group, watch);
    }
    [[nodiscard]] virtual ssize_t read(int group, void* buffer, std::size_t size) {
        return ::read(group, buffer, size);
    }
};

}  // namespace marrowdale::native
