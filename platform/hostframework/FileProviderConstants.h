#pragma once

#include <cstdint>
#include <string_view>

#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"

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

// Codes of ErrorDomain::fileProvider.
enum class FileProviderErrorCode : int {
    noSuchItem = -1001,         // subject: the identifier
    syncAnchorExpired = -1002,  // also an expired page
    filenameCollision = -1003,
    invalidParameter = -1004,  // operation: the parameter; subject: its value
};

[[nodiscard]] Error errorForNonExistentItem(std::string_view itemIdentifier);
[[nodiscard]] Error errorSyncAnchorExpired();

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
