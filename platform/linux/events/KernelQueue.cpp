#include "platform/linux/events/KernelQueue.h"

#include <cerrno>

namespace marrowdale::native {

Expected<Watcher::Drained> KernelQueue::drain(const Read& read, const Take& take) {
    if (!buffer_) {
        buffer_ = std::make_unique_for_overwrite<std::byte[]>(bufferBytes);  // NOLINT(*-c-arrays)
    }
    // The record of an overflow comes beside the limit.
    const std::uint64_t enough = limit_ == 0 ? UINT64_MAX : limit_ + 1;
    Watcher::Drained drained;
    while (drained.events < enough) {
        const ssize_t count = read(buffer_.get(), bufferBytes);
        if (count > 0) {
            take({buffer_.get(), static_cast<std::size_t>(count)}, drained);
            continue;
        }
        const int code = count == 0 ? EIO : errno;
        if (code == EAGAIN) {
            break;
        }
        if (code != EINTR) {
            return Unexpected(errorWithPOSIXCode(code, "read the kernel's events", {}));
        }
    }
    return drained;
}

}  // namespace marrowdale::native
