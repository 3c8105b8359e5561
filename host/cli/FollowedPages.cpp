#include "host/cli/FollowedPages.h"

#include "host/cli/PrintedItems.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

constexpr int mostRestarts = 5;

// One pass over every page.
Expected<void> followOnce(ItemListing& listing, const PageTaker& take, PrintedItems& printed) {
    std::optional<Data> next = VantrelInitialPageSortedByName();
    while (next) {
        auto page = listing.page(*next);
        if (!page) {
            return Unexpected(page.error());
        }
        std::erase_if(page->items, [&](const FileProviderItemPtr& item) {
            return printed.wasPrintedBefore(item->itemIdentifier);
        });
        if (!take(page->items)) {
            return {};
        }
        next = page->nextPage;
    }
    return {};
}

}  // namespace

Expected<void> followPages(ItemListing& listing, const PageTaker& take) {
    PrintedItems printed;
    Expected<void> result = followOnce(listing, take, printed);
    for (int restarts = 0;
         restarts < mostRestarts && !result && result.error() == errorSyncAnchorExpired();
         ++restarts) {
        printed.startOver();
        result = followOnce(listing, take, printed);
    }
    return result;
}

}  // namespace marrowdale::host
