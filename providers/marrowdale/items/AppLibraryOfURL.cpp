#include "providers/marrowdale/items/AppLibraryOfURL.h"

#include "providers/marrowdale/items/MRWAppLibraryManager.h"

namespace marrowdale {

std::shared_ptr<LocalAppLibraryItem> appLibraryItemHolding(const Platform& platform,
                                                           const URL& url) {
    const auto record = MRWAppLibraryManager::recordOfLibraryHolding(platform, url);
    return record ? LocalAppLibraryItem::initFrom(platform, *record) : nullptr;
}

}  // namespace marrowdale
