#pragma once

#include <cstddef>
#include <cstdint>
#include <sys/fanotify.h>
#include <unistd.h>

namespace marrowdale::native {

// The system calls of fanotify, as they are; a test derives from it for the faults and the bytes
// that no real kernel gives on demand. Any thread.
class FanotifyCalls {
  public:
    FanotifyCalls() = default;
    FanotifyCalls(const FanotifyCalls&) = delete;
    FanotifyCalls& operator=(const FanotifyCalls&) = delete;
    virtual ~FanotifyCalls() = default;

    [[nodiscard]] virtual int init(unsigned flags, unsigned fileFlags) {
        return ::fanotify_init(flags, fileFlags);
    }
    [[nodiscard]] virtual int mark(int group, unsigned flags, std::uint64_t mask, int directory,
                                   const char* path) {
        return ::fanotify_mark(group, flags, mask, directory, path);
    }
    [[nodiscard]] virtual ssize_t read(int group, void* buffer, std::size_t size) {
        return ::read(group, buffer, size);
    }
};

}  // namespace marrowdale::native
