#include "providers/marrowdale/items/ParentFolderCache.h"

#include <algorithm>
#include <utility>
#include <vector>

#include "providers/marrowdale/items/MRWAppLibraryManager.h"

namespace marrowdale {

namespace {

bool holds(const URL& top, const URL& url) {
    return relationship(top, url) != URLRelationship::other;
}

bool isTopInFolder(const URL& top, const URL& folder) {
    return relationship(folder, top.deletingLastPathComponent()) == URLRelationship::same;
}

bool folderHoldsOrdinaryItems(const Platform& platform, const URL& folder) {
    std::vector<URL> tops = MRWAppLibraryManager::rootURLsForAppLibraries(platform);
    tops.push_back(platform.manager.documentStorageURL());
    return std::ranges::any_of(tops, [&](const URL& top) { return holds(top, folder); }) &&
           std::ranges::none_of(tops, [&](const URL& top) { return isTopInFolder(top, folder); });
}

}  // namespace

ParentFolderCache::Facts& ParentFolderCache::factsFor(const URL& folder) {
    if (!facts_ || !(facts_->folder == folder)) {
        facts_ = Facts{.folder = folder,
                       .identifier = {},
                       .holdsOrdinaryItems = folderHoldsOrdinaryItems(platform_, folder),
                       .bundleIdentifier = {},
                       .knowsBundleIdentifier = false};
    }
    return *facts_;
}

std::optional<std::string> bundleIdentifierOfLibraryWithURL(const Platform& platform,
                                                            const URL& url) {
    const auto record = MRWAppLibraryManager::recordOfLibraryHolding(platform, url);
    return record ? record->bundleIdentifier() : std::nullopt;
}

}  // namespace marrowdale
