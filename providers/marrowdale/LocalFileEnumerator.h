#pragma once

#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderEnumeration.h"
#include "providers/marrowdale/fs/FSChangeToken.h"
#include "providers/marrowdale/fs/FSDirectoryEnumerator.h"
#include "providers/marrowdale/fs/FSWalkCursors.h"

namespace marrowdale {

// Lists one container in pages of 200 items: an ordinary folder, or, under its own identifier, one
// of the containers that gather several trees.
//
// A page is an encoded FSChangeToken: how far the listing got, and the newest event before it was
// walked, from which every later change can be replayed. A page goes on only where nothing was
// deleted since that event, because a deletion moves the offset of every entry behind it; so the
// events since then are replayed first, on the caller's thread, and a page is refused with the
// sync-anchor-expired error where something is gone, where the events are no longer all there, and
// where it was made for another history. The walk of the last page is kept open for the next one
// until the listing is complete or `invalidate`; a page goes on without it too.
//
// Any thread, several at once.
class LocalFileEnumerator : public FileProviderEnumerator {
  public:
    static constexpr std::uint64_t pageSize = 200;

    // `urls` is not empty: an empty one is a mistake of the caller and ends the process.
    LocalFileEnumerator(const Platform& platform, std::string container, std::vector<URL> urls);

    // One didEnumerateItems and one finish, or an error alone. Items come in the order of the walk,
    // whichever initial page was asked for; an entry that can't be served counts in the offset and
    // is left out. The last page may be empty.
    void enumerateItemsForObserver(FileProviderEnumerationObserver& observer,
                                   const Data& page) noexcept override;
    // Refuses every anchor as expired: no anchor is handed out.
    void enumerateChangesForObserver(std::shared_ptr<FileProviderChangeObserver> observer,
                                     const Data& anchor) noexcept override;
    // Answers no anchor: live changes are not followed.
    void currentSyncAnchorWithCompletionHandler(
        const std::function<void(const std::optional<Data>&)>& completionHandler) noexcept override;
    void start() noexcept override;
    void stop() noexcept override;
    void invalidate() noexcept override;

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
    std::mutex mutex_;
    RestingWalk resting_;  // guarded by mutex_
};

}  // namespace marrowdale
