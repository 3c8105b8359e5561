#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/Platform.h"
#include "providers/marrowdale/items/LocalItem.h"

// From identifiers and URLs to items, as requests of the host ask for them: with the errors that
// the host gets. Each exists once; where a request is traced as one of its own, there is a form in
// a log section beside it. Any thread.

namespace marrowdale {

// Where the item of an identifier stands. The host framework's error for an item that does not
// exist.
[[nodiscard]] Expected<URL> urlOfItem(const Platform& platform, std::string_view itemIdentifier);
// The same in the section "fetching URL for "IDENTIFIER"".
[[nodiscard]] Expected<URL> fetchURLOfItem(const Platform& platform,
                                           std::string_view itemIdentifier);

// The identifier of the item at a URL; a folder named "Documents" has one through its application
// alone.
[[nodiscard]] std::optional<std::string> identifierOfItemAt(const Platform& platform,
                                                            const URL& url);
// The same in the section "fetching item identifier for "URL"".
[[nodiscard]] std::optional<std::string> fetchIdentifierOfItemAt(const Platform& platform,
                                                                 const URL& url);

// The item of an identifier, in the section "fetching item's properties for "IDENTIFIER"". The host
// framework's error for an item that does not exist.
[[nodiscard]] Expected<std::shared_ptr<LocalItem>> fetchItem(const Platform& platform,
                                                             std::string_view itemIdentifier);

// The item at a URL that an action holds. Fails with invalidItemURL when it has no identifier, with
// itemNotFound when it has one and can't be served.
[[nodiscard]] Expected<std::shared_ptr<LocalItem>> itemAtURL(const Platform& platform,
                                                             const URL& url);

}  // namespace marrowdale
