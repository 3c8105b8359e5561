#include "host/daemon/ToldLibraries.h"

#include <algorithm>

#include "host/daemon/AnchorVersions.h"

namespace marrowdale::host {

namespace {

// Identifiers of app libraries begin so.
constexpr char libraryPrefix = '#';

}  // namespace

void ToldLibraries::complete(const Data& since, ItemChanges& changes) {
    const auto before = libraryVersionIn(since);
    const auto now = libraryVersionIn(changes.anchor);
    if (!before || !now || before == now) {
        return;
    }
    // Whoever is brought to another version is told of all libraries in it.
    Identifiers told;
    for (const auto& item : changes.updated) {
        if (item->itemIdentifier.starts_with(libraryPrefix)) {
            told.insert(item->itemIdentifier);
        }
    }
    const std::lock_guard lock(mutex_);
    for (const std::string& identifier : byVersion_[*before]) {
        if (!told.contains(identifier) &&
            std::ranges::find(changes.deleted, identifier) == changes.deleted.end()) {
            changes.deleted.push_back(identifier);
        }
    }
    byVersion_[*now].merge(told);
    while (byVersion_.size() > most) {
        byVersion_.erase(byVersion_.begin());
    }
}

}  // namespace marrowdale::host
