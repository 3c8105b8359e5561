#include "providers/marrowdale/items/AppLibraryOfURL.h"

#include <algorithm>

namespace marrowdale {

namespace {

std::shared_ptr<const BundleRecord> recordOfLibraryHolding(const Platform& platform,
                                                           const URL& url) {
    std::vector<URL> folders = appLibraryFolders(platform);
    std::erase_if(folders, [&](const URL& folder) {
        return relationship(folder, url) == URLRelationship::other;
    });
    const auto longest = std::ranges::max_element(
        folders, {}, [](const URL& folder) { return folder.standardized().path().size(); });
    return longest == folders.end()
               ? nullptr
               : platform.applications.proxyFor(*longest, URLRelationship::same);
}

}  // namespace

std::vector<URL> appLibraryFolders(const Platform& platform) {
    return platform.applications.documentFolders();
}

std::shared_ptr<LocalAppLibraryItem> appLibraryItemHolding(const Platform& platform,
                                                           const URL& url) {
    const auto record = recordOfLibraryHolding(platform, url);
    return record ? LocalAppLibraryItem::initFrom(platform, *record) : nullptr;
}

}  // namespace marrowdale
