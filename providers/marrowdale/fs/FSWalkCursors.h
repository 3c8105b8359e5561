#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/UUID.h"
#include "providers/marrowdale/fs/FSWalkPosition.h"

namespace marrowdale {

// Which page a cursor belongs to: the token's own fields and the listing that it is a page of. Two
// listings that began at the same event and stand at the same offset, but walk other roots, are
// not mistaken for each other.
struct FSWalkCursorKey {
    UUID deviceUUID;
    std::uint64_t streamEventID = 0;
    std::uint64_t offset = 0;
    std::string container;
    std::vector<std::string> roots;  // paths
    friend bool operator==(const FSWalkCursorKey&, const FSWalkCursorKey&) = default;
};

// Remembers where the walks stood that end in a next page, so that the next page goes on from there
// instead of walking past everything that was delivered. One for a world, because the host may ask
// a fresh enumerator for the next page. A cursor is a convenience: a page whose cursor is gone is
// found by its offset.
//
// The last 64 are kept; taking one leaves it, for a host may ask for a page twice. Any thread.
class FSWalkCursors {
  public:
    static constexpr std::size_t capacity = 64;

    [[nodiscard]] std::optional<FSWalkPosition> find(const FSWalkCursorKey& key) const;
    // Replaces what was remembered for the key; the one remembered longest ago makes room.
    void remember(FSWalkCursorKey key, FSWalkPosition position);

  private:
    struct Entry {
        FSWalkCursorKey key;
        FSWalkPosition position;
    };
    mutable std::mutex mutex_;
    std::deque<Entry> entries_;  // oldest first; guarded by mutex_
};

}  // namespace marrowdale
