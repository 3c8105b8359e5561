#pragma once

#include <memory>
#include <string_view>

#include "providers/marrowdale/items/LocalAppLibraryItem.h"
#include "providers/marrowdale/items/LocalItem.h"

namespace marrowdale {

// The folder directly inside the storage root that VantrelTemporaryLocalFolderItemIdentifier names.
inline constexpr std::string_view temporaryLocalFolderName = ".TemporaryLocalFolder";

// The item of an identifier of any kind: an app library ("#"), the temporary folder (made when it
// is not there), or what the identifier resolves to. Null, after a line in the log, when there is
// none.
[[nodiscard]] std::shared_ptr<LocalItem> itemForIdentifierString(const Platform& platform,
                                                                 std::string_view identifier);

// `identifier` begins with "#".
[[nodiscard]] std::shared_ptr<LocalAppLibraryItem> appLibraryItemForIdentifier(
    const Platform& platform, std::string_view identifier);

}  // namespace marrowdale
