#pragma once

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <vector>

#include "platform/foundation/AttributeSet.h"
#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

// What one look at a file's attributes found.
struct FoundAttributes {
    std::shared_ptr<const AttributeSet> set;  // null: the file has none of those asked for
    bool hasAccessList = false;
};

// Remembers the attributes of files, by who they are (device, inode number, birth) and which names
// were asked for; good as long as the file's change time is the same, for every change of an
// attribute changes it. Bounded in bytes: when they are used up, a part of the table is forgotten,
// chosen in turn, so that a walk over more files than there is room for still finds some of them. A
// file without attributes costs one slot.
//
// Any thread.
class AttributeCache {
  public:
    static constexpr std::size_t defaultBytes = std::size_t{128} << 20U;

    explicit AttributeCache(std::size_t bytes = defaultBytes);

    // `asked` is a fingerprint of the names asked for.
    [[nodiscard]] std::optional<FoundAttributes> find(const EntryStatus& status,
                                                      std::uint64_t asked);

    // Remembers what was read after `status` was taken. A file whose change time is younger than
    // the file system's clock can tell apart (10 ms before `now`, which was taken no later than
    // `status`) is not remembered: it may have changed once more under the same time.
    void insert(const EntryStatus& status, std::uint64_t asked, FoundAttributes found, Date now);

    [[nodiscard]] std::size_t memoryUse() const;

  private:
    struct Key {
        FileID fileID{};
        Date birth;
        std::uint64_t asked = 0;
        DeviceID device{};
        friend bool operator==(const Key&, const Key&) = default;
    };
    struct Slot {
        Key key;
        Date changed;
        FoundAttributes found;
        bool used = false;
    };
    // An open-addressed table that only grows, until it is thrown away; guarded by its mutex.
    struct Shard {
        mutable std::mutex mutex;
        std::vector<Slot> slots;  // a power of two of them, or none
        std::size_t count = 0;
        std::size_t bytes = 0;
    };
    static constexpr std::size_t shardCount = 64;

    [[nodiscard]] static std::size_t placeOf(const Shard& shard, const Key& key,
                                             std::uint64_t hash);
    static void put(Shard& shard, Slot slot, std::uint64_t hash);
    static void grow(Shard& shard);
    void forgetSome();

    [[nodiscard]] static Key keyOf(const EntryStatus& status, std::uint64_t asked);
    [[nodiscard]] static std::uint64_t hashOf(const Key& key);
    [[nodiscard]] Shard& shardOf(std::uint64_t hash) { return shards_[hash >> 58U]; }

    std::size_t mostBytes_;
    std::atomic<std::size_t> bytes_ = 0;
    std::atomic<std::size_t> nextForgotten_ = 0;  // counts shards that were thrown away
    std::array<Shard, shardCount> shards_;
};

}  // namespace marrowdale::native
