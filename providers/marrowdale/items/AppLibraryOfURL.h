#pragma once

#include <memory>

#include "platform/Platform.h"
#include "providers/marrowdale/items/LocalAppLibraryItem.h"

namespace marrowdale {

// The item of the app library that holds the URL: of the documents folders that contain it, or are
// it, the one with the longest path. Null when none does, or its item can't be made.
[[nodiscard]] std::shared_ptr<LocalAppLibraryItem> appLibraryItemHolding(const Platform& platform,
                                                                         const URL& url);

}  // namespace marrowdale
