#pragma once

#include <condition_variable>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/store/EntryMerger.h"
#include "platform/linux/store/Index.h"
#include "platform/linux/store/Mutex.h"
#include "platform/linux/store/StoreReport.h"

namespace marrowdale::native {

// One walk over the tree that brings the index to what is on disk. Made for one run.
//
// Each folder is listed below the root by folder handle, links never followed; entries that show
// no change cost one statx. What is not met any more goes to limbo, and comes back with its row
// (document, and all below it) where it is met elsewhere; at the end what is still in limbo is
// removed. Before that, folders that changed after they were listed are listed again, for things
// may have been moved from where the walk had not been to where it had.
class Reconciler {
  public:
    // `mutex` guards `index`; nobody else changes the index while the run lasts. `root` is the open
    // root folder. `skipped` are folders on its device that are left out.
    Reconciler(Index& index, Mutex& mutex, int root, const std::string& rootPath,
               std::vector<FileID> skipped);

    // Walks with two threads. Errors: the root can't be read; no memory or descriptors are left.
    // After an error the index is good, but not up to date: nothing was removed.
    [[nodiscard]] Expected<ReconcileReport> run();

  private:
    struct Found {
        std::size_t nameStart;
        std::size_t nameSize;
        EntryStatus status;
    };
    struct Batch {
        std::string names;  // each with a NUL behind it
        std::vector<Found> entries;
        Date lookedAt;
        [[nodiscard]] std::string_view name(const Found& entry) const {
            return {names.data() + entry.nameStart, entry.nameSize};
        }
        void clear() {
            names.clear();
            entries.clear();
        }
    };
    // One folder being listed.
    struct Visit {
        RowNumber folder = noRow;
        std::string path;  // below the root
        RowNumber cursor = noRow;
    };
    // When a folder was listed, to see whether it changed since.
    struct Stamp {
        RowNumber folder;
        bool unsure;
        Date modified;
    };
    enum class Outcome : std::uint8_t { listed, unreadable, vanished };

    [[nodiscard]] Expected<void> startAtRoot() MARROWDALE_EXCLUDES(mutex_);
    void walk();
    void work() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] std::optional<Visit> takeFolder() MARROWDALE_EXCLUDES(mutex_);
    void visit(Visit& visit);
    [[nodiscard]] Outcome list(Visit& visit, Batch& batch) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Outcome fillBatch(Visit& visit, DirectoryReader& reader, Batch& batch,
                                    bool& atEnd) MARROWDALE_EXCLUDES(mutex_);
    void addToBatch(const DirectoryReader::Entry& entry, const EntryStatus& status, Batch& batch);
    void mergeBatch(Visit& visit, int folder, const Batch& batch) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] std::vector<std::size_t> passUnchanged(Visit& visit, const Batch& batch)
        MARROWDALE_EXCLUDES(mutex_);
    void meet(RowNumber row) MARROWDALE_REQUIRES(mutex_);
    void finishFolder(const Visit& visit, Outcome outcome) MARROWDALE_EXCLUDES(mutex_);
    // Whether another tree stands there.
    [[nodiscard]] bool isForeign(const EntryStatus& status) const;
    void keepMountPoint(const Visit& visit, std::string_view name) MARROWDALE_EXCLUDES(mutex_);
    void setUnreadable(RowNumber folder, bool unreadable) MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] Outcome outcomeOf(const Error& error) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] bool pushChangedFolders() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] bool hasChanged(const Stamp& stamp) MARROWDALE_EXCLUDES(mutex_);

    Mutex& mutex_;
    Index& index_ MARROWDALE_GUARDED_BY(mutex_);
    EntryMerger merger_ MARROWDALE_GUARDED_BY(mutex_);
    const int root_;
    const std::string& rootPath_;
    const std::vector<FileID> skipped_;
    DeviceID device_{};  // set before the threads start
    std::condition_variable_any changed_;
    std::vector<RowNumber> stack_ MARROWDALE_GUARDED_BY(mutex_);
    std::vector<RowNumber> later_ MARROWDALE_GUARDED_BY(mutex_);  // are being listed by another
    unsigned busy_ MARROWDALE_GUARDED_BY(mutex_) = 0;
    std::vector<Stamp> stamps_ MARROWDALE_GUARDED_BY(mutex_);
    bool unsettled_ MARROWDALE_GUARDED_BY(mutex_) = false;  // something moved under the walk
    std::optional<Error> failure_ MARROWDALE_GUARDED_BY(mutex_);
    ReconcileReport report_ MARROWDALE_GUARDED_BY(mutex_);
};

}  // namespace marrowdale::native
