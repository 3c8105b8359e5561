#include "platform/linux/files/AttributeCache.h"

#include <utility>

namespace marrowdale::native {

namespace {

constexpr std::size_t firstSlots = 16;

std::size_t bytesOf(const FoundAttributes& found) {
    // The set's own allocations, and what shared_ptr puts beside it.
    constexpr std::size_t overhead = 64;
    return found.set ? found.set->memoryUse() + overhead : 0;
}

}  // namespace

AttributeCache::AttributeCache(std::size_t bytes) : mostBytes_(bytes) {}

std::optional<FoundAttributes> AttributeCache::find(const EntryStatus& status,
                                                    std::uint64_t asked) {
    const Key key = keyOf(status, asked);
    const std::uint64_t hash = hashOf(key);
    Shard& shard = shardOf(hash);
    const std::lock_guard lock(shard.mutex);
    if (shard.slots.empty()) {
        return std::nullopt;
    }
    const Slot& slot = shard.slots[placeOf(shard, key, hash)];
    return slot.used && slot.changed == status.changed ? std::optional(slot.found) : std::nullopt;
}

void AttributeCache::insert(const EntryStatus& status, std::uint64_t asked, FoundAttributes found,
                            Date now) {
    if (!isSettled(status.changed, now)) {
        return;
    }
    const Key key = keyOf(status, asked);
    const std::uint64_t hash = hashOf(key);
    Shard& shard = shardOf(hash);
    {
        const std::lock_guard lock(shard.mutex);
        const std::size_t before = shard.bytes;
        put(shard, Slot{key, status.changed, std::move(found), true}, hash);
        bytes_ += shard.bytes - before;
    }
    if (bytes_ > mostBytes_) {
        forgetSome();
    }
}

std::size_t AttributeCache::memoryUse() const {
    return bytes_;
}

AttributeCache::Key AttributeCache::keyOf(const EntryStatus& status, std::uint64_t asked) {
    return {status.fileID, status.birth, asked, status.device};
}

std::uint64_t AttributeCache::hashOf(const Key& key) {
    // Inode numbers follow each other; birth and device hardly differ.
    std::uint64_t hash = raw(key.fileID) ^ (key.asked * 0x9E3779B97F4A7C15U);
    hash = (hash ^ (hash >> 32U)) * 0xD6E8FEB86659FD93U;
    hash = (hash ^ (hash >> 32U) ^ key.birth.nanoseconds) * 0xD6E8FEB86659FD93U;
    return hash ^ (hash >> 32U);
}

// Where the key is, or the free slot where it belongs.
std::size_t AttributeCache::placeOf(const Shard& shard, const Key& key, std::uint64_t hash) {
    const std::size_t mask = shard.slots.size() - 1;
    std::size_t place = hash & mask;
    while (shard.slots[place].used && shard.slots[place].key != key) {
        place = (place + 1) & mask;
    }
    return place;
}

void AttributeCache::put(Shard& shard, Slot slot, std::uint64_t hash) {
    if ((shard.count + 1) * 4 > shard.slots.size() * 3) {
        grow(shard);
    }
    Slot& place = shard.slots[placeOf(shard, slot.key, hash)];
    shard.count += place.used ? 0 : 1;
    shard.bytes += bytesOf(slot.found);
    shard.bytes -= bytesOf(place.found);
    place = std::move(slot);
}

void AttributeCache::grow(Shard& shard) {
    const std::size_t larger = shard.slots.empty() ? firstSlots : shard.slots.size() * 2;
    shard.bytes += (larger - shard.slots.size()) * sizeof(Slot);
    std::vector<Slot> old = std::exchange(shard.slots, std::vector<Slot>(larger));
    for (Slot& slot : old) {
        if (slot.used) {
            const std::size_t place = placeOf(shard, slot.key, hashOf(slot.key));
            shard.slots[place] = std::move(slot);
        }
    }
}

void AttributeCache::forgetSome() {
    for (std::size_t tries = 0; tries < shardCount && bytes_ > mostBytes_; ++tries) {
        Shard& shard = shards_[nextForgotten_++ % shardCount];
        std::vector<Slot> forgotten;
        const std::lock_guard lock(shard.mutex);
        forgotten.swap(shard.slots);
        bytes_ -= std::exchange(shard.bytes, 0);
        shard.count = 0;
    }
}

}  // namespace marrowdale::native
