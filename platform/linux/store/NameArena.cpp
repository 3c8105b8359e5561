#include "platform/linux/store/NameArena.h"

#include <algorithm>
#include <cstring>
#include <limits>

namespace marrowdale::native {

std::uint32_t NameArena::slotSize(std::size_t nameLength) {
    return std::max(smallestSlot, static_cast<std::uint32_t>(nameLength) + 1);
}

std::uint32_t NameArena::takeFresh(std::uint32_t bytes) {
    if (size_ == 0) {
        size_ = 1;  // offset 0 is noName
    }
    std::uint64_t start = size_;
    if (start % blockSize + bytes > blockSize || start == blocks_.size() * std::size_t{blockSize}) {
        start = (start + blockSize - 1) / blockSize * blockSize;
    }
    if (start + bytes > std::numeric_limits<std::uint32_t>::max()) {
        return noName;
    }
    if (start / blockSize >= blocks_.size()) {
        blocks_.push_back(std::make_unique<char[]>(blockSize));  // NOLINT(*-avoid-c-arrays)
    }
    size_ = static_cast<std::uint32_t>(start) + bytes;
    return static_cast<std::uint32_t>(start);
}

std::uint32_t NameArena::add(std::string_view name) {
    const std::uint32_t bytes = slotSize(name.size());
    std::uint32_t offset = freeSlots_[bytes];
    if (offset != noName) {
        std::memcpy(&freeSlots_[bytes], place(offset) + 1, sizeof offset);
        waste_ -= bytes;
    } else {
        offset = takeFresh(bytes);
        if (offset == noName) {
            return noName;
        }
    }
    char* start = place(offset);
    *start = static_cast<char>(name.size());
    std::memcpy(start + 1, name.data(), name.size());
    return offset;
}

void NameArena::remove(std::uint32_t offset) {
    if (offset == noName) {
        return;
    }
    const std::uint32_t bytes = slotSize(at(offset).size());
    std::memcpy(place(offset) + 1, &freeSlots_[bytes], sizeof offset);
    freeSlots_[bytes] = offset;
    waste_ += bytes;
}

std::span<char> NameArena::addBlock(std::uint32_t bytes) {
    blocks_.push_back(std::make_unique<char[]>(blockSize));  // NOLINT(*-avoid-c-arrays)
    size_ = static_cast<std::uint32_t>((blocks_.size() - 1) * blockSize) + bytes;
    return {blocks_.back().get(), bytes};
}

std::span<const char> NameArena::block(std::size_t number) const {
    const std::size_t start = number * blockSize;
    return {blocks_[number].get(), std::min<std::size_t>(blockSize, size_ - start)};
}

bool NameArena::isGood(std::uint32_t offset) const {
    if (offset == noName || offset >= size_) {
        return false;
    }
    const std::string_view name = at(offset);
    return !name.empty() && offset % blockSize + 1 + name.size() <= blockSize &&
           offset + 1 + name.size() <= size_;
}

}  // namespace marrowdale::native
