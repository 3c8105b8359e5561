#pragma once

#include <functional>
#include <vector>

#include "host/requests/HostRequests.h"

namespace marrowdale::host {

// Takes the items of a page that were not handed over before; answers whether to go on.
using PageTaker = std::function<bool(const std::vector<FileProviderItemPtr>& items)>;

// Follows a listing from its first page to its last. When a page has expired (something was deleted
// meanwhile), it starts over and leaves out what it handed over already; after it has done so five
// times, the next expiry is the answer. Every other error is the answer at once.
[[nodiscard]] Expected<void> followPages(ItemListing& listing, const PageTaker& take);

}  // namespace marrowdale::host
