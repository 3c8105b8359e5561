#pragma once

#include <memory>
#include <vector>

#include "platform/Platform.h"
#include "platform/foundation/URL.h"
#include "providers/marrowdale/items/LocalItem.h"

namespace marrowdale {

// The items of the URLs that a walk handed out, as a host is told of them; what can't be served is
// left out.
[[nodiscard]] std::vector<std::shared_ptr<LocalItem>> itemsOfListing(const Platform& platform,
                                                                     const std::vector<URL>& urls);

}  // namespace marrowdale
