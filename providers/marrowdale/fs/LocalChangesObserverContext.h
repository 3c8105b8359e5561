#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale {

class FSChangeRequests;
class FSChangesEnumerator;

// Whether the generation store is made to look at each updated item, so that it knows which file
// holds the item's document now.
enum class UpdateFileIDInVaultry : std::uint8_t { no, yes };

// Stands between the host's observer of one request for changes and the FSChangesEnumerator that
// carries it out: hands every report on, in the same call, and takes the enumerator out of those
// that are under way once the request is finished. That one holds this object, and not the other
// way round.
//
// Threads: those of its one caller; one call at a time.
class LocalChangesObserverContext : public FileProviderChangeObserver {
  public:
    // `localFileEnumerator`: the requests of the LocalFileEnumerator that was asked; it may be gone
    // before the request ends. `platform` lives longer.
    LocalChangesObserverContext(const Platform& platform,
                                std::shared_ptr<FileProviderChangeObserver> observer,
                                std::weak_ptr<FSChangeRequests> localFileEnumerator,
                                UpdateFileIDInVaultry shouldUpdateFileIDInVaultry);
    // Before the enumerator is started, once both are made.
    void setFSChangesEnumerator(std::weak_ptr<FSChangesEnumerator> enumerator);

    void didUpdateItems(std::vector<FileProviderItemPtr> items) override;
    void didDeleteItemsWithIdentifiers(std::vector<std::string> identifiers) override;
    void finishEnumeratingChangesUpToSyncAnchor(Data anchor, MoreComing moreComing) override;
    void finishEnumeratingWithError(const Error& error) override;

  private:
    void updateFileID(const FileProviderItem& item) const;
    void removeEnumerator() const;

    const Platform& platform_;
    const std::shared_ptr<FileProviderChangeObserver> observer_;
    const std::weak_ptr<FSChangeRequests> localFileEnumerator_;
    std::weak_ptr<FSChangesEnumerator> fsChangesEnumerator_;
    const UpdateFileIDInVaultry shouldUpdateFileIDInVaultry_;
};

}  // namespace marrowdale
