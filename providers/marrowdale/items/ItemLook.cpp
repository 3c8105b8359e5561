#include "providers/marrowdale/items/ItemLook.h"

#include <utility>

#include "providers/marrowdale/items/ItemMetadata.h"
#include "providers/marrowdale/items/LocalItem.h"

namespace marrowdale {

std::vector<std::string> listedAttributeNames() {
    return {std::string(lastUsedDateAttribute), std::string(tagDataAttribute),
            std::string(favoriteRankAttribute)};
}

std::vector<Expected<URL>> looksAt(const Platform& platform, std::span<const URL> urls) {
    static const LookRequest request{.keys = LocalItem::listingKeys(),
                                     .attributeNames = listedAttributeNames(),
                                     .prefetchStatus = true};
    return platform.fileSystem.lookAt(urls, request);
}

URL lookedAt(const Platform& platform, const URL& url) {
    auto looked = looksAt(platform, std::span(&url, 1));
    return looked.front() ? std::move(*looked.front()) : url;
}

}  // namespace marrowdale
