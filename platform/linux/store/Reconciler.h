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
#include "platform/linux/store/FolderWatches.h"
#include "platform/linux/store/Index.h"
#include "platform/linux/store/Mutex.h"
#include "platform/linux/store/RecordedRoots.h"
#include "platform/linux/store/StoreReport.h"

namespace marrowdale::native {

// What a walk works on, and with.
struct TreeScope {
    Index& index;
    Mutex&
        mutex;  // guards the index and what notes its changes; nobody else changes them meanwhile
    TreeChanges& changes;
    SafeSaves& saves;
    FolderWatches& watches;
    AttributeCarrier& carrier;
    const RecordedRoots& roots;
    DeviceID device;
    std::vector<FileID> skipped;  // folders on its device that are left out
};

// A walk over the recorded trees, or over some folders of them, that brings the index to what is on
// disk. Made for one run. Each folder is watched before it is listed, where there is a watcher.
//
// Each folder is listed below its root by folder handle, links never followed; entries that show
// no change cost one statx. What is not met any more goes to limbo, and comes back with its row
// (document, and all below it) where it is met elsewhere; what is still in limbo at the end is
// gone. Before that, folders that changed after they were listed are listed again, for things
// may have been moved from where the walk had not been to where it had.
class Reconciler {
  public:
    explicit Reconciler(const TreeScope& scope);

    // Walks all trees, with two threads; their topmost folders have rows. Errors: no memory or
    // descriptors are left. After an error the index is good, but not up to date.
    [[nodiscard]] Expected<ReconcileReport> run();
    // Walks these folders and what is below them, on this thread. They are placed.
    [[nodiscard]] Expected<ReconcileReport> runOn(std::vector<RowNumber> folders);
    // After a run: whether what is in limbo is gone for sure; else something kept moving under the
    // walk.
    [[nodiscard]] bool isSettled() const { return settled_; }
    // After a run: folders that were not where they had been met, so that they were not listed.
    [[nodiscard]] const std::vector<RowNumber>& missedFolders() const { return missed_; }

  private:
    struct Found {
        std::size_t nameStart = 0;
        std::size_t nameSize = 0;
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
        std::string path;  // as stored
        RowNumber cursor = noRow;
    };
    // When a folder was listed, to see whether it changed since.
    struct Stamp {
        RowNumber folder = noRow;
        bool unsure = false;
        Date modified;
    };
    enum class Outcome : std::uint8_t { listed, unreadable, vanished };

    enum class Threads : std::uint8_t { one, two };

    void startAtRoots() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Expected<ReconcileReport> walkUntilSettled(Threads threads)
        MARROWDALE_EXCLUDES(mutex_);
    void walk(Threads threads);
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
    void noteUnreadable(const Visit& visit) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Outcome outcomeOf(const Error& error) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] bool pushChangedFolders() MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] bool hasChanged(const Stamp& stamp) MARROWDALE_EXCLUDES(mutex_);

    Mutex& mutex_;
    Index& index_ MARROWDALE_GUARDED_BY(mutex_);
    TreeChanges& changes_ MARROWDALE_GUARDED_BY(mutex_);
    EntryMerger merger_ MARROWDALE_GUARDED_BY(mutex_);
    FolderWatches& watches_;
    AttributeCarrier& carrier_;
    const RecordedRoots& roots_;
    const DeviceID device_;
    const std::vector<FileID> skipped_;
    bool settled_ = false;
    std::vector<RowNumber> missed_;  // written under the mutex; read when the walk is over
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
