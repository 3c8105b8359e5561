#pragma once

#include <functional>
#include <memory>
#include <span>
#include <string>

#include "platform/linux/files/DocumentIndex.h"
#include "platform/linux/store/EventHistory.h"
#include "platform/linux/store/OwnMoves.h"
#include "platform/linux/store/StoreOptions.h"
#include "platform/linux/store/StoreReport.h"
#include "platform/services/GenerationStore.h"

namespace marrowdale::native {

// The durable store of one root folder and of the libraries recorded beside it: which entries there
// are, their document identifiers, and the counter of events. One process at a time has it; within
// the process any thread may call, several at once. Requests wait while a reconcile runs.
//
// Nothing is handed out before it is synced to disk. When the disk refuses (ENOSPC, EIO, …), new
// identifiers are refused with that error and everything known is still answered; after a failed
// sync that lasts until the store is opened again.
class Store final : public GenerationStore, public EventHistory, public DocumentIndex {
  public:
    // Takes the lock, loads (or makes) the root folder's store and reconciles it with the disk. It
    // is the folder that counts, not its path: a folder that was moved keeps its store, another
    // one at the same path gets its own. A damaged store is set aside and made anew under a new
    // UUID, and so is one that lies at another place than where it was made, or is older than its
    // witness: that is no error, and StoreReport::rebuildReason tells.
    //
    // Errors, with operation and path: the root is missing, no folder or unreadable (ENOENT,
    // ENOTDIR, EACCES); the root is the state or cache folder (EINVAL); the state folder can't be
    // made or written (EACCES, EROFS, ENOSPC, …); the
    // lock is held by another process at the deadline (EWOULDBLOCK, the subject names the folder
    // and the holder's process number); the store has a format of a later version (EPROTO; nothing
    // is touched).
    [[nodiscard]] static Expected<std::unique_ptr<Store>> open(const StoreOptions& options);

    // Commits what is pending, writes a snapshot where the log has grown long, gives the lock
    // back.
    ~Store() override;
    Store(const Store&) = delete;
    Store& operator=(const Store&) = delete;

    // Brings the index up to what is on disk, on two threads, and commits the differences. Several
    // callers at once may be served by one run, which began after each of them called. Errors: the
    // root can't be read; the differences can't be committed.
    [[nodiscard]] Expected<void> reconcile();

    // The folders that are recorded beside the root from now on, all of them. When it returns,
    // those that are new are indexed, and every path in them has an event of its own, whether or
    // not it was known from an earlier time: who is told of a library now has been told of nothing
    // in it. What was given an identifier then has it still. One that is no more in the list is no
    // more looked at; what was in it is gone where its folder is.
    //
    // A folder that can't be recorded is left out, and looked for at each pass: it is missing
    // (ENOENT; what was in it is gone), no folder or a link (ENOTDIR), on another volume than the
    // root (EXDEV), unreadable (EACCES), has no good key, holds another root or lies in one, or is
    // the state or cache folder (EINVAL); of two that get in each other's way the one with the
    // lower key counts. That is no error here: StoreReport::libraries tells. Errors: the trees
    // can't be looked at.
    [[nodiscard]] Expected<void> setLibraries(std::vector<LibraryFolder> libraries);

    // The newest event when the store was opened: what happened before that and was found by the
    // look at everything then, the folders' own coming among it, has later ones.
    [[nodiscard]] EventID lastEventOfEarlierRuns() const;

    [[nodiscard]] StoreReport report() const;

    // To be told of what this system itself moves and removes below the roots.
    [[nodiscard]] OwnMoves& ownMoves();

    // GenerationStore. Documents of names that are gone are looked for once (a reconcile) before
    // the answer is ENOENT; another volume is ENXIO.
    [[nodiscard]] Expected<FileID> resolveDocumentID(DocumentID document, DeviceID device) override;
    // The file must be below a root: ENOENT otherwise, ENXIO on another volume.
    [[nodiscard]] Expected<DocumentID> getOrAllocateDocumentID(const OpenFile& file) override;
    // Below a root as well. What the disk says of the entry is merged into the index, and
    // committed with what comes next.
    [[nodiscard]] Expected<DocumentID> permanentStorageForItemAtURL(
        const URL& url, AllocateIfNone allocateIfNone) override;
    [[nodiscard]] Expected<void> allocatePermanentStorage(
        std::span<const std::string> paths) override;

    // EventHistory.
    [[nodiscard]] Expected<EventID> barrier() override;
    [[nodiscard]] EventID lastEventID() override;
    [[nodiscard]] Standing standingOf(EventID since) override;
    [[nodiscard]] Expected<std::unique_ptr<EventCursor>> eventsSince(EventID since) override;
    [[nodiscard]] std::vector<EventRoot> roots() override;
    [[nodiscard]] DeviceID device() override;
    [[nodiscard]] Expected<UUID> volumeUUID(const URL& url) override;
    [[nodiscard]] std::uint64_t addListener(std::function<void(News)> listener) override;
    void removeListener(std::uint64_t number) override;

    // DocumentIndex. What lies in none of the trees, or in the state or cache folder, is ENOENT;
    // what lies behind a mount is ENXIO.
    [[nodiscard]] Expected<void> assignDocumentIDs(std::span<Request> requests) override;
    [[nodiscard]] Expected<void> confirmFolders(std::span<Request> requests) override;
    [[nodiscard]] DocumentID knownDocumentID(const EntryStatus& status) override;
    [[nodiscard]] Expected<std::string> pathForFileID(DeviceID device, FileID file) override;
    [[nodiscard]] std::uint32_t subfolderCount(FileID folder) override;

  private:
    class Core;
    explicit Store(std::unique_ptr<Core> core);
    std::unique_ptr<Core> core_;
};

}  // namespace marrowdale::native
