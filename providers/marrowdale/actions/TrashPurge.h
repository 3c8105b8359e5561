#pragma once

#include <functional>

#include "platform/Platform.h"

namespace marrowdale {

// Deletes for good what was trashed before the date. Looks at what lies directly in the trash of
// each app library and of the storage root; what has no date that can be read gets the present one
// and stays. The walk is over when this returns, the deletions are when the handler is called:
// once, on the queue "marrowdale.auto-delete.notifier". Nothing fails towards the host.
void removeTrashedItemsOlderThan(const Platform& platform, const Date& date,
                                 std::function<void()> handler);

}  // namespace marrowdale
