#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/Platform.h"

// Where a trashed item came from, as its put-back attribute has it: the path of its former place
// below the documents folder of its app library.

namespace marrowdale {

// The components of the item's URL that follow those of `base`, with "/" between them. None when
// the item does not lie in `base`, or `base` has no components. Decided on names alone.
[[nodiscard]] std::optional<std::string> putBackString(const URL& item, const URL& base);

// The folder that held the item, from the attribute of the trashed item at `url`. None when it has
// none, no app library holds it, or the attribute, which anybody may write, leads out of the
// library.
[[nodiscard]] std::optional<URL> readPutBackURL(const Platform& platform, const URL& url);

}  // namespace marrowdale
