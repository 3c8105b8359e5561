#include "providers/marrowdale/fs/FSWalkCursors.h"

#include <algorithm>
#include <utility>

namespace marrowdale {

std::optional<FSWalkPosition> FSWalkCursors::find(const FSWalkCursorKey& key) const {
    const std::lock_guard lock(mutex_);
    const auto entry = std::ranges::find(entries_, key, &Entry::key);
    return entry == entries_.end() ? std::nullopt : std::optional(entry->position);
}

void FSWalkCursors::remember(FSWalkCursorKey key, FSWalkPosition position) {
    const std::lock_guard lock(mutex_);
    std::erase_if(entries_, [&](const Entry& entry) { return entry.key == key; });
    if (entries_.size() == capacity) {
        entries_.pop_front();
    }
    entries_.push_back({std::move(key), std::move(position)});
}

}  // namespace marrowdale
