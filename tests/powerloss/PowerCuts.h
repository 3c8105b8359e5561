#pragma once

#include <cstddef>
#include <cstdint>
#include <random>
#include <vector>

#include "tests/powerloss/MemoryFile.h"
#include "tests/powerloss/WriteLog.h"

namespace marrowdale::tests {

// The disk as it may be when power comes back: everything written before the last flush is there;
// of what was written after it any part may be, in any order, each write whole, in part or not at
// all. The log must be complete and outlive this. One thread.
class PowerCuts {
  public:
    // `before`: the disk before the first entry. `atom`: how many bytes the disk writes whole or
    // not at all; the parts of a torn write are multiples of it.
    PowerCuts(const MemoryFile& before, const WriteLog& log, std::size_t atom);

    // The disk when power goes at that position; which of the late writes are on it follows from
    // `seed`. Going through positions in ascending order is quicker.
    [[nodiscard]] MemoryFile at(std::size_t position, std::uint32_t seed);
    // The position right behind the last flush before `position`; 0 when there is none.
    [[nodiscard]] std::size_t lastFlushBefore(std::size_t position) const;
    [[nodiscard]] std::size_t size() const { return entries_.size(); }

  private:
    enum class Fate : std::uint8_t { none, whole, torn };
    void applyUpTo(std::size_t position);
    void apply(const WriteLog::Entry& entry, MemoryFile& disk) const;
    void tear(const WriteLog::Entry& entry, MemoryFile& disk, std::mt19937& random) const;

    const MemoryFile& before_;
    const WriteLog& log_;
    std::size_t atom_;
    std::vector<WriteLog::Entry> entries_;
    MemoryFile lasting_;
    std::size_t applied_ = 0;  // entries that are on `lasting_`
};

}  // namespace marrowdale::tests
