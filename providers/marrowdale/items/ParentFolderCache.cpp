#include "providers/marrowdale/items/ParentFolderCache.h"

#include <algorithm>
#include <utility>
#include <vector>

namespace marrowdale {

namespace {

bool holds(const URL& top, const URL& url) {
    return relationship(top, url) != URLRelationship::other;
}

bool isTopInFolder(const URL& top, const URL& folder) {
    return relationship(folder, top.deletingLastPathComponent()) == URLRelationship::same;
}

bool folderHoldsOrdinaryItems(const Platform& platform, const URL& folder) {
    std::vector<URL> tops = platform.applications.documentFolders();
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
    std::vector<URL> folders = platform.applications.documentFolders();
    std::erase_if(folders, [&](const URL& folder) { return !holds(folder, url); });
    const auto longest = std::ranges::max_element(
        folders, {}, [](const URL& folder) { return folder.standardized().path().size(); });
    if (longest == folders.end()) {
        return std::nullopt;
    }
    const auto record = platform.applications.proxyFor(*longest, URLRelationship::same);
    return record ? record->bundleIdentifier() : std::nullopt;
}

}  // namespace marrowdale
