#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <vector>

#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"
#include "platform/hostframework/FileProviderItem.h"

namespace marrowdale {

using FileProviderItemPtr = std::shared_ptr<const FileProviderItem>;

// Hears one page of a listing: any number of didEnumerateItems, then exactly one finish, which is
// the last call. Called on the thread that asked for the page.
class FileProviderEnumerationObserver {
  public:
    virtual ~FileProviderEnumerationObserver() = default;
    virtual void didEnumerateItems(std::vector<FileProviderItemPtr> items) = 0;
    // `nextPage`: where to go on; none when the listing is complete.
    virtual void finishEnumeratingUpToPage(std::optional<Data> nextPage) = 0;
    virtual void finishEnumeratingWithError(const Error& error) = 0;
};

// Lists one container. Any thread; `invalidate` once, when the host drops it.
class FileProviderEnumerator {
  public:
    virtual ~FileProviderEnumerator() = default;
    // One page; synchronous, the observer has heard its finish when the call returns.
    virtual void enumerateItemsForObserver(FileProviderEnumerationObserver& observer,
                                           const Data& page) = 0;
    // No anchor when changes can't be told.
    virtual void currentSyncAnchorWithCompletionHandler(
        const std::function<void(const std::optional<Data>&)>& completionHandler) = 0;
    virtual void invalidate() = 0;
};

}  // namespace marrowdale
