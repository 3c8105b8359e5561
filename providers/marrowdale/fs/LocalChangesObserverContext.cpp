#include "providers/marrowdale/fs/LocalChangesObserverContext.h"

#include <utility>

#include "providers/marrowdale/fs/FSChangeRequests.h"

namespace marrowdale {

LocalChangesObserverContext::LocalChangesObserverContext(
    const Platform& platform, std::shared_ptr<FileProviderChangeObserver> observer,
    std::weak_ptr<FSChangeRequests> localFileEnumerator,
    UpdateFileIDInVaultry shouldUpdateFileIDInVaultry)
    : platform_(platform),
      observer_(std::move(observer)),
      localFileEnumerator_(std::move(localFileEnumerator)),
      shouldUpdateFileIDInVaultry_(shouldUpdateFileIDInVaultry) {}

void LocalChangesObserverContext::setFSChangesEnumerator(
    std::weak_ptr<FSChangesEnumerator> enumerator) {
    fsChangesEnumerator_ = std::move(enumerator);
}

void LocalChangesObserverContext::didUpdateItems(std::vector<FileProviderItemPtr> items) {
    if (shouldUpdateFileIDInVaultry_ == UpdateFileIDInVaultry::yes) {
        for (const FileProviderItemPtr& item : items) {
            updateFileID(*item);
        }
    }
    observer_->didUpdateItems(std::move(items));
}

void LocalChangesObserverContext::didDeleteItemsWithIdentifiers(
    std::vector<std::string> identifiers) {
    observer_->didDeleteItemsWithIdentifiers(std::move(identifiers));
}

void LocalChangesObserverContext::finishEnumeratingChangesUpToSyncAnchor(Data anchor,
                                                                         MoreComing moreComing) {
    observer_->finishEnumeratingChangesUpToSyncAnchor(std::move(anchor), moreComing);
    removeEnumerator();
}

void LocalChangesObserverContext::finishEnumeratingWithError(const Error& error) {
    observer_->finishEnumeratingWithError(error);
    removeEnumerator();
}

// The look-up alone makes the store take note of the item's file. What it answers is of no use
// here: an item that has no document is looked up as well.
void LocalChangesObserverContext::updateFileID(const FileProviderItem& item) const {
    platform_.log.debug([] { return "updating file ID in vaultry"; });
    (void)platform_.generationStore.permanentStorageForItemAtURL(item.fileURL, AllocateIfNone::no);
}

void LocalChangesObserverContext::removeEnumerator() const {
    const auto enumerator = fsChangesEnumerator_.lock();
    const auto requests = localFileEnumerator_.lock();
    if (enumerator && requests) {
        requests->removeEnumerator(*enumerator);
    }
}

}  // namespace marrowdale
