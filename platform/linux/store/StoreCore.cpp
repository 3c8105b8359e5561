#include "platform/linux/store/StoreCore.h"

#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <limits>
#include <utility>

#include "platform/linux/store/DiskCheck.h"

namespace marrowdale::native {

void Store::Core::writeSnapshotIfLong() {
    if (!journal_->wantsSnapshot() || changes_.hasChanges() ||
        journal_->hasChanges(index_, events_, lastDocument_)) {
        return;
    }
    if (auto written = journal_->writeSnapshot(index_); !written) {
        log("no snapshot could be written: " + written.error().description());
    }
}

// What lies below the root is named from there.
void Store::Core::withAbsolutePaths(std::vector<std::string>& storedPaths) const {
    for (std::string& path : storedPaths) {
        if (path.starts_with('/')) {
            path = roots_.absolutePath(path).value_or(path);
        }
    }
}

StoreReport Store::Core::report() {
    StoreReport report;
    report.stores = state_.stores();
    const MutexLock lock(mutex_);
    waitUntilIdle();
    report.stateFolder = state_.path();
    report.storeFolder = folder_.store();
    report.rootPath = rootPath();
    report.uuid = identity_.uuid;
    constexpr std::int64_t billion = 1'000'000'000;
    report.created = {identity_.created / billion,
                      static_cast<std::uint32_t>(identity_.created % billion)};
    report.rebuildReason = identity_.reason;
    if (statEntry(AT_FDCWD, folder_.damaged().c_str())) {
        report.damagedFolder = folder_.damaged();
    }
    report.witness = journal_->witnessProblem();
    report.entries = index_.count();
    report.documents = index_.documentCount();
    report.memory = index_.memory();
    report.logBytes = journal_->logBytes();
    report.snapshotBytes = journal_->snapshotBytes();
    report.lastEventID = EventID{journal_->lastEvent()};
    const LogView::Extent history = journal_->log()->extent();
    report.oldestEventID = EventID{history.lastEventBefore + 1};
    report.oldestEventDate = {history.created, 0};
    report.events = history.events;
    report.historyBytes = history.bytes;
    report.historyProblem = journal_->historyProblem();
    report.documentIDsUsed = lastDocument_ - (identity_.firstDocument - 1);
    report.documentIDsLeft = std::numeric_limits<std::uint32_t>::max() - lastDocument_;
    report.writeError = writeError_;
    report.reconcile = lastReconcile_;
    withAbsolutePaths(report.reconcile.unreadableFolders);
    withAbsolutePaths(report.reconcile.skippedMounts);
    for (const auto& library : roots_.libraries()) {
        report.libraries.push_back({library->key, library->path, library->problem});
    }
    report.recorder = recorderReport_;
    report.recorder.isLive = recording_ == StoreOptions::Recording::live;
    if (watcher_) {
        report.recorder.watcher = watcher_->status();
        report.recorder.unwatchedFolders = watches_->unwatched().size();
        report.recorder.problem = watches_->problem();
    }
    return report;
}

Expected<UUID> Store::Core::volumeUUID(const URL& url) const {
    const auto status = statEntry(AT_FDCWD, url.path().c_str());
    if (!status) {
        return Unexpected(errorWithPOSIXCode(status.error().code, "look at", url.path()));
    }
    if (status->device != device_) {
        return Unexpected(errorWithPOSIXCode(ENXIO, "find the history of", url.path()));
    }
    return identity_.uuid;
}

void Store::Core::addPlace(RowNumber number, std::vector<Place>& places) {
    Place place;
    place.number = number;
    if (index_.path(number, place.path)) {
        place.row = index_.row(number);
        places.push_back(std::move(place));
    }
}

std::vector<Store::Core::Place> Store::Core::placesOfFile(FileID file) {
    std::vector<Place> places;
    const MutexLock lock(mutex_);
    waitUntilIdle();
    for (const RowNumber number : index_.rowsOfFile(raw(file))) {
        addPlace(number, places);
    }
    return places;
}

std::vector<Store::Core::Place> Store::Core::placesOfDocument(DocumentID document, bool& isKnown) {
    std::vector<Place> places;
    const MutexLock lock(mutex_);
    waitUntilIdle();
    for (const RowNumber number : index_.rowsOfDocument(raw(document))) {
        isKnown = true;
        addPlace(number, places);
    }
    return places;
}

// The oldest of the names that stands on disk.
Expected<std::optional<Store::Core::Place>> Store::Core::standing(
    std::vector<Place>& places) const {
    std::ranges::sort(places, {}, [](const Place& place) { return place.row.age(); });
    std::optional<Error> failure;
    for (Place& place : places) {
        const auto found = roots_.place(place.path);
        const auto stands = found ? standsAt(found->folder(), device_, found->path, place.row)
                                  : Expected<bool>(false);
        if (stands && *stands) {
            return std::optional(std::move(place));
        }
        if (!stands) {
            failure = stands.error();
        }
    }
    return failure ? Expected<std::optional<Place>>(Unexpected(*failure))
                   : Expected<std::optional<Place>>(std::nullopt);
}

Expected<EntryLook> Store::Core::lookAt(const Place& place) const {
    const auto found = roots_.place(place.path);
    return found ? lookBeneath(found->folder(), found->path, place.row)
                 : Unexpected(errorWithPOSIXCode(ENOENT, "look at", place.path));
}

Expected<std::string> Store::Core::pathForFileID(DeviceID device, FileID file) {
    const std::string subject = "fid=" + std::to_string(raw(file));
    if (device != device_) {
        return Unexpected(errorWithPOSIXCode(ENXIO, "find the path of", subject));
    }
    if (raw(file) == 0) {
        return Unexpected(errorWithPOSIXCode(ENOENT, "find the path of", subject));
    }
    for (const bool lastTry : {false, true}) {
        auto places = placesOfFile(file);
        auto found = standing(places);
        if (!found) {
            return Unexpected(found.error());
        }
        if (*found) {
            if (auto path = roots_.absolutePath((*found)->path)) {
                return std::move(*path);
            }
        }
        if (!lastTry) {
            if (auto done = lookForMissing(); !done) {
                return Unexpected(done.error());
            }
        }
    }
    return Unexpected(errorWithPOSIXCode(ENOENT, "find the path of", subject));
}

Expected<FileID> Store::Core::resolveDocumentID(DocumentID document, DeviceID device) {
    const std::string subject = "did=" + std::to_string(raw(document));
    if (device != device_) {
        return Unexpected(errorWithPOSIXCode(ENXIO, "find the file of", subject));
    }
    for (const bool lastTry : {false, true}) {
        bool isKnown = false;
        auto places = placesOfDocument(document, isKnown);
        auto found = standing(places);
        if (!found) {
            return Unexpected(found.error());
        }
        if (*found) {
            return FileID{(*found)->row.fileID};
        }
        // A document that no row has can't come back by looking at the disk.
        if (lastTry || !isKnown || raw(document) == 0) {
            break;
        }
        if (auto done = lookForMissing(); !done) {
            return Unexpected(done.error());
        }
    }
    return Unexpected(errorWithPOSIXCode(ENOENT, "find the file of", subject));
}

DocumentID Store::Core::knownDocumentID(const EntryStatus& status) {
    std::vector<Place> unproven;
    {
        const MutexLock lock(mutex_);
        waitUntilIdle();
        if (status.device != device_) {
            return {};
        }
        for (const RowNumber number : index_.rowsOfFile(raw(status.fileID))) {
            const Row& row = index_.row(number);
            if (row.document != 0 && EntryMerger::isUnchanged(row, status)) {
                return DocumentID{row.document};
            }
            if (row.document != 0 && EntryMerger::isSameFile(row, {status, 0, {}}, true)) {
                addPlace(number, unproven);
            }
        }
    }
    // Its ctime moved: only the handle tells whether the inode number is still the same file's.
    for (const Place& place : unproven) {
        const auto look = lookAt(place);
        if (look && look->status.changed == status.changed &&
            EntryMerger::isSameFile(place.row, *look, true)) {
            return DocumentID{place.row.document};
        }
    }
    return {};
}

std::uint32_t Store::Core::subfolderCount(FileID folder) {
    const MutexLock lock(mutex_);
    waitUntilIdle();
    const RowNumber number = folderRow(folder);
    return number == noRow ? 0 : index_.row(number).subfolders();
}

RowNumber Store::Core::folderRow(FileID folder) {
    for (const RowNumber number : index_.rowsOfFile(raw(folder))) {
        const Row& row = index_.row(number);
        if (row.isFolder() && !row.has(Row::limbo)) {
            return number;
        }
    }
    return noRow;
}

}  // namespace marrowdale::native
