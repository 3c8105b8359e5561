#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <sys/types.h>

#include "platform/linux/events/Watcher.h"

namespace marrowdale::native {

// The reading end of a queue of events, with a buffer of its own. One thread.
class KernelQueue {
  public:
    // As read(2): the number of bytes, or -1 and errno.
    using Read = std::function<ssize_t(void* buffer, std::size_t size)>;
    // Takes what one read gave and counts it.
    using Take = std::function<void(std::span<const std::byte>, Watcher::Drained&)>;

    // `limit`: how many events the kernel keeps at most; 0: any number.
    explicit KernelQueue(std::uint64_t limit) : limit_(limit) {}

    // Reads until the queue is empty, or until more has been read than it could hold when the
    // reading began: whoever never stops making events can't keep the reader from its end. Errors:
    // of the read.
    [[nodiscard]] Expected<Watcher::Drained> drain(const Read& read, const Take& take);

  private:
    static constexpr std::size_t bufferBytes = std::size_t{64} * 1024;

    std::uint64_t limit_;
    std::unique_ptr<std::byte[]> buffer_;  // NOLINT(modernize-avoid-c-arrays)
};

}  // namespace marrowdale::native
