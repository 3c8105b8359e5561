#include "providers/marrowdale/apps/DefaultApplicationContainer.h"

#include <string>
#include <utility>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/LocalAppLibraryItem.h"

namespace marrowdale {

Expected<FileProviderItemPtr> defaultApplicationContainer(const Platform& platform,
                                                          std::string_view bundleIdentifier) {
    const LogSection section(
        platform.log, [&] { return "default location for " + std::string(bundleIdentifier); });
    const auto invalid = [&] {
        return Unexpected(errorInvalidParameter("bundleIdentifier", bundleIdentifier));
    };
    const auto record = platform.applications.bundleRecordForIdentifier(bundleIdentifier);
    if (!record) {
        platform.log.error("can't create bundle proxy with '" + std::string(bundleIdentifier) +
                           "'");
        return invalid();
    }
    auto item = LocalAppLibraryItem::initFrom(platform, *record);
    if (!item) {
        platform.log.error("can't create an app library item with " + description(*record));
        return invalid();
    }
    return FileProviderItemPtr(std::move(item));
}

}  // namespace marrowdale
