#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string_view>
#include <vector>

namespace marrowdale::native {

// Names of 1 to 255 bytes in blocks of 1 MiB, each behind one byte of length. The room of a removed
// name is used again for one that takes as much. Offsets stay good until `clear`.
class NameArena {
  public:
    static constexpr std::uint32_t blockSize = 1U << 20U;
    // Stands for the empty name, which is the root's.
    static constexpr std::uint32_t noName = 0;

    // Offset of the new name. The arena ends at 4 GiB: noName then.
    [[nodiscard]] std::uint32_t add(std::string_view name);
    void remove(std::uint32_t offset);
    [[nodiscard]] std::string_view at(std::uint32_t offset) const {
        if (offset == noName) {
            return {};
        }
        const char* start = blocks_[offset / blockSize].get() + offset % blockSize;
        return {start + 1, static_cast<unsigned char>(*start)};
    }

    // Bytes in use, the waste included; blocks but for the last are counted whole.
    [[nodiscard]] std::uint32_t size() const { return size_; }
    // Bytes of removed names that wait for use.
    [[nodiscard]] std::uint32_t waste() const { return waste_; }
    [[nodiscard]] std::size_t memory() const { return blocks_.size() * std::size_t{blockSize}; }

    // For the snapshot. Room for a block (the last one shorter) that the caller fills; what was
    // free in it is not used again before names are removed anew.
    [[nodiscard]] std::span<char> addBlock(std::uint32_t bytes);
    [[nodiscard]] std::span<const char> block(std::size_t number) const;
    [[nodiscard]] std::size_t blockCount() const { return blocks_.size(); }
    // Whether a whole name stands at the offset, as far as can be seen.
    [[nodiscard]] bool isGood(std::uint32_t offset) const;

  private:
    // A slot must hold a link of the list of free ones.
    static constexpr std::uint32_t smallestSlot = 5;
    [[nodiscard]] static std::uint32_t slotSize(std::size_t nameLength);
    [[nodiscard]] std::uint32_t takeFresh(std::uint32_t bytes);
    [[nodiscard]] char* place(std::uint32_t offset) {
        return blocks_[offset / blockSize].get() + offset % blockSize;
    }

    std::vector<std::unique_ptr<char[]>> blocks_;  // NOLINT(modernize-avoid-c-arrays)
    std::array<std::uint32_t, 257> freeSlots_{};   // by size; 0 ends a list
    std::uint32_t size_ = 0;
    std::uint32_t waste_ = 0;
};

}  // namespace marrowdale::native
