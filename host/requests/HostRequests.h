#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <stop_token>
#include <string>
#include <string_view>
#include <vector>

#include "host/requests/Finding.h"
#include "host/requests/ItemAction.h"
#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"
#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale::host {

// What can be asked of a host: the same whether the provider runs in this process (LocalRequests)
// or in another, behind a socket (RemoteRequests). Every call waits for its answer. Any thread,
// several at once. Errors are those of the provider, of the framework, and, from behind a socket,
// POSIX errors of the connection.

// The parameter that an item to list is, as an error names it.
inline constexpr std::string_view listedItemParameter = "ITEM";

// One page of a listing.
struct ItemPage {
    std::vector<FileProviderItemPtr> items;
    std::optional<Data> nextPage;  // none at the end
};

// A listing that goes on page by page; what it holds is given back when it goes. One thread.
class ItemListing {
  public:
    virtual ~ItemListing() = default;
    // One request for one page.
    [[nodiscard]] virtual Expected<ItemPage> page(const Data& page) = 0;
};

// What changed in a container since an anchor. Deletions are to be applied first; no identifier is
// in both. A deleted "fid=N" also means the item known by that file number at that place.
struct ItemChanges {
    std::vector<FileProviderItemPtr> updated;
    std::vector<std::string> deleted;
    Data anchor;  // where to go on
    MoreComing moreComing = MoreComing::no;
};

class ItemRequests {
  public:
    virtual ~ItemRequests() = default;

    [[nodiscard]] virtual Expected<FileProviderItemPtr> item(std::string_view identifier) = 0;
    // The identifier of what is served at a path: absolute, without links but for its last
    // component. The storage root's own path, by whatever links, is the root container's.
    [[nodiscard]] virtual Expected<std::string> identifierAt(std::string_view path) = 0;
    [[nodiscard]] virtual Expected<std::string> pathOf(std::string_view identifier) = 0;
    // An item that is not a folder is refused (invalidParameter, listedItemParameter), for it has
    // nothing to list.
    [[nodiscard]] virtual Expected<std::unique_ptr<ItemListing>> listing(
        std::string_view container) = 0;
};

// Hears that a container is to be read again.
using SignalTaker = std::function<void(std::string_view containerIdentifier)>;

class FeedRequests {
  public:
    virtual ~FeedRequests() = default;

    // From where the container's changes can be followed; none where they can't be told.
    [[nodiscard]] virtual Expected<std::optional<Data>> anchor(std::string_view container) = 0;
    // One request for changes. Containers that can't be listed are refused as by `listing`.
    [[nodiscard]] virtual Expected<ItemChanges> changes(std::string_view container,
                                                        const Data& since) = 0;
    // Holds enumerators over the containers and tells of every signal until the stop is asked for,
    // or until the other side has gone (ECONNRESET). `ready` is called once, when no change that
    // comes later will be missed.
    [[nodiscard]] virtual Expected<void> watch(const std::vector<std::string>& containers,
                                               const std::function<void()>& ready,
                                               const SignalTaker& taker, std::stop_token stop) = 0;
};

class SearchRequests {
  public:
    virtual ~SearchRequests() = default;
    // The items whose name, or a tag of theirs, contains every word, without regard to case, in the
    // order of their names; not those in the trash. At most ten thousand.
    [[nodiscard]] virtual Expected<std::vector<FileProviderItemPtr>> search(
        const std::vector<std::string>& words) = 0;
};

class ActionRequests {
  public:
    virtual ~ActionRequests() = default;
    // Has one action done and waits for its end: the item as it is then, null for a deletion and a
    // purge. What the item does not allow is refused (the file domain's 513). A stop cancels what
    // can be cancelled: ECANCELED, and no trace of it.
    [[nodiscard]] virtual Expected<FileProviderItemPtr> perform(const ItemAction& action,
                                                                ActionObserver& observer,
                                                                const std::stop_token& stop) = 0;
};

// A picture of an item, where it has one.
struct Thumbnail {
    std::string itemIdentifier;
    std::optional<Data> data;  // PNG
};

class ApplicationRequests {
  public:
    virtual ~ApplicationRequests() = default;
    // The document libraries of applications, as the root lists them.
    [[nodiscard]] virtual Expected<std::vector<FileProviderItemPtr>> appLibraries() = 0;
    // The library of one application, listed or not: invalidParameter ("bundleIdentifier") where it
    // is not installed or has no folder that can be served.
    [[nodiscard]] virtual Expected<FileProviderItemPtr> applicationContainer(
        std::string_view bundleIdentifier) = 0;
    // Has the applications of the system looked at again, and returns when it is done: what was
    // installed before the call is known.
    [[nodiscard]] virtual Expected<void> refreshApplications() = 0;
    // One for each identifier, in order. Only app libraries have any; for everything else, and for
    // what does not exist, there is none, which is no error.
    [[nodiscard]] virtual Expected<std::vector<Thumbnail>> thumbnails(
        const std::vector<std::string>& identifiers) = 0;
};

class ServiceRequests {
  public:
    virtual ~ServiceRequests() = default;
    // What the provider's own process has to say of its store and of what it listens to.
    [[nodiscard]] virtual Expected<std::vector<Finding>> findings() = 0;
};

class HostRequests : public ItemRequests,
                     public FeedRequests,
                     public SearchRequests,
                     public ActionRequests,
                     public ApplicationRequests,
                     public ServiceRequests {};

}  // namespace marrowdale::host
