#pragma once

#include <condition_variable>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "platform/linux/files/UniqueFD.h"
#include "platform/linux/store/EntryMerger.h"
#include "platform/linux/store/Index.h"
#include "platform/linux/store/Journal.h"
#include "platform/linux/store/Mutex.h"
#include "platform/linux/store/StateFolder.h"
#include "platform/linux/store/Store.h"
#include "platform/linux/store/StoreFolder.h"
#include "platform/linux/store/StoreIdentity.h"
#include "platform/linux/store/StoreLock.h"

namespace marrowdale::native {

// What a Store is made of. Any thread; one mutex guards index and journal, and no system call that
// looks at the tree is made while it is held.
class Store::Core {
  public:
    using Request = DocumentIndex::Request;

    [[nodiscard]] static Expected<std::unique_ptr<Core>> open(const StoreOptions& options);
    ~Core();
    Core(const Core&) = delete;
    Core& operator=(const Core&) = delete;

    [[nodiscard]] Expected<void> reconcile() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] StoreReport report() MARROWDALE_EXCLUDES(mutex_);

    [[nodiscard]] Expected<FileID> resolveDocumentID(DocumentID document, DeviceID device)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<DocumentID> documentOf(const OpenFile& file) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<EventID> currentEventID() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<UUID> volumeUUID(const URL& url) const;
    [[nodiscard]] Expected<void> assignDocumentIDs(std::span<Request> requests)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] DocumentID knownDocumentID(const EntryStatus& status) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<std::string> pathForFileID(DeviceID device, FileID file)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] std::uint32_t subfolderCount(FileID folder) MARROWDALE_EXCLUDES(mutex_);

  private:
    // One name of a file, as the index has it.
    struct Place {
        std::string path;  // below the root
        Row row;
    };
    // What a look at the disk brought for one request.
    struct Looked {
        std::size_t request;
        EntryLook look;
        bool stands;  // at its name; else it went between the listing and the look
    };

    Core(const StoreOptions& options, StateFolder state, StoreFolder folder, StoreLock lock,
         UniqueFD root);

    // Opening.
    [[nodiscard]] Expected<void> lookAtFolders(const std::string& cacheFolder);
    [[nodiscard]] Expected<void> loadOrMake(const RootBinding& root);
    [[nodiscard]] Expected<std::string> load(const RootBinding& root);
    [[nodiscard]] Expected<void> make(const RootBinding& root, const std::string& reason);
    [[nodiscard]] Expected<void> sweep() const;
    [[nodiscard]] Expected<void> loadJournal() MARROWDALE_REQUIRES(mutex_);
    void noteRoot(const RootBinding& root);
    void log(const std::string& text) const;

    // What the store itself writes to must not be indexed: it changes with each commit. The state
    // folder and the cache folder, where they are on the root's device now.
    [[nodiscard]] std::vector<FileID> unindexedFolders() const;
    [[nodiscard]] bool isUnindexed(const Request& request, std::span<const FileID> folders) const;

    // Requests wait here while a reconcile runs.
    void waitUntilIdle() MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] Expected<void> reconcileOnce() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<void> runReconcile() MARROWDALE_EXCLUDES(mutex_);
    // It takes the mutex by itself; requests wait because of `reconciling_`.
    [[nodiscard]] Index& indexForReconciler() MARROWDALE_NO_THREAD_SAFETY_ANALYSIS {
        return index_;
    }
    [[nodiscard]] Expected<void> commit() MARROWDALE_REQUIRES(mutex_);
    void writeSnapshotIfLong() MARROWDALE_REQUIRES(mutex_);

    // Finding.
    [[nodiscard]] std::vector<Place> placesOfFile(FileID file) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] std::vector<Place> placesOfDocument(DocumentID document, bool& isKnown)
        MARROWDALE_EXCLUDES(mutex_);
    void addPlace(RowNumber number, std::vector<Place>& places) MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] Expected<std::optional<Place>> standing(std::vector<Place>& places) const;

    // Giving out.
    [[nodiscard]] Expected<bool> fillKnown(std::span<Request> requests,
                                           std::vector<std::size_t>& unknown)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] std::optional<std::string> pathBelowRoot(std::string_view path) const;
    [[nodiscard]] bool isRoot(const Request& request) const;
    [[nodiscard]] Expected<void> refuseForeign(std::span<const Request> requests,
                                               std::span<const std::size_t> unknown) const;
    [[nodiscard]] Expected<UniqueFD> folderOf(const Request& request) const;
    void lookAgain(int folder, const Request& request, Looked& looked) const;
    [[nodiscard]] Expected<std::vector<Looked>> lookAtEntries(
        std::span<const Request> requests, std::span<const std::size_t> unknown) const;
    [[nodiscard]] Expected<void> giveOut(std::span<Request> requests,
                                         std::span<const Looked> looked)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] RowNumber rowOf(const Request& request) MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] RowNumber folderRow(FileID folder) MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] RowNumber rowOfLook(const Request& request, const Looked& looked)
        MARROWDALE_REQUIRES(mutex_);
    // The row's document; a new one, noted in `given`, where no name of the file has one. 0 when
    // there are none left.
    [[nodiscard]] std::uint32_t documentOfRow(RowNumber number, std::vector<RowNumber>& given)
        MARROWDALE_REQUIRES(mutex_);
    void takeBack(std::span<const RowNumber> given) MARROWDALE_REQUIRES(mutex_);

    const StateFolder state_;
    const StoreFolder folder_;
    const std::string rootPath_;
    Log* const log_;
    const StoreLock lock_;
    const UniqueFD root_;
    DeviceID device_{};  // set while opening, as are those below
    FileID rootID_{};
    std::string cacheFolder_;  // canonical; empty when there is none
    StoreIdentity identity_;

    Mutex mutex_;
    std::condition_variable_any idle_;  // a reconcile ended
    Index index_ MARROWDALE_GUARDED_BY(mutex_);
    EventBatch events_ MARROWDALE_GUARDED_BY(mutex_);  // not committed yet
    std::unique_ptr<Journal> journal_ MARROWDALE_GUARDED_BY(mutex_);
    std::uint32_t lastDocument_ MARROWDALE_GUARDED_BY(mutex_) = 0;
    bool reconciling_ MARROWDALE_GUARDED_BY(mutex_) = false;
    std::uint64_t runsStarted_ MARROWDALE_GUARDED_BY(mutex_) = 0;
    std::optional<Error> lastRunError_ MARROWDALE_GUARDED_BY(mutex_);
    std::optional<Error> writeError_ MARROWDALE_GUARDED_BY(mutex_);
    ReconcileReport lastReconcile_ MARROWDALE_GUARDED_BY(mutex_);
};

}  // namespace marrowdale::native
