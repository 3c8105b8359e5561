#pragma once

#include <cstdint>
#include <memory>
#include <string_view>

#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"
#include "platform/hostframework/FileProviderItem.h"

namespace marrowdale {

// Identifiers of the containers that every provider has.
inline constexpr std::string_view VantrelRootContainerItemIdentifier =
    "VantrelRootContainerItemIdentifier";
inline constexpr std::string_view VantrelWorkingSetContainerItemIdentifier =
    "VantrelWorkingSetContainerItemIdentifier";
inline constexpr std::string_view VantrelAllDirectoriesContainerItemIdentifier =
    "VantrelAllDirectoriesContainerItemIdentifier";
inline constexpr std::string_view VantrelTemporaryLocalFolderItemIdentifier =
    "VantrelTemporaryLocalFolderItemIdentifier";

// The two pages with which a listing begins; every other page is the provider's own bytes.
[[nodiscard]] const Data& VantrelInitialPageSortedByDate();
[[nodiscard]] const Data& VantrelInitialPageSortedByName();

// The format of thumbnails that are icons in the icon service's cached-bitmap form.
inline constexpr std::string_view VantrelThumbnailFormatCachedBitmap =
    "VantrelThumbnailFormatCachedBitmap";

// Codes of ErrorDomain::fileProvider.
enum class FileProviderErrorCode : int {
    noSuchItem = -1001,         // subject: the identifier
    syncAnchorExpired = -1002,  // also an expired page
    filenameCollision = -1003,
    invalidParameter = -1004,  // operation: the parameter; subject: its value
};

// The item in the way, carried by filenameCollision.
struct CollidingItemInfo final : ErrorUserInfo {
    explicit CollidingItemInfo(std::shared_ptr<const FileProviderItem> itemInTheWay)
        : item(std::move(itemInTheWay)) {}
    std::shared_ptr<const FileProviderItem> item;
};

[[nodiscard]] Error errorForNonExistentItem(std::string_view itemIdentifier);
[[nodiscard]] Error errorSyncAnchorExpired();
[[nodiscard]] Error collisionErrorForItem(std::shared_ptr<const FileProviderItem> item);
[[nodiscard]] Error errorInvalidParameter(std::string_view parameter, std::string_view value);

// What an item allows, as bits of FileProviderItem::capabilities.
enum ItemCapability : std::uint64_t {
    allowsReading = 1,
    allowsWriting = 2,
    allowsReparenting = 4,
    allowsRenaming = 8,
    allowsTrashing = 16,
    allowsDeleting = 32,
};

}  // namespace marrowdale
