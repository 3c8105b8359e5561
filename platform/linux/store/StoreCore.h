#pragma once

#include <condition_variable>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <thread>
#include <vector>

#include "platform/linux/events/HintSet.h"
#include "platform/linux/files/UniqueFD.h"
#include "platform/linux/store/EntryMerger.h"
#include "platform/linux/store/EventHistory.h"
#include "platform/linux/store/FolderWatches.h"
#include "platform/linux/store/Index.h"
#include "platform/linux/store/Journal.h"
#include "platform/linux/store/Mutex.h"
#include "platform/linux/store/OwnMoves.h"
#include "platform/linux/store/Reconciler.h"
#include "platform/linux/store/RecordedRoots.h"
#include "platform/linux/store/SafeSaves.h"
#include "platform/linux/store/StateFolder.h"
#include "platform/linux/store/Store.h"
#include "platform/linux/store/StoreFolder.h"
#include "platform/linux/store/StoreIdentity.h"
#include "platform/linux/store/StoreLock.h"
#include "platform/linux/store/TreeChanges.h"

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
    [[nodiscard]] Expected<DocumentID> documentAt(const std::string& path,
                                                  AllocateIfNone allocateIfNone)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<void> allocateAt(std::span<const std::string> paths)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<EventID> barrier() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] EventID lastEventID() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] EventID lastEventOfEarlierRuns() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] EventHistory::Standing standingOf(EventID since) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<std::unique_ptr<EventCursor>> eventsSince(EventID since)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<void> setLibraries(std::vector<LibraryFolder> libraries)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] std::vector<EventRoot> eventRoots() const;
    [[nodiscard]] DeviceID device() const { return device_; }
    [[nodiscard]] OwnMoves& ownMoves() { return own_; }
    [[nodiscard]] std::uint64_t addListener(std::function<void(EventHistory::News)> listener)
        MARROWDALE_EXCLUDES(listenersMutex_);
    void removeListener(std::uint64_t number) MARROWDALE_EXCLUDES(listenersMutex_);
    [[nodiscard]] Expected<UUID> volumeUUID(const URL& url) const;
    [[nodiscard]] Expected<void> assignDocumentIDs(std::span<Request> requests)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<void> confirmFolders(std::span<Request> requests)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] DocumentID knownDocumentID(const EntryStatus& status) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<std::string> pathForFileID(DeviceID device, FileID file)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] std::uint32_t subfolderCount(FileID folder) MARROWDALE_EXCLUDES(mutex_);

  private:
    // One name of a file, as the index has it.
    struct Place {
        RowNumber number = noRow;
        std::string path;  // as stored
        Row row{};
    };
    // What a look at the disk brought for one request.
    struct Looked {
        std::size_t request = 0;
        EntryLook look;
        bool stands = false;  // at its name; else it went between the listing and the look
    };

    Core(const StoreOptions& options, StateFolder state, StoreFolder folder, StoreLock lock,
         UniqueFD root);

    // Opening.
    // Without links; the error where there is nothing.
    [[nodiscard]] static Expected<std::string> canonicalPath(const std::string& path);
    struct WantedLibrary {
        LibraryFolder folder;
        bool isRefused = false;  // by its key and path alone
    };
    [[nodiscard]] static std::vector<WantedLibrary> wantedLibraries(
        std::vector<LibraryFolder> libraries, const std::string& rootPath);
    [[nodiscard]] Expected<void> lookAtFolders(const std::string& cacheFolder);
    [[nodiscard]] Expected<void> loadOrMake(const RootBinding& root);
    [[nodiscard]] Expected<std::string> load(const RootBinding& root);
    [[nodiscard]] Expected<void> make(const RootBinding& root, const std::string& reason);
    [[nodiscard]] Expected<void> sweep() const;
    [[nodiscard]] Expected<void> loadJournal() MARROWDALE_REQUIRES(mutex_);
    void noteRoot(const RootBinding& root);
    void log(const std::string& text) const;
    [[nodiscard]] const std::string& rootPath() const { return roots_.root().path; }

    // What the store itself writes to must not be indexed: it changes with each commit. The state
    // folder and the cache folder, where they are on the root's device now.
    [[nodiscard]] std::vector<FileID> unindexedFolders() const;
    void withAbsolutePaths(std::vector<std::string>& storedPaths) const;
    [[nodiscard]] bool isUnindexed(const Request& request, std::span<const FileID> folders) const;

    // Bringing the index up to what is on disk (StoreUpdate.cpp). One pass runs at a time; requests
    // wait for it.
    enum class Pass : std::uint8_t {
        hints,  // the places that the watcher named
        full,   // everything
    };
    void waitUntilIdle() MARROWDALE_REQUIRES(mutex_);
    // While it lives no pass runs, so what its owner looks at is not older than what a pass saw: an
    // older look would put the index back, and nothing would tell of it. Waits for the pass that
    // runs.
    class Turn {
      public:
        explicit Turn(Core& core) MARROWDALE_EXCLUDES(core.mutex_);
        ~Turn();
        Turn(const Turn&) = delete;
        Turn& operator=(const Turn&) = delete;

      private:
        Core& core_;
    };
    // A pass that began after the call serves the caller too.
    [[nodiscard]] Expected<void> runOnce(Pass pass) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<void> reconcileOnce() { return runOnce(Pass::full); }
    // What is cheapest to see everything that was done before the call: for those who did not find
    // what they looked for.
    [[nodiscard]] Expected<void> lookForMissing();
    [[nodiscard]] Expected<void> run(Pass pass) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<void> look(Pass pass) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<void> runFull(const TreeScope& scope) MARROWDALE_EXCLUDES(mutex_);
    // False when everything must be looked at.
    [[nodiscard]] Expected<bool> runHints(const TreeScope& scope) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<bool> followHints(const TreeScope& scope) MARROWDALE_EXCLUDES(mutex_);
    // Whether one of these folders is in the tree.
    [[nodiscard]] bool anyStands(std::span<const RowNumber> folders) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<bool> drain(HintSet& hints) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<void> listUnwatched(const TreeScope& scope) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<void> checkRoot() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<void> noteRootRow() MARROWDALE_EXCLUDES(mutex_);
    void noteRootProblem(const std::optional<Error>& problem) MARROWDALE_EXCLUDES(mutex_);
    void settle(SafeSaves::Knowledge knowledge) MARROWDALE_EXCLUDES(mutex_);
    void removeLimbo() MARROWDALE_REQUIRES(mutex_);
    void carryAttributes() MARROWDALE_EXCLUDES(mutex_);
    void noteCarried(const Place& place, const CarriedAttributes& attributes)
        MARROWDALE_EXCLUDES(mutex_);
    void makeSure() MARROWDALE_EXCLUDES(mutex_);
    void finishUpdates() MARROWDALE_EXCLUDES(mutex_);
    // The pass takes the mutex by itself; requests wait because of `updating_`.
    [[nodiscard]] TreeScope scope() MARROWDALE_NO_THREAD_SAFETY_ANALYSIS;
    [[nodiscard]] Expected<void> commit() MARROWDALE_REQUIRES(mutex_);
    void writeSnapshotIfLong() MARROWDALE_REQUIRES(mutex_);

    // The libraries (StoreLibraries.cpp): at each pass those that are wanted are looked for, as
    // the root is.
    struct Bound {
        std::vector<RowNumber> fresh;  // nothing of these was ever known
        bool mustLookAtAll = false;    // what was known of one must be compared
    };
    [[nodiscard]] Bound bindLibraries() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] RecordedRoots::FolderPointer bound(
        const WantedLibrary& library, const std::vector<RecordedRoots::FolderPointer>& others,
        Bound& news) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<EntryLook> openLibrary(
        RecordedRoots::Folder& folder,
        const std::vector<RecordedRoots::FolderPointer>& others) const;
    void watchParent(int library, RecordedRoots::Folder& folder) const;
    void placeLibrary(const RecordedRoots::Folder& folder, const EntryLook& look, Bound& news)
        MARROWDALE_EXCLUDES(mutex_);
    void noteLibraryProblem(const RecordedRoots::Folder& folder,
                            const RecordedRoots::FolderPointer& before);
    void retireOthers(std::span<const WantedLibrary> wanted) MARROWDALE_EXCLUDES(mutex_);
    void retire(RowNumber row, const Expected<EntryStatus>& standing) MARROWDALE_EXCLUDES(mutex_);
    void unwatchTree(RowNumber folder) MARROWDALE_REQUIRES(mutex_);
    // Lists those that are new. False when everything must be looked at.
    [[nodiscard]] Expected<bool> followLibraries(const TreeScope& scope)
        MARROWDALE_EXCLUDES(mutex_);
    void tellReturnedLibraries() MARROWDALE_EXCLUDES(mutex_);

    // Listening (StoreRecorder.cpp).
    void startWatching();
    void startRecorder();
    void stopRecorder();
    void record();
    void tell(EventHistory::News news) MARROWDALE_EXCLUDES(listenersMutex_);

    // Finding.
    [[nodiscard]] std::vector<Place> placesOfFile(FileID file) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] std::vector<Place> placesOfDocument(DocumentID document, bool& isKnown)
        MARROWDALE_EXCLUDES(mutex_);
    void addPlace(RowNumber number, std::vector<Place>& places) MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] Expected<std::optional<Place>> standing(std::vector<Place>& places) const;
    [[nodiscard]] Expected<EntryLook> lookAt(const Place& place) const;

    // Confirming (StoreConfirm.cpp).
    void dropKnown(std::span<const Request> requests, std::vector<std::size_t>& unknown)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] bool isKnownFolder(const Request& request) MARROWDALE_REQUIRES(mutex_);
    void dropUnindexed(std::span<const Request> requests, std::vector<std::size_t>& unknown) const;
    [[nodiscard]] bool stands(const Request& request) const;

    // Giving out.
    [[nodiscard]] Expected<bool> fillKnown(std::span<Request> requests,
                                           std::vector<std::size_t>& unknown)
        MARROWDALE_EXCLUDES(mutex_);
    // The row of the root or library that is asked for itself; noRow for anything else.
    [[nodiscard]] RowNumber rootRowOf(const Request& request) MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] Expected<void> refuseForeign(std::span<const Request> requests,
                                               std::span<const std::size_t> unknown) const;
    [[nodiscard]] Expected<UniqueFD> folderOf(const Request& request) const;
    void lookAgain(int folder, const Request& request, Looked& looked);
    [[nodiscard]] Expected<std::vector<Looked>> lookAtEntries(std::span<const Request> requests,
                                                              std::span<const std::size_t> unknown);
    [[nodiscard]] Expected<void> giveOut(std::span<Request> requests,
                                         std::span<const Looked> looked)
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] RowNumber rowOf(const Request& request) MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] RowNumber folderRow(FileID folder) MARROWDALE_REQUIRES(mutex_);
    // For an entry below the root; what `path` points to outlives the request.
    [[nodiscard]] Expected<Request> requestFor(const std::string& path,
                                               const EntryStatus& status) const;
    [[nodiscard]] Expected<DocumentID> lookUpDocument(Request& request) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] RowNumber rowOfLook(const Request& request, const Looked& looked)
        MARROWDALE_REQUIRES(mutex_);
    // The row's document; a new one, noted in `given`, where no name of the file has one. 0 when
    // there are none left.
    [[nodiscard]] std::uint32_t documentOfRow(RowNumber number, std::vector<RowNumber>& given)
        MARROWDALE_REQUIRES(mutex_);
    void takeBack(std::span<const RowNumber> given) MARROWDALE_REQUIRES(mutex_);

    const StateFolder state_;
    const StoreFolder folder_;
    Log* const log_;
    const Journal::Options journalOptions_;
    const StoreLock lock_;
    RecordedRoots roots_;
    DeviceID device_{};        // set while opening, as are those below
    std::string cacheFolder_;  // canonical; empty when there is none
    StoreIdentity identity_;

    const PackageTypes packages_;
    AttributeCarrier carrier_;

    OwnMoves own_;
    Mutex mutex_;
    std::vector<WantedLibrary> wanted_ MARROWDALE_GUARDED_BY(mutex_);
    bool wantedChanged_ MARROWDALE_GUARDED_BY(mutex_) = true;  // since a pass looked
    std::condition_variable_any idle_;                         // a pass ended
    Index index_ MARROWDALE_GUARDED_BY(mutex_);
    EventBatch events_ MARROWDALE_GUARDED_BY(mutex_);  // not committed yet
    std::unique_ptr<Journal> journal_ MARROWDALE_GUARDED_BY(mutex_);
    std::uint32_t lastDocument_ MARROWDALE_GUARDED_BY(mutex_) = 0;
    TreeChanges changes_ MARROWDALE_GUARDED_BY(mutex_);
    SafeSaves saves_ MARROWDALE_GUARDED_BY(mutex_);
    bool updating_ MARROWDALE_GUARDED_BY(mutex_) = false;
    // The store was made anew and never held anything that somebody could have asked for.
    bool isFresh_ MARROWDALE_GUARDED_BY(mutex_) = false;
    std::uint64_t passesStarted_ MARROWDALE_GUARDED_BY(mutex_) = 0;
    std::uint64_t fullPassesStarted_ MARROWDALE_GUARDED_BY(mutex_) = 0;
    std::optional<Error> lastRunError_ MARROWDALE_GUARDED_BY(mutex_);
    std::optional<Error> writeError_ MARROWDALE_GUARDED_BY(mutex_);
    ReconcileReport lastReconcile_ MARROWDALE_GUARDED_BY(mutex_);
    RecorderReport recorderReport_ MARROWDALE_GUARDED_BY(mutex_);

    const StoreOptions::Recording recording_;
    const std::optional<Watcher::Kind> watcherKind_;
    std::unique_ptr<Watcher> watcher_;  // set while opening; none without
    // Touched by the pass that runs.
    bool mustLookAtAll_ = false;
    std::vector<SafeSaves::Transfer> uncarried_;  // whose attributes could not be written yet
    std::unique_ptr<FolderWatches> watches_;
    UniqueFD stop_;  // an event counter: the recorder is to end
    std::thread recorder_;

    Mutex listenersMutex_;
    std::map<std::uint64_t, std::function<void(EventHistory::News)>> listeners_
        MARROWDALE_GUARDED_BY(listenersMutex_);
    std::uint64_t nextListener_ MARROWDALE_GUARDED_BY(listenersMutex_) = 1;
};

}  // namespace marrowdale::native
