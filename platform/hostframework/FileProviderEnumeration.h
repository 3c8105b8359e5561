#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
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

enum class MoreComing : std::uint8_t { no, yes };

// Hears one request for changes: any number of updates and deletions, then exactly one finish,
// which is the last call. Called on a queue of the provider's, one call at a time; it must not wait
// for the request that it hears.
class FileProviderChangeObserver {
  public:
    virtual ~FileProviderChangeObserver() = default;
    virtual void didUpdateItems(std::vector<FileProviderItemPtr> items) = 0;
    virtual void didDeleteItemsWithIdentifiers(std::vector<std::string> identifiers) = 0;
    // `anchor`: where the next request goes on; `yes` when it is to be asked for at once.
    virtual void finishEnumeratingChangesUpToSyncAnchor(Data anchor, MoreComing moreComing) = 0;
    virtual void finishEnumeratingWithError(const Error& error) = 0;
};

// Lists one container and tells what changed in it. Any thread. `invalidate` once, when the host
// drops it: what it was asked for is stopped, and observers that have not heard their finish hear
// nothing more.
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
