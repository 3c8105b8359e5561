#include "tests/powerloss/MemoryFile.h"

#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <linux/falloc.h>
#include <sys/mman.h>
#include <system_error>
#include <unistd.h>
#include <vector>

namespace marrowdale::tests {

namespace {

constexpr std::size_t pageSize = 4096;
constexpr std::size_t chunkSize = 1U << 20U;

[[noreturn]] void fail(const char* operation) {
    throw std::system_error(errno, std::generic_category(), operation);
}

}  // namespace

MemoryFile::MemoryFile(std::uint64_t size)
    : descriptor_(::memfd_create("image", MFD_CLOEXEC)), size_(size) {
    if (!descriptor_ || ::ftruncate(descriptor_.get(), static_cast<off_t>(size)) != 0) {
        fail("make a file in memory");
    }
}

std::string MemoryFile::path() const {
    return "/proc/" + std::to_string(::getpid()) + "/fd/" + std::to_string(descriptor_.get());
}

void MemoryFile::write(std::span<const std::byte> bytes, std::uint64_t offset) {
    std::size_t done = 0;
    while (done < bytes.size()) {
        const ssize_t count = ::pwrite(descriptor_.get(), bytes.data() + done, bytes.size() - done,
                                       static_cast<off_t>(offset + done));
        if (count < 0) {
            fail("write to a file in memory");
        }
        done += static_cast<std::size_t>(count);
    }
    size_ = std::max(size_, offset + bytes.size());
}

void MemoryFile::read(std::span<std::byte> into, std::uint64_t offset) const {
    std::size_t done = 0;
    while (done < into.size()) {
        const ssize_t count = ::pread(descriptor_.get(), into.data() + done, into.size() - done,
                                      static_cast<off_t>(offset + done));
        if (count < 0) {
            fail("read from a file in memory");
        }
        if (count == 0) {
            std::ranges::fill(into.subspan(done), std::byte{0});
            break;
        }
        done += static_cast<std::size_t>(count);
    }
}

template <typename Use>
void MemoryFile::forEachStretch(const Use& use) const {
    off_t at = 0;
    while (true) {
        const off_t begin = ::lseek(descriptor_.get(), at, SEEK_DATA);
        if (begin < 0) {
            break;  // ENXIO: nothing but a hole up to the end
        }
        at = ::lseek(descriptor_.get(), begin, SEEK_HOLE);
        use(static_cast<std::uint64_t>(begin), static_cast<std::uint64_t>(at));
    }
}

MemoryFile MemoryFile::copy() const {
    MemoryFile copy(size_);
    std::vector<std::byte> chunk(chunkSize);
    forEachStretch([&](std::uint64_t begin, std::uint64_t end) {
        for (std::uint64_t at = begin; at < end; at += chunk.size()) {
            const auto part =
                std::span(chunk).first(std::min<std::uint64_t>(chunk.size(), end - at));
            read(part, at);
            copy.write(part, at);
        }
    });
    return copy;
}

void MemoryFile::dropZeros() {
    std::vector<std::byte> page(pageSize);
    forEachStretch([&](std::uint64_t begin, std::uint64_t end) {
        for (std::uint64_t at = begin; at < end; at += pageSize) {
            read(page, at);
            if (std::ranges::all_of(page, [](std::byte byte) { return byte == std::byte{0}; }) &&
                ::fallocate(descriptor_.get(), FALLOC_FL_PUNCH_HOLE | FALLOC_FL_KEEP_SIZE,
                            static_cast<off_t>(at), pageSize) != 0) {
                fail("make a hole in a file in memory");
            }
        }
    });
}

}  // namespace marrowdale::tests
