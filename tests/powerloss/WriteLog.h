#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "tests/powerloss/MemoryFile.h"

namespace marrowdale::tests {

// What a disk was told, in order. It lies in memory that a process shares with its children, so one
// of them can fill it while the other reads. One thread adds; any may read what was added.
class WriteLog {
  public:
    struct Entry {
        enum class Kind : std::uint32_t {
            write,
            flush,  // everything before it lasts from here on
        };
        Kind kind = Kind::write;
        std::uint32_t length = 0;
        std::uint64_t offset = 0;    // on the disk
        std::uint64_t contents = 0;  // where the bytes are in this log
    };

    WriteLog();

    void addWrite(std::span<const std::byte> bytes, std::uint64_t offset);
    void addFlush();

    // How many entries there are. A position in the log is the number of entries before it.
    [[nodiscard]] std::size_t size() const { return shared_->count.load(); }
    [[nodiscard]] std::vector<Entry> entries() const;
    [[nodiscard]] std::vector<std::byte> contents(const Entry& entry) const;

  private:
    struct Shared {
        std::atomic<std::size_t> count;
        std::uint64_t end;  // of the bytes, for the one who adds
    };
    struct Unmap {
        void operator()(Shared* shared) const;
    };

    void add(Entry entry, std::span<const std::byte> bytes);

    MemoryFile file_;
    std::unique_ptr<Shared, Unmap> shared_;
};

}  // namespace marrowdale::tests
