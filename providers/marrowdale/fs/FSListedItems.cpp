#include "providers/marrowdale/fs/FSListedItems.h"

#include <utility>

#include "providers/marrowdale/items/ParentFolderCache.h"

namespace marrowdale {

std::vector<std::shared_ptr<LocalItem>> itemsOfListing(const Platform& platform,
                                                       const std::vector<URL>& urls) {
    ParentFolderCache parents(platform);
    const LocalItem::Options options{.customItemID = {},
                                     .customParentItemID = {},
                                     .customFilename = {},
                                     .hasLumenoDomainIdentifier = true,
                                     .bundleIdentifier = {}};
    std::vector<std::shared_ptr<LocalItem>> items;
    items.reserve(urls.size());
    for (const URL& url : urls) {
        if (auto item = LocalItem::initWithURL(platform, url, options, &parents)) {
            items.push_back(std::move(item));
        }
    }
    return items;
}

}  // namespace marrowdale
