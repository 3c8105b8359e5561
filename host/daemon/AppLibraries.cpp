#include "host/daemon/AppLibraries.h"

#include <memory>
#include <utility>

#include "host/daemon/AnchorVersions.h"
#include "host/daemon/ChangesCollector.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

// The registry may change again while the working set is brought up to it.
constexpr int mostRounds = 5;

}  // namespace

AppLibraries::AppLibraries(FileProviderExtension& extension, std::function<void()> changed,
                           std::function<void()> known)
    : extension_(extension),
      changed_(std::move(changed)),
      knownTo_(std::move(known)),
      refreshes_(extension, [this] { refreshed(); }) {}

AppLibraries::~AppLibraries() {
    refreshes_.stopTelling();
    queue_.sync([] {});
}

void AppLibraries::waitUntilKnown() {
    std::call_once(known_, [this] {
        refreshes_.waitForFirst();
        bringUp();
        isKnown_ = true;
    });
}

void AppLibraries::refreshNow() {
    // The first refresh is not older than the extension.
    if (!isKnown_) {
        waitUntilKnown();
        return;
    }
    refreshes_.refreshNow();
    queue_.sync([] {});
}

void AppLibraries::refreshed() {
    // Of the first one knows whoever waits for it.
    if (wasRefreshed_.exchange(true)) {
        queue_.async([this] { follow(); });
    }
}

void AppLibraries::follow() {
    waitUntilKnown();
    const auto before = version_;
    bringUp();
    if (before != version_ && changed_) {
        changed_();
    }
}

void AppLibraries::bringUp() {
    version_ = prime();
    if (knownTo_) {
        knownTo_();
    }
}

std::optional<std::uint64_t> AppLibraries::prime() {
    std::optional<std::uint64_t> newest;
    for (int round = 0; round < mostRounds; ++round) {
        const auto root = freshAnchor(VantrelRootContainerItemIdentifier);
        newest = root ? libraryVersionIn(*root) : std::nullopt;
        auto workingSet = extension_.enumeratorForContainerItemIdentifier(
            VantrelWorkingSetContainerItemIdentifier);
        if (!newest || !workingSet) {
            break;
        }
        std::optional<Data> anchor;
        (*workingSet)->currentSyncAnchorWithCompletionHandler([&](const auto& current) {
            anchor = current;
        });
        const bool isBehind = anchor && libraryVersionIn(*anchor) != newest;
        if (isBehind || (anchor && version_ != newest && *newest != 0 && round == 0)) {
            askForAll(**workingSet, *anchor);
        }
        (*workingSet)->invalidate();
        if (!isBehind) {
            break;
        }
    }
    return newest;
}

void AppLibraries::askForAll(FileProviderEnumerator& workingSet, const Data& anchor) {
    const Data since = withoutLibraryVersion(anchor);
    const auto collector = std::make_shared<ChangesCollector>();
    workingSet.enumerateChangesForObserver(collector, since);
    if (auto changes = collector->wait()) {
        told_.complete(since, *changes);
    }
}

std::optional<Data> AppLibraries::freshAnchor(std::string_view container) const {
    const auto enumerator = extension_.enumeratorForContainerItemIdentifier(container);
    if (!enumerator) {
        return std::nullopt;
    }
    std::optional<Data> anchor;
    (*enumerator)->currentSyncAnchorWithCompletionHandler([&](const auto& current) {
        anchor = current;
    });
    (*enumerator)->invalidate();
    return anchor;
}

}  // namespace marrowdale::host
