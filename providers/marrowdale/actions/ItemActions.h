#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderActions.h"

// Importing, creating, renaming and moving: identifiers become URLs, the platform does the file
// work, and the host gets the item that came of it. What each is told of by
// FileProviderItemActions. Where an identifier leads to nothing, moving answers with the
// framework's error for an item that does not exist (the parent's first), the others with the
// look-up's own.
//
// Nothing is retried or undone: what was done to the files stays, also when no item can be made of
// it. The platform outlives the answer.

namespace marrowdale {

void importDocument(const Platform& platform, const URL& url,
                    std::string_view toParentItemIdentifier, ItemCompletionHandler handler);
void createDirectory(const Platform& platform, std::string_view name,
                     std::string_view inParentItemIdentifier, ItemCompletionHandler handler);
void renameItem(const Platform& platform, std::string_view itemIdentifier, std::string_view toName,
                ItemCompletionHandler handler);
void reparentItem(const Platform& platform, std::string_view itemIdentifier,
                  std::string_view toParentItemIdentifier, std::optional<std::string> newName,
                  ItemCompletionHandler handler);

}  // namespace marrowdale
