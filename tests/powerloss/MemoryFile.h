#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>

#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::tests {

// A file in memory, sparse: the image of a disk takes the room of what is on it. Gone with the last
// descriptor. Where the system refuses, std::system_error fails the test.
class MemoryFile {
  public:
    explicit MemoryFile(std::uint64_t size);

    [[nodiscard]] int descriptor() const { return descriptor_.get(); }
    // A path under which other programs can open it while this process runs.
    [[nodiscard]] std::string path() const;
    [[nodiscard]] std::uint64_t size() const { return size_; }
    void write(std::span<const std::byte> bytes, std::uint64_t offset);
    // The whole span; zeros behind the end.
    void read(std::span<std::byte> into, std::uint64_t offset) const;
    // Another file with the same bytes.
    [[nodiscard]] MemoryFile copy() const;
    // Gives back the room of pages that hold zeros alone.
    void dropZeros();

  private:
    // Calls `use(begin, end)` for each stretch that may hold something else than zeros.
    template <typename Use>
    void forEachStretch(const Use& use) const;

    native::UniqueFD descriptor_;
    std::uint64_t size_;
};

}  // namespace marrowdale::tests
