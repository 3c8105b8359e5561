#include "host/daemon/LocalRequests.h"

#include <algorithm>
#include <cstdlib>
#include <future>
#include <utility>

#include "host/daemon/AnchorVersions.h"
#include "host/daemon/ChangesCollector.h"
#include "host/daemon/LocalListing.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

// Identifiers of app libraries begin so.
constexpr char libraryPrefix = '#';

bool isSystemContainer(std::string_view identifier) {
    return identifier == VantrelRootContainerItemIdentifier ||
           identifier == VantrelWorkingSetContainerItemIdentifier ||
           identifier == VantrelAllDirectoriesContainerItemIdentifier;
}

// All libraries of now are among the updates.
void addGoneLibraries(const std::set<std::string>& known, ItemChanges& changes) {
    for (const std::string& identifier : known) {
        const bool isThere = std::ranges::any_of(
            changes.updated, [&](const auto& item) { return item->itemIdentifier == identifier; });
        if (!isThere && std::ranges::find(changes.deleted, identifier) == changes.deleted.end()) {
            changes.deleted.push_back(identifier);
        }
    }
}

std::optional<std::string> resolved(const std::string& path) {
    struct Free {
        // NOLINTNEXTLINE(cppcoreguidelines-no-malloc): realpath allocates with malloc
        void operator()(char* text) const { std::free(text); }
    };
    const std::unique_ptr<char, Free> text(::realpath(path.c_str(), nullptr));
    return text ? std::optional<std::string>(text.get()) : std::nullopt;
}

bool liesBelow(std::string_view path, std::string_view root) {
    return root == "/" ||
           (path.size() > root.size() && path.starts_with(root) && path[root.size()] == '/');
}

bool isStorageRoot(const std::string& path, const std::string& rootPath) {
    if (path == rootPath) {
        return true;
    }
    // A link below the root that leads to the root is an item of its own.
    return !liesBelow(path, rootPath) && resolved(path) == rootPath;
}

}  // namespace

LocalRequests::LocalRequests(LocalServices services)
    : services_(std::move(services)),
      actions_(services_.extension, services_.rootPath, services_.stateFolder),
      replica_(*this, *this, services_.replicaPath),
      libraries_(services_.extension, [this] { renewWatches(); }, services_.librariesAreKnown) {}

Expected<FileProviderItemPtr> LocalRequests::item(std::string_view identifier) {
    libraries_.waitUntilKnown();
    return services_.extension.itemForIdentifier(identifier);
}

Expected<std::string> LocalRequests::identifierAt(std::string_view path) {
    if (isStorageRoot(std::string(path), services_.rootPath)) {
        return std::string(VantrelRootContainerItemIdentifier);
    }
    libraries_.waitUntilKnown();
    auto identifier = services_.extension.persistentIdentifierForItemAtURL(URL::fileURL(path));
    if (!identifier) {
        return Unexpected(errorForNonExistentItem(path));
    }
    return std::move(*identifier);
}

Expected<std::string> LocalRequests::pathOf(std::string_view identifier) {
    libraries_.waitUntilKnown();
    const auto url = services_.extension.URLForItemWithPersistentIdentifier(identifier);
    if (!url) {
        return Unexpected(errorForNonExistentItem(identifier));
    }
    return url->path();
}

Expected<std::unique_ptr<ItemListing>> LocalRequests::listing(std::string_view container) {
    auto enumerator = enumeratorOf(container);
    if (!enumerator) {
        return Unexpected(enumerator.error());
    }
    return std::unique_ptr<ItemListing>(std::make_unique<LocalListing>(std::move(*enumerator)));
}

Expected<std::unique_ptr<FileProviderEnumerator>> LocalRequests::enumeratorOf(
    std::string_view container) {
    libraries_.waitUntilKnown();
    if (!isSystemContainer(container)) {
        const auto folder = item(container);
        if (!folder) {
            return Unexpected(folder.error());
        }
        if (!(*folder)->isFolder() && !(*folder)->hx_isContainer()) {
            return Unexpected(errorInvalidParameter(listedItemParameter, container));
        }
    }
    return services_.extension.enumeratorForContainerItemIdentifier(container);
}

