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
// which is the last call, whatever still happens. Calls come one at a time, on a queue of the
// provider's; a request that can't even begin (an anchor that means nothing any more) hears its
// finish on the thread that asked. What is told later holds: an item that was told as deleted and
// then as updated is there. A deleted "fid=N" is also the item that is known with the `fileID` N.
// The observer must not wait for the request that it hears; it may ask for the next one, stop or
// invalidate the enumerator, and let go of it.
class FileProviderChangeObserver {
  public:
    virtual ~FileProviderChangeObserver() = default;
    virtual void didUpdateItems(std::vector<FileProviderItemPtr> items) = 0;
    virtual void didDeleteItemsWithIdentifiers(std::vector<std::string> identifiers) = 0;
    // `anchor`: where the next request goes on; `yes` when it is to be asked for at once.
    virtual void finishEnumeratingChangesUpToSyncAnchor(Data anchor, MoreComing moreComing) = 0;
    virtual void finishEnumeratingWithError(const Error& error) = 0;
};

// Lists one container and tells what changed in it. Any thread, several requests at once. The host
// releases it when it likes, which invalidates it.
class FileProviderEnumerator {
  public:
    virtual ~FileProviderEnumerator() = default;
    // One page; synchronous, the observer has heard its finish when the call returns.
    virtual void enumerateItemsForObserver(FileProviderEnumerationObserver& observer,
                                           const Data& page) = 0;
    // Everything that changed since the anchor, up to a moment after the call: what happened before
    // the call is told. Returns at once, and the observer is kept until its finish. A provider may
    // finish early, with `MoreComing::yes`, to keep answers small. errorSyncAnchorExpired() when it
    // can't be known what changed since: the host lists anew, and goes on from a fresh anchor.
    virtual void enumerateChangesForObserver(std::shared_ptr<FileProviderChangeObserver> observer,
                                             const Data& anchor) = 0;
    // No anchor when changes can't be told. Called before it returns.
    virtual void currentSyncAnchorWithCompletionHandler(
        const std::function<void(const std::optional<Data>&)>& completionHandler) = 0;
    // From `start` to `stop` the provider signals its manager when something changed in what the
    // enumerator covers, also what changed since the enumerator was made. Both may be called at any
    // time and as often as one likes.
    virtual void start() = 0;
    // No signal comes of what is noticed after it. Requests for changes that are under way end
    // without another word, as in `invalidate`; new ones may be made.
    virtual void stop() = 0;
    // The host wants nothing of it any more: a request for changes that is under way ends without
    // another word, its finish included, and its observer is released. No call to an observer
    // begins after it, but for one that another thread was just about to make; that one may still
    // be running when it returns. A listing on another thread runs to its end. A request made later
    // hears nothing.
    virtual void invalidate() = 0;
};

}  // namespace marrowdale
