// The walk of a renamed folder.

#include <algorithm>
#include <memory>
#include <utility>

#include "providers/marrowdale/fs/FSChangesEnumerator.h"
#include "providers/marrowdale/fs/FSChangesFilter.h"
#include "providers/marrowdale/fs/FSListedItems.h"
#include "providers/marrowdale/fs/FSNewestDeletion.h"
#include "providers/marrowdale/items/ItemLook.h"

namespace marrowdale {

namespace {

// Of that root alone, with hidden files and the contents of packages left out.
std::optional<DirectoryEnumerationOptions> scanOptions(const URL& /*root*/) {
    return DirectoryEnumerationOptions{.skipSubdirectoryDescendants = false,
                                       .skipPackageDescendants = true,
                                       .skipHiddenFiles = true};
}

FSWalkCursors& cursors(const Platform& platform) {
    return platform.shared.get<FSWalkCursors>("marrowdale.walk-cursors");
}

}  // namespace

void FSChangesEnumerator::tellFolder(const std::shared_ptr<LocalItem>& folder,
                                     const FileEvent& event) {
    const FSScanOffset offset = offsetOfScan(folder->fileURL, event);
    if (offset.position == 0 && forwardUpdate(folder, event) == Batch::full) {
        finishEarly(event, Told::inPart, offset.value());
        return;
    }
    scan(folder->fileURL, event, offset);
}

// The offset of the request's anchor belongs to the first event behind it, if that is a folder's.
FSScanOffset FSChangesEnumerator::offsetOfScan(const URL& folder, const FileEvent& event) {
    const std::uint64_t offset = std::exchange(currentToken_.offset, 0);
    if (offset == 0 || lastProcessedEvent() != sinceFSEventID_) {
        return {};
    }
    const auto deletion = newestDeletion(platform_, folder, event.id);
    if (!deletion) {
        return {};
    }
    const FSScanOffset known = FSScanOffset::from(offset);
    const std::uint32_t distance = FSScanOffset::distance(*deletion, event.id);
    if (distance == known.newestDeletion) {
        return known;
    }
    platform_.log.debug(
        [&] { return "something under " + folder.path() + " is gone, its scan starts over"; });
    return {.position = 0, .newestDeletion = distance};
}

void FSChangesEnumerator::scan(const URL& folder, const FileEvent& event, FSScanOffset offset) {
    const LogSection section(platform_.log, [&] {
        return "scanning folder " + folder.path() + " from offset " +
               std::to_string(offset.position);
    });
    FSDirectoryEnumerator request = scanRequest(folder, offset);
    std::unique_ptr<DirectoryEnumerator> restingWalk;
    while (listeningObserver()) {
        request.limit = batchSize - numberOfChanges_;
        std::vector<URL> urls;
        auto walked = request.enumerate(platform_, urls, std::move(restingWalk));
        if (!walked) {
            finish(walked.error());
            return;
        }
        const Batch batch = forwardScanned(urls);
        const bool isAtEnd = walked->position < request.offset + request.limit;
        request.offset = walked->position;
        request.startPosition = std::move(walked->nextPosition);
        restingWalk = std::move(walked->restingWalk);
        if (batch == Batch::full) {
            offset.position = static_cast<std::uint32_t>(request.offset);
            if (request.startPosition) {
                cursors(platform_).remember(cursorKey(folder, lastProcessedEvent(), offset),
                                            std::move(*request.startPosition));
            }
            finishEarly(event, Told::inPart, offset.value());
            return;
        }
        if (isAtEnd) {
            return;
        }
    }
}

FSDirectoryEnumerator FSChangesEnumerator::scanRequest(const URL& folder,
                                                       FSScanOffset offset) const {
    return {.urls = {folder},
            .recursively = true,
            .offset = offset.position,
            .limit = 0,
            .errorHandler = {},
            .directoryEnumerationOptionsFor = scanOptions,
            .keys = LocalItem::listingKeys(),
            .attributeNames = listedAttributeNames(),
            .startPosition = offset.position == 0 ? std::nullopt
                                                  : cursors(platform_).find(cursorKey(
                                                        folder, sinceFSEventID_, offset))};
}

FSChangesEnumerator::Batch FSChangesEnumerator::forwardScanned(const std::vector<URL>& urls) {
    std::vector<FileProviderItemPtr> told;
    for (auto& item : itemsOfListing(platform_, urls)) {
        const auto reason = reasonToIgnoreUpdate(container_, *item);
        platform_.log.debug([&] {
            return (reason.empty() ? "forward update of " : "ignore update of ") +
                   item->description() + reason;
        });
        if (reason.empty()) {
            told.push_back(std::move(item));
        }
    }
    const auto observer = listeningObserver();
    if (!observer || told.empty()) {
        return Batch::open;
    }
    const std::uint64_t changes = told.size();
    observer->didUpdateItems(std::move(told));
    return count(changes);
}

FSWalkCursorKey FSChangesEnumerator::cursorKey(const URL& folder, EventID eventID,
                                               FSScanOffset offset) const {
    return {.deviceUUID = currentToken_.deviceUUID,
            .streamEventID = raw(eventID),
            .offset = offset.value(),
            .container = "scan for " + container_,
            .roots = {folder.path()}};
}

}  // namespace marrowdale
