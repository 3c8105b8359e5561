#include "host/daemon/LocalRequests.h"

#include <cstdlib>

#include "host/daemon/ChangesCollector.h"
#include "host/daemon/LocalListing.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

bool isSystemContainer(std::string_view identifier) {
    return identifier == VantrelRootContainerItemIdentifier ||
           identifier == VantrelWorkingSetContainerItemIdentifier ||
           identifier == VantrelAllDirectoriesContainerItemIdentifier;
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

Expected<FileProviderItemPtr> LocalRequests::item(std::string_view identifier) {
    return services_.extension.itemForIdentifier(identifier);
}

Expected<std::string> LocalRequests::identifierAt(std::string_view path) {
    if (isStorageRoot(std::string(path), services_.rootPath)) {
        return std::string(VantrelRootContainerItemIdentifier);
    }
    auto identifier = services_.extension.persistentIdentifierForItemAtURL(URL::fileURL(path));
    if (!identifier) {
        return Unexpected(errorForNonExistentItem(path));
    }
    return std::move(*identifier);
}

Expected<std::string> LocalRequests::pathOf(std::string_view identifier) {
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
    const auto enumerator = enumeratorOf(container);
    if (!enumerator) {
        return Unexpected(enumerator.error());
    }
    std::optional<Data> anchor;
    (*enumerator)->currentSyncAnchorWithCompletionHandler([&](const std::optional<Data>& current) {
        anchor = current;
    });
    (*enumerator)->invalidate();
    return anchor;
}

Expected<ItemChanges> LocalRequests::changes(std::string_view container, const Data& since) {
    const auto enumerator = enumeratorOf(container);
    if (!enumerator) {
        return Unexpected(enumerator.error());
    }
    const auto collector = std::make_shared<ChangesCollector>();
    (*enumerator)->enumerateChangesForObserver(collector, since);
    auto changes = collector->wait();
    (*enumerator)->invalidate();
    return changes;
}

LocalRequests::Watch::~Watch() {
    for (const auto& enumerator : enumerators_) {
        enumerator->invalidate();
    }
}

Expected<std::unique_ptr<LocalRequests::Watch>> LocalRequests::startWatch(
    const std::vector<std::string>& containers, SignalTaker taker) {
    std::vector<std::unique_ptr<FileProviderEnumerator>> enumerators;
    for (const std::string& container : containers) {
        auto enumerator = enumeratorOf(container);
        if (!enumerator) {
            return Unexpected(enumerator.error());
        }
        enumerators.push_back(std::move(*enumerator));
    }
    auto subscription = services_.signals.subscribe(std::move(taker));
    for (const auto& enumerator : enumerators) {
        enumerator->start();
    }
    return std::make_unique<Watch>(std::move(enumerators), std::move(subscription));
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
    return services_.findings();
}

}  // namespace marrowdale::host
