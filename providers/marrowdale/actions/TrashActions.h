#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderActions.h"

// Into the trash, back from it, and away for good. The trash of an item is the folder ".Trash" in
// the outermost folder named "Documents" on its path. As the other actions, these need the platform
// until they have answered.

namespace marrowdale {

void trashItem(const Platform& platform, std::string_view itemIdentifier,
               ItemCompletionHandler handler);
void untrashItem(const Platform& platform, std::string_view itemIdentifier,
                 const std::optional<std::string>& toParentItemIdentifier,
                 ItemCompletionHandler handler);
void deleteItem(const Platform& platform, std::string_view itemIdentifier,
                ErrorCompletionHandler handler);

inline constexpr std::string_view trashFolderName = ".Trash";

// The trash folder made of these path components, those of a "Documents" folder and ".Trash". None
// when no path can be made of them.
[[nodiscard]] std::optional<URL> trashURLWithComponents(const std::vector<std::string>& components);

// Where the item at the URL is trashed. After a line in the log the framework's error for a
// parameter: "sourceURL" when no folder on its path is named "Documents", "trashComponents" where
// trashURLWithComponents fails.
[[nodiscard]] Expected<URL> trashFolderFor(const Platform& platform, const URL& url);

}  // namespace marrowdale
