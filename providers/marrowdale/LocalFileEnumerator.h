#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderEnumeration.h"
#include "providers/marrowdale/fs/FSChangeRequests.h"
#include "providers/marrowdale/fs/FSChangeToken.h"
#include "providers/marrowdale/fs/FSChangesNotifier.h"
#include "providers/marrowdale/fs/FSDirectoryEnumerator.h"
#include "providers/marrowdale/fs/FSWalkCursors.h"
#include "providers/marrowdale/fs/LocalChangesObserverContext.h"

namespace marrowdale {

// Lists one container in pages of 200 items, and tells what changed in it: an ordinary folder, or,
// under its own identifier, one of the containers that gather several trees.
//
// A page is an encoded FSChangeToken: how far the listing got, and the newest event before it was
// walked, from which every later change can be replayed. A page goes on only where nothing was
// deleted since that event, because a deletion moves the offset of every entry behind it; so the
// events since then are replayed first, on the caller's thread, and a page is refused with the
// sync-anchor-expired error where something is gone, where the events are no longer all there, and
// where it was made for another history. The walk of the last page is kept open for the next one
// until the listing is complete or `invalidate`; a page goes on without it too.
//
// An anchor is an encoded FSChangeToken too. A request for changes is decoded and checked on the
// caller's thread, which hears the finish of one that is refused; the rest is an
// FSChangesEnumerator's, on a queue of its own, and goes on for as long as this object is there.
//
// Any thread, several at once; released on any thread, those of its observers' calls among them.
class LocalFileEnumerator : public FileProviderEnumerator {
  public:
    static constexpr std::uint64_t pageSize = 200;

    // `urls` is not empty: an empty one is a mistake of the caller and ends the process. `platform`
    // lives longer, until FSRetiredReaders has nothing to wait for.
    LocalFileEnumerator(
        const Platform& platform, std::string container, std::vector<URL> urls,
        UpdateFileIDInVaultry shouldUpdateFileIDInVaultry = UpdateFileIDInVaultry::yes);
    LocalFileEnumerator(const LocalFileEnumerator&) = delete;
    LocalFileEnumerator& operator=(const LocalFileEnumerator&) = delete;
    // Invalidates, if nobody did.
    ~LocalFileEnumerator() override;

    // One didEnumerateItems and one finish, or an error alone. Items come in the order of the walk,
    // whichever initial page was asked for; an entry that can't be served counts in the offset and
    // is left out. The last page may be empty.
    void enumerateItemsForObserver(FileProviderEnumerationObserver& observer,
                                   const Data& page) noexcept override;
    // Besides what FSChangesEnumerator answers: errorSyncAnchorExpired() for an anchor that can't
    // be decoded and for one of another history, unableToGetDeviceUUID when the volume's can't be
    // read.
    void enumerateChangesForObserver(std::shared_ptr<FileProviderChangeObserver> observer,
                                     const Data& anchor) noexcept override;
    // currentChangeToken(), encoded.
    void currentSyncAnchorWithCompletionHandler(
        const std::function<void(const std::optional<Data>&)>& completionHandler) noexcept override;
    void start() noexcept override;
    void stop() noexcept override;
    void invalidate() noexcept override;

    // What an anchor of this moment holds; none without a notifier, and when the current event
    // can't be read.
    [[nodiscard]] std::optional<FSChangeToken> currentChangeToken() const;
    // Null when the history of the first of `urls` could not be read when this object was made:
    // there are no signals and no anchors then.
    [[nodiscard]] const std::shared_ptr<FSChangesNotifier>& notifier() const { return notifier_; }
    // The requests for changes that are under way; no more once their finish was heard.
    [[nodiscard]] std::size_t numberOfEnumerators() const { return enumerators_->count(); }
    void removeEnumerator(const FSChangesEnumerator& enumerator);

    [[nodiscard]] const std::string& container() const { return container_; }
    [[nodiscard]] const std::vector<URL>& urls() const { return urls_; }
    // The folder of an ordinary container; the first of `urls`.
    [[nodiscard]] const URL& enumeratedItemURL() const { return urls_.front(); }

  private:
    // From where a page is walked: the history and event it belongs to, and its offset; and the
    // event of the page before it, under which the walk was left.
    struct Start {
        UUID deviceUUID;
        EventID streamEventID{};
        std::uint64_t offset = 0;
        EventID previousEventID{};
    };
    // The walk that ended with a page, for the next one.
    struct RestingWalk {
        FSWalkCursorKey key;
        std::unique_ptr<DirectoryEnumerator> walk;
    };
    void gatherPhase(FileProviderEnumerationObserver& observer,
                     const std::optional<FSChangeToken>& token);
    [[nodiscard]] Expected<UUID> currentDeviceUUID() const;
    // Whether the token belongs to that history.
    [[nodiscard]] Expected<void> checkDevice(const FSChangeToken& token,
                                             const UUID& deviceUUID) const;
    [[nodiscard]] Expected<void> checkAnchor(const FSChangeToken& token) const;
    void enumerateChanges(std::shared_ptr<FileProviderChangeObserver> observer,
                          const FSChangeToken& token);
    [[nodiscard]] Expected<Start> startOfPage(const std::optional<FSChangeToken>& token) const;
    [[nodiscard]] Expected<Start> startOfNextPage(const FSChangeToken& token) const;
    [[nodiscard]] FSDirectoryEnumerator listingRequest(const Start& start) const;
    [[nodiscard]] std::vector<URL> roots() const;
    [[nodiscard]] FSWalkCursors& cursors() const;
    [[nodiscard]] FSWalkCursorKey keyOfPreviousPage(const Start& start) const;
    [[nodiscard]] FSWalkCursorKey cursorKey(const UUID& deviceUUID, EventID eventID,
                                            std::uint64_t offset) const;
    void finish(FileProviderEnumerationObserver& observer, const Start& start,
                FSDirectoryEnumerator::Result result);
    [[nodiscard]] std::unique_ptr<DirectoryEnumerator> takeRestingWalk(const Start& start);
    void letRest(RestingWalk resting);

    const Platform& platform_;
    const std::string container_;
    const std::vector<URL> urls_;
    const std::shared_ptr<FSChangesNotifier> notifier_;
    const std::shared_ptr<FSChangeRequests> enumerators_ = std::make_shared<FSChangeRequests>();
    const UpdateFileIDInVaultry shouldUpdateFileIDInVaultry_;
    std::mutex mutex_;
    RestingWalk resting_;  // guarded by mutex_
};

}  // namespace marrowdale