Expected<std::optional<Data>> LocalRequests::anchor(std::string_view container) {
    auto enumerator = enumeratorOf(container);
    if (!enumerator) {
        return Unexpected(enumerator.error());
    }
    std::optional<Data> anchor;
    (*enumerator)->currentSyncAnchorWithCompletionHandler([&](const std::optional<Data>& current) {
        anchor = current;
    });
    release(container, anchor, std::move(*enumerator));
    return anchor;
}

Expected<ItemChanges> LocalRequests::changes(std::string_view container, const Data& since) {
    libraries_.waitUntilKnown();
    auto enumerator = kept_.take(container, since);
    if (!enumerator) {
        auto fresh = enumeratorOf(container);
        if (!fresh) {
            return Unexpected(fresh.error());
        }
        enumerator = std::move(*fresh);
    }
    auto changes = ask(container, since, std::move(enumerator));
    if (isSystemContainer(container)) {
        if (auto instead = bridged(container, since, changes)) {
            return std::move(*instead);
        }
    }
    return changes;
}

Expected<ItemChanges> LocalRequests::ask(std::string_view container, const Data& since,
                                         std::unique_ptr<FileProviderEnumerator> enumerator) {
    const auto collector = std::make_shared<ChangesCollector>();
    enumerator->enumerateChangesForObserver(collector, since);
    auto changes = collector->wait();
    if (changes && isSystemContainer(container)) {
        libraries_.complete(since, *changes);
    }
    release(container, changes ? std::optional(changes->anchor) : std::nullopt,
            std::move(enumerator));
    return changes;
}

// Where nobody answers from the anchor's version, and where somebody did who was brought to another
// one, but the anchor's event lies behind the coming of a library that its holder is told of now.
std::optional<Expected<ItemChanges>> LocalRequests::bridged(std::string_view container,
                                                            const Data& since,
                                                            const Expected<ItemChanges>& answer) {
    const bool isExpired = !answer && answer.error() == errorSyncAnchorExpired();
    const bool isBroughtOn = answer && libraryVersionIn(answer->anchor) != libraryVersionIn(since);
    if (services_.libraryChanges == nullptr || !(isExpired || isBroughtOn)) {
        return std::nullopt;
    }
    const auto bridge = services_.libraryChanges->bridge(since);
    if (!bridge || (isBroughtOn && !bridge->isMoved)) {
        return std::nullopt;
    }
    auto enumerator = enumeratorOf(container);
    if (!enumerator) {
        return Unexpected(enumerator.error());
    }
    auto changes = ask(container, bridge->anchor, std::move(*enumerator));
    if (changes) {
        addGoneLibraries(bridge->known, *changes);
    }
    return changes;
}

void LocalRequests::release(std::string_view container, const std::optional<Data>& anchor,
                            std::unique_ptr<FileProviderEnumerator> enumerator) {
    if (anchor && isSystemContainer(container)) {
        kept_.keep(container, *anchor, std::move(enumerator));
    } else {
        enumerator->invalidate();
    }
}

LocalRequests::Watch::Watch(LocalRequests& requests, std::vector<std::string> containers,
                            Enumerators enumerators,
                            std::unique_ptr<SignalHub::Subscription> subscription)
    : requests_(requests),
      containers_(std::move(containers)),
      enumerators_(std::move(enumerators)),
      subscription_(std::move(subscription)) {
    const std::lock_guard lock(requests_.watching_);
    for (const auto& enumerator : enumerators_) {
        enumerator->start();
    }
    watchTrashes();
    requests_.watches_.insert(this);
}

LocalRequests::Watch::~Watch() {
    {
        const std::lock_guard lock(requests_.watching_);
        requests_.watches_.erase(this);
    }
    for (const auto& enumerator : enumerators_) {
        enumerator->invalidate();
    }
}

void LocalRequests::Watch::renew() {
    for (std::size_t i = 0; i < containers_.size(); ++i) {
        if (!isSystemContainer(containers_[i])) {
            continue;
        }
        // One that can't be had leaves the old one, which watches what there was.
        if (auto fresh = requests_.enumeratorOf(containers_[i])) {
            (*fresh)->start();
            std::swap(enumerators_[i], *fresh);
            (*fresh)->invalidate();
        }
    }
    watchTrashes();
}

