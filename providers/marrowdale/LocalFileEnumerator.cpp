#include "providers/marrowdale/LocalFileEnumerator.h"

#include <memory>
#include <utility>

#include "platform/foundation/FatalError.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/fs/FSEventReader.h"
#include "providers/marrowdale/fs/FSListedItems.h"
#include "providers/marrowdale/items/ItemLook.h"
#include "providers/marrowdale/items/LocalItem.h"
#include "providers/marrowdale/items/ProviderError.h"

namespace marrowdale {

namespace {

constexpr std::string_view trashName = ".Trash";

// The trash shows what was put into it, not what that holds.
std::optional<DirectoryEnumerationOptions> optionsForRoot(const URL& url) {
    if (url.lastPathComponent() != trashName) {
        return std::nullopt;
    }
    return DirectoryEnumerationOptions{.skipSubdirectoryDescendants = true,
                                       .skipPackageDescendants = true,
                                       .skipHiddenFiles = true};
}

std::string joinedPaths(const std::vector<URL>& urls) {
    std::string text;
    for (const URL& url : urls) {
        text += (text.empty() ? "" : ", ") + url.path();
    }
    return text;
}

// Stops at an empty list, which is the first thing that is looked at.
std::shared_ptr<FSChangesNotifier> makeNotifier(const Platform& platform,
                                                const std::string& container,
                                                const std::vector<URL>& urls) {
    if (urls.empty()) {
        fatalError("can't create enumerator for an empty list of URLs");
    }
    auto notifier = FSChangesNotifier::make(platform, container, urls);
    if (!notifier) {
        platform.log.error("can't create notifier for \"" + urls.front().path() +
                           "\"; enumeration will have no live update");
    }
    return notifier;
}

}  // namespace

LocalFileEnumerator::LocalFileEnumerator(const Platform& platform, std::string container,
                                         std::vector<URL> urls,
                                         UpdateFileIDInVaultry shouldUpdateFileIDInVaultry)
    : platform_(platform),
      container_(std::move(container)),
      urls_(std::move(urls)),
      notifier_(makeNotifier(platform, container_, urls_)),
      shouldUpdateFileIDInVaultry_(shouldUpdateFileIDInVaultry) {}

LocalFileEnumerator::~LocalFileEnumerator() {
    LocalFileEnumerator::invalidate();
}

void LocalFileEnumerator::enumerateItemsForObserver(FileProviderEnumerationObserver& observer,
                                                    const Data& page) noexcept {
    std::optional<FSChangeToken> token;
    std::string label;
    if (page == VantrelInitialPageSortedByDate()) {
        label = "initialPageSortedByDate";
    } else if (page == VantrelInitialPageSortedByName()) {
        label = "initialPageSortedByName";
    } else {
        const auto decoded = FSChangeToken::decode(page);
        if (!decoded) {
            platform_.log.error("can't create change token from anchor data, resetting");
            observer.finishEnumeratingWithError(errorSyncAnchorExpired());
            return;
        }
        token = *decoded;
        label = token->description();
    }
    const LogSection section(
        platform_.log, [&] { return "enumerate items for " + container_ + " with page " + label; });
    gatherPhase(observer, token);
}

void LocalFileEnumerator::gatherPhase(FileProviderEnumerationObserver& observer,
                                      const std::optional<FSChangeToken>& token) {
    const auto start = startOfPage(token);
    if (!start) {
        observer.finishEnumeratingWithError(start.error());
        return;
    }
    const FSDirectoryEnumerator request = listingRequest(*start);
    std::vector<URL> urls;
    urls.reserve(pageSize);
    auto result = request.enumerate(platform_, urls, takeRestingWalk(*start));
    if (!result) {
        platform_.log.error("can't enumerate " + joinedPaths(request.urls) + "; " +
                            result.error().description());
        observer.finishEnumeratingWithError(result.error());
        return;
    }
    platform_.log.debug([&] { return "discovered " + std::to_string(urls.size()) + " items"; });
    const auto items = itemsOfListing(platform_, urls);
    observer.didEnumerateItems({items.begin(), items.end()});
    finish(observer, *start, std::move(*result));
}

Expected<LocalFileEnumerator::Start> LocalFileEnumerator::startOfPage(
    const std::optional<FSChangeToken>& token) const {
    const auto deviceUUID = currentDeviceUUID();
    if (!deviceUUID) {
        return Unexpected(deviceUUID.error());
    }
    if (!token) {
        platform_.log.debug([] { return "start gather phase"; });
        const auto eventID = platform_.fileEvents.currentEventID();
        if (!eventID) {
            return Unexpected(eventID.error());
        }
        return Start{.deviceUUID = *deviceUUID,
                     .streamEventID = *eventID,
                     .offset = 0,
                     .previousEventID = *eventID};
    }
    if (const auto same = checkDevice(*token, *deviceUUID); !same) {
        return Unexpected(same.error());
    }
    return startOfNextPage(*token);
}

Expected<UUID> LocalFileEnumerator::currentDeviceUUID() const {
    const auto deviceUUID = FSEventReader::volumeUUID(platform_, urls_.front());
    if (!deviceUUID) {
        const std::string& path = urls_.front().path();
        platform_.log.error("can't get volume UUID for " + path);
        return Unexpected(errorWithProviderCode(ProviderErrorCode::unableToGetDeviceUUID, path));
    }
    return *deviceUUID;
}

Expected<void> LocalFileEnumerator::checkDevice(const FSChangeToken& token,
                                                const UUID& deviceUUID) const {
    if (token.deviceUUID == deviceUUID) {
        return {};
    }
    platform_.log.debug([&] {
        return "device UUID changed (" + token.deviceUUID.text() + " -> " + deviceUUID.text() + ")";
    });
    return Unexpected(errorSyncAnchorExpired());
}

Expected<LocalFileEnumerator::Start> LocalFileEnumerator::startOfNextPage(
    const FSChangeToken& token) const {
    using Kind = FSEventReaderGatherPhaseResumeStatus::Kind;
    platform_.log.debug(
        [&] { return "resume gather phase at offset " + std::to_string(token.offset); });
    const EventID previousEventID{token.streamEventID};
    const auto resume = FSEventReader::canResumeGatherPhase(platform_, urls_, previousEventID);
    if (!resume) {
        return Unexpected(resume.error());
    }
    switch (resume->status.kind) {
        case Kind::deletionOccurred:
            platform_.log.debug([&] {
                return "deletion of " + resume->status.path + " requires to re-gather from scratch";
            });
            return Unexpected(errorSyncAnchorExpired());
        case Kind::cantReplayHistoricalFSEvents:
            platform_.log.debug([] {
                return "can't replay historical FSEvents, need to re-start gather phase from "
                       "scratch";
            });
            return Unexpected(errorSyncAnchorExpired());
        case Kind::canResume:
            break;
    }
    platform_.log.debug(
        [&] { return "safe to resume gather phase from " + std::to_string(raw(resume->eventID)); });
    return Start{.deviceUUID = token.deviceUUID,
                 .streamEventID = resume->eventID,
                 .offset = token.offset,
                 .previousEventID = previousEventID};
}

FSDirectoryEnumerator LocalFileEnumerator::listingRequest(const Start& start) const {
    const bool isOrdinary = container_ != VantrelAllDirectoriesContainerItemIdentifier &&
                            container_ != VantrelWorkingSetContainerItemIdentifier;
    return {.urls = roots(),
            .recursively = !isOrdinary,
            .offset = start.offset,
            .limit = pageSize,
            .errorHandler = {},
            .directoryEnumerationOptionsFor = optionsForRoot,
            .keys = LocalItem::listingKeys(),
            .attributeNames = listedAttributeNames(),
            .startPosition =
                start.offset == 0 ? std::nullopt : cursors().find(keyOfPreviousPage(start))};
}

std::vector<URL> LocalFileEnumerator::roots() const {
    if (container_ == VantrelAllDirectoriesContainerItemIdentifier) {
        return urls_;
    }
    if (container_ != VantrelWorkingSetContainerItemIdentifier) {
        return {enumeratedItemURL()};
    }
    std::vector<URL> trashFolders;
    trashFolders.reserve(urls_.size());
    for (const URL& url : urls_) {
        trashFolders.push_back(url.appendingPathComponent(trashName));
    }
    return trashFolders;
}

FSWalkCursors& LocalFileEnumerator::cursors() const {
    return platform_.shared.get<FSWalkCursors>("marrowdale.walk-cursors");
}

FSWalkCursorKey LocalFileEnumerator::keyOfPreviousPage(const Start& start) const {
    return cursorKey(start.deviceUUID, start.previousEventID, start.offset);
}

FSWalkCursorKey LocalFileEnumerator::cursorKey(const UUID& deviceUUID, EventID eventID,
                                               std::uint64_t offset) const {
    std::vector<std::string> paths;
    for (const URL& url : roots()) {
        paths.push_back(url.path());
    }
    return {.deviceUUID = deviceUUID,
            .streamEventID = raw(eventID),
            .offset = offset,
            .container = container_,
            .roots = std::move(paths)};
}

// The walk is only good for the page that follows; any other page begins with a walk of its own.
std::unique_ptr<DirectoryEnumerator> LocalFileEnumerator::takeRestingWalk(const Start& start) {
    RestingWalk resting;
    {
        const std::lock_guard lock(mutex_);
        std::swap(resting, resting_);
    }
    const bool fits = resting.walk && resting.key == keyOfPreviousPage(start);
    return fits ? std::move(resting.walk) : nullptr;
}

void LocalFileEnumerator::letRest(RestingWalk resting) {
    const std::lock_guard lock(mutex_);
    std::swap(resting_, resting);
}

void LocalFileEnumerator::finish(FileProviderEnumerationObserver& observer, const Start& start,
                                 FSDirectoryEnumerator::Result result) {
    // A walk that ended before the page began has advanced by nothing, not by a wrapped number.
    const bool isFull =
        result.position >= start.offset && result.position - start.offset == pageSize;
    if (!isFull) {
        platform_.log.debug([&] { return "gather phase finished for " + joinedPaths(roots()); });
        observer.finishEnumeratingUpToPage(std::nullopt);
        return;
    }
    if (result.nextPosition) {
        FSWalkCursorKey key = cursorKey(start.deviceUUID, start.streamEventID, result.position);
        cursors().remember(key, std::move(*result.nextPosition));
        letRest({std::move(key), std::move(result.restingWalk)});
    }
    const FSChangeToken next{.version = 0,
                             .deviceUUID = start.deviceUUID,
                             .streamEventID = raw(start.streamEventID),
                             .offset = result.position,
                             .appLibraryVersionToken = 0};
    observer.finishEnumeratingUpToPage(next.encode());
}

}  // namespace marrowdale
