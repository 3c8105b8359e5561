#include "providers/marrowdale/items/ItemForIdentifier.h"

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/ItemLook.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"

namespace marrowdale {

namespace {

std::shared_ptr<LocalItem> temporaryLocalFolderItem(const Platform& platform) {
    const URL url =
        platform.manager.documentStorageURL().appendingPathComponent(temporaryLocalFolderName);
    if (const auto made = platform.fileSystem.createDirectory(url); !made) {
        platform.log.error("can't create temporary directory; " + made.error().description());
        return nullptr;
    }
    return LocalItem::initWithURL(platform, lookedAt(platform, url));
}

}  // namespace

std::shared_ptr<LocalItem> itemForIdentifierString(const Platform& platform,
                                                   std::string_view identifier) {
    if (identifier.starts_with('#')) {
        return appLibraryItemForIdentifier(platform, identifier);
    }
    if (identifier == VantrelTemporaryLocalFolderItemIdentifier) {
        return temporaryLocalFolderItem(platform);
    }
    const auto url = fileURLWithItemIdentifier(platform, identifier);
    return url ? LocalItem::initWithURL(platform, lookedAt(platform, *url)) : nullptr;
}

std::shared_ptr<LocalAppLibraryItem> appLibraryItemForIdentifier(const Platform& platform,
                                                                 std::string_view identifier) {
    identifier.remove_prefix(1);
    const auto record = platform.applications.bundleRecordForIdentifier(identifier);
    return record ? LocalAppLibraryItem::initFrom(platform, *record) : nullptr;
}

}  // namespace marrowdale