void LocalRequests::Watch::watchTrashes() {
    if (requests_.services_.watchTrashes != nullptr &&
        std::ranges::find(containers_, VantrelWorkingSetContainerItemIdentifier) !=
            containers_.end()) {
        trashes_ = requests_.services_.watchTrashes();
    }
}

Expected<std::unique_ptr<LocalRequests::Watch>> LocalRequests::startWatch(
    const std::vector<std::string>& containers, SignalTaker taker) {
    const std::uint64_t renewals = renewals_;
    Watch::Enumerators enumerators;
    for (const std::string& container : containers) {
        auto enumerator = enumeratorOf(container);
        if (!enumerator) {
            return Unexpected(enumerator.error());
        }
        enumerators.push_back(std::move(*enumerator));
    }
    auto subscription = services_.signals.subscribe(std::move(taker));
    auto watch =
        std::make_unique<Watch>(*this, containers, std::move(enumerators), std::move(subscription));
    const std::lock_guard lock(watching_);
    if (renewals != renewals_) {
        watch->renew();
    }
    return watch;
}

Expected<void> LocalRequests::watch(const std::vector<std::string>& containers,
                                    const std::function<void()>& ready, const SignalTaker& taker,
                                    std::stop_token stop) {
    Semaphore stopped;
    const auto watch = startWatch(containers, taker);
    if (!watch) {
        return Unexpected(watch.error());
    }
    ready();
    const std::stop_callback stopper(stop, [&] { stopped.signal(); });
    stopped.wait();
    return {};
}

Expected<std::vector<Finding>> LocalRequests::findings() {
    libraries_.waitUntilKnown();
    return services_.findings();
}

Expected<std::vector<FileProviderItemPtr>> LocalRequests::appLibraries() {
    const auto root = listing(VantrelRootContainerItemIdentifier);
    if (!root) {
        return Unexpected(root.error());
    }
    auto page = (*root)->page(VantrelInitialPageSortedByName());
    if (!page) {
        return Unexpected(page.error());
    }
    std::erase_if(page->items, [](const FileProviderItemPtr& item) {
        return !item->itemIdentifier.starts_with(libraryPrefix);
    });
    return std::move(page->items);
}

Expected<FileProviderItemPtr> LocalRequests::applicationContainer(
    std::string_view bundleIdentifier) {
    libraries_.waitUntilKnown();
    // Shared: the handler may still be in its last step when the answer is there.
    const auto answer = std::make_shared<std::promise<Expected<FileProviderItemPtr>>>();
    services_.extension._defaultApplicationContainerForBundleIdentifier(
        bundleIdentifier,
        [answer](Expected<FileProviderItemPtr> item) { answer->set_value(std::move(item)); });
    return answer->get_future().get();
}

Expected<void> LocalRequests::refreshApplications() {
    if (services_.forgetApplications) {
        services_.forgetApplications();
    }
    libraries_.refreshNow();
    return {};
}

Expected<std::vector<Thumbnail>> LocalRequests::thumbnails(
    const std::vector<std::string>& identifiers) {
    libraries_.waitUntilKnown();
    std::vector<Thumbnail> thumbnails;
    std::optional<Error> failure;
    const FileProviderApplications::ThumbnailHandler take = [&](std::string_view identifier,
                                                                const std::optional<Data>& data,
                                                                const std::optional<Error>& error) {
        thumbnails.push_back({std::string(identifier), data});
        failure = failure ? failure : error;
    };
    // Sizes are the provider's to choose.
    (void)services_.extension.fetchThumbnailsForItemIdentifiers(
        identifiers, ThumbnailSize{}, take,
        [&](const std::optional<Error>& error) { failure = failure ? failure : error; });
    return failure ? Expected<std::vector<Thumbnail>>(Unexpected(*failure)) : std::move(thumbnails);
}

void LocalRequests::renewWatches() {
    {
        const std::lock_guard lock(watching_);
        ++renewals_;
        for (Watch* const watch : watches_) {
            watch->renew();
        }
    }
    // What happened in a new library before somebody watched it.
    services_.signals.signal(VantrelRootContainerItemIdentifier);
    services_.signals.signal(VantrelWorkingSetContainerItemIdentifier);
}

}  // namespace marrowdale::host
