#pragma once

#include <map>
#include <string>

#include "host/requests/HostRequests.h"
#include "platform/foundation/Semaphore.h"

namespace marrowdale::host {

// Gathers what one request for changes brings, so that it can be applied as one: of an identifier
// that is told of more than once, the last word counts. The observer is called by the provider's
// queue; `wait` by the thread that asked.
class ChangesCollector final : public FileProviderChangeObserver {
  public:
    void didUpdateItems(std::vector<FileProviderItemPtr> items) override;
    void didDeleteItemsWithIdentifiers(std::vector<std::string> identifiers) override;
    void finishEnumeratingChangesUpToSyncAnchor(Data anchor, MoreComing moreComing) override;
    void finishEnumeratingWithError(const Error& error) override;

    // Returns once the observer has heard its finish. Once.
    [[nodiscard]] Expected<ItemChanges> wait();

  private:
    // A deletion, with what was told to be in it.
    void forget(const std::string& identifier);
    // An identifier's last word: the item as it is, or null for a deletion.
    void tell(const std::string& identifier, FileProviderItemPtr item);
    [[nodiscard]] ItemChanges gathered() const;

    // Written by the provider's queue alone until the finish, read after it.
    struct Word {
        std::string identifier;
        FileProviderItemPtr item;
        bool isStale = false;
    };
    std::vector<Word> words_;  // in the order in which they came
    std::map<std::string, std::size_t, std::less<>> lastWords_;
    std::map<std::uint64_t, std::string> identifiersByFileID_;
    Data anchor_;
    MoreComing moreComing_ = MoreComing::no;
    std::optional<Error> error_;
    Semaphore finished_;
};

}  // namespace marrowdale::host
