// Giving out document identifiers.

#include <algorithm>
#include <array>
#include <cerrno>
#include <fcntl.h>
#include <limits>
#include <utility>

#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/store/StoreCore.h"

namespace marrowdale::native {

Expected<void> Store::Core::assignDocumentIDs(std::span<Request> requests) {
    std::vector<std::size_t> unknown;
    auto foldersKnown = fillKnown(requests, unknown);
    if (foldersKnown) {
        if (auto allowed = refuseForeign(requests, unknown); !allowed) {
            return allowed;
        }
    }
    if (foldersKnown && (!*foldersKnown || (watcher_ && !unknown.empty()))) {
        // Something made since the last look, or a name that has another file now: what was told of
        // it meanwhile says more than the look that follows.
        if (auto done = lookForMissing(); !done) {
            return done;
        }
        foldersKnown = fillKnown(requests, unknown);
    }
    if (!foldersKnown) {
        return Unexpected(foldersKnown.error());
    }
    if (unknown.empty() && std::ranges::all_of(requests, [](const Request& request) {
            return request.document != DocumentID{};
        })) {
        return {};
    }
    const Turn turn(*this);
    const auto looked = lookAtEntries(requests, unknown);
    if (!looked) {
        return Unexpected(looked.error());
    }
    return giveOut(requests, *looked);
}

Store::Core::Turn::Turn(Core& core) : core_(core) {
    const MutexLock lock(core_.mutex_);
    core_.waitUntilIdle();
    core_.updating_ = true;
}

Store::Core::Turn::~Turn() {
    const MutexLock lock(core_.mutex_);
    core_.updating_ = false;
    core_.idle_.notify_all();
}

RowNumber Store::Core::rootRowOf(const Request& request) {
    const auto folder = roots_.folderAt(request.status);
    if (folder == nullptr) {
        return noRow;
    }
    return folder->key.empty() ? rootRow : index_.child(rootRow, folder->storedPath());
}

// What is never indexed would get a number that never means anything.
Expected<void> Store::Core::refuseForeign(std::span<const Request> requests,
                                          std::span<const std::size_t> unknown) const {
    if (unknown.empty()) {
        return {};
    }
    const auto unindexed = unindexedFolders();
    for (const std::size_t i : unknown) {
        const Request& request = requests[i];
        if (roots_.folderAt(request.status) != nullptr) {
            continue;
        }
        if (!roots_.storedPath(request.folderPath) || isUnindexed(request, unindexed)) {
            return Unexpected(errorWithPOSIXCode(ENOENT, "identify", request.name));
        }
        if (request.status.isMountPoint) {
            return Unexpected(errorWithPOSIXCode(ENXIO, "identify", request.name));
        }
    }
    return {};
}

bool Store::Core::isUnindexed(const Request& request, std::span<const FileID> folders) const {
    if (std::ranges::find(folders, request.status.fileID) != folders.end()) {
        return true;
    }
    return std::ranges::any_of(std::array{state_.path(), cacheFolder_}, [&](const auto& folder) {
        return !folder.empty() && request.folderPath.starts_with(folder) &&
               (request.folderPath.size() == folder.size() ||
                request.folderPath[folder.size()] == '/');
    });
}

// Fills in what is known without a look at the disk; `unknown` are the requests that need one.
// False when a folder is not known.
Expected<bool> Store::Core::fillKnown(std::span<Request> requests,
                                      std::vector<std::size_t>& unknown) {
    unknown.clear();
    bool foldersKnown = true;
    FileID folder{};
    RowNumber parent = noRow;
    const MutexLock lock(mutex_);
    waitUntilIdle();
    const EntryMerger merger(index_, changes_, saves_);
    RowNumber guess = noRow;
    for (std::size_t i = 0; i < requests.size(); ++i) {
        Request& request = requests[i];
        if (request.status.device != device_) {
            return Unexpected(errorWithPOSIXCode(ENXIO, "identify", request.name));
        }
        if (parent == noRow || request.folder != folder) {
            folder = request.folder;
            parent = folderRow(folder);
            guess = noRow;
        }
        request.document = {};
        request.isThere = true;
        // The folder that a root lies in has no row.
        RowNumber row = rootRowOf(request);
        foldersKnown = foldersKnown && (row != noRow || parent != noRow);
        if (row == noRow && parent != noRow) {
            row = merger.unchangedRow(parent, request.name, request.status, guess);
        }
        if (row == noRow) {
            unknown.push_back(i);
            continue;
        }
        request.document = DocumentID{index_.row(row).document};
        guess = index_.row(row).next;
    }
    return foldersKnown;
}

// The folder of a request, where it still is the one that the entry was found in; else none.
// Errors: a mount was put on the way.
Expected<UniqueFD> Store::Core::folderOf(const Request& request) const {
    const auto path = roots_.storedPath(request.folderPath);
    const auto place = path ? roots_.place(*path) : std::nullopt;
    auto folder = place ? openFolderBeneath(place->folder(), place->path) : UniqueFD();
    if (!folder) {
        return folder.error().code == EXDEV
                   ? Unexpected(errorWithPOSIXCode(ENXIO, "identify", request.name))
                   : Expected<UniqueFD>();
    }
    const auto status = *folder ? statEntry(folder->get(), "") : Expected<EntryStatus>();
    const bool isThatFolder =
        status && status->fileID == request.folder && status->device == device_;
    return isThatFolder ? std::move(folder) : Expected<UniqueFD>();
}

void Store::Core::lookAgain(int folder, const Request& request, Looked& looked) {
    const std::string name(request.name);
    const auto fingerprint = handleFingerprint(folder, name.c_str());
    const auto status = statEntry(folder, name.c_str());
    if (fingerprint && status && !status->isMountPoint && status->device == device_ &&
        status->fileID == request.status.fileID && status->birth == request.status.birth) {
        looked.look.status = *status;
        looked.look.fingerprint = *fingerprint;
        looked.look.attributes =
            status->isRegular() ? carrier_.read(folder, name.c_str()) : std::nullopt;
        looked.stands = true;
    }
}

Expected<std::vector<Store::Core::Looked>> Store::Core::lookAtEntries(
    std::span<const Request> requests, std::span<const std::size_t> unknown) {
    std::vector<Looked> all;
    UniqueFD folder;
    std::optional<std::string_view> folderPath;
    for (const std::size_t i : unknown) {
        const Request& request = requests[i];
        if (folderPath != request.folderPath) {
            folderPath = request.folderPath;
            auto opened = folderOf(request);
            if (!opened) {
                return Unexpected(opened.error());
            }
            folder = std::move(*opened);
        }
        Looked looked{i, {request.status, 0, Date::now()}, false};
        if (folder) {
            lookAgain(folder.get(), request, looked);
        }
        all.push_back(looked);
    }
    return all;
}

RowNumber Store::Core::rowOf(const Request& request) {
    const RowNumber parent = folderRow(request.folder);
    return parent == noRow ? noRow
                           : EntryMerger(index_, changes_, saves_)
                                 .unchangedRow(parent, request.name, request.status);
}

// What stands is put into the index at its name. What went meanwhile keeps the row it has, or gets
// one without a place: if it was only moved, the next reconcile finds it and it keeps its document.
RowNumber Store::Core::rowOfLook(const Request& request, const Looked& looked) {
    const RowNumber parent = folderRow(request.folder);
    if (looked.stands && parent != noRow) {
        EntryMerger merger(index_, changes_, saves_);
        // What happens to the file is told by the watcher, where there is one.
        const RowNumber known = watcher_ ? index_.child(parent, request.name) : noRow;
        if (known != noRow && merger.confirm(known, looked.look)) {
            return known;
        }
        const RowNumber row = merger.merge(parent, request.name, looked.look);
        if (row != noRow) {
            return row;
        }
    }
    for (const RowNumber number : index_.rowsOfFile(raw(request.status.fileID))) {
        if (EntryMerger::isSameFile(index_.row(number), looked.look, false)) {
            return number;
        }
    }
    return index_.addInLimbo(request.name, EntryMerger::valuesOf(looked.look));
}

std::uint32_t Store::Core::documentOfRow(RowNumber number, std::vector<RowNumber>& given) {
    if (index_.row(number).document != 0) {
        return index_.row(number).document;
    }
    const Row row = index_.row(number);
    std::vector<RowNumber> names{number};
    std::uint32_t document = 0;
    if (row.has(Row::severalLinks)) {
        for (const RowNumber other : index_.rowsOfFile(row.fileID)) {
            const Row& otherRow = index_.row(other);
            if (other != number && areOneFile(otherRow, row)) {
                document = otherRow.document != 0 ? otherRow.document : document;
                names.push_back(other);
            }
        }
    }
    if (document == 0) {
        if (lastDocument_ == std::numeric_limits<std::uint32_t>::max()) {
            return 0;
        }
        document = ++lastDocument_;
    }
    for (const RowNumber name : names) {
        if (index_.row(name).document == 0) {
            index_.setDocument(name, document);
            given.push_back(name);
        }
    }
    return document;
}

void Store::Core::takeBack(std::span<const RowNumber> given) {
    for (const RowNumber number : given) {
        index_.setDocument(number, 0);
    }
}

Expected<void> Store::Core::giveOut(std::span<Request> requests, std::span<const Looked> looked) {
    const MutexLock lock(mutex_);
    const std::uint32_t lastBefore = lastDocument_;
    std::vector<RowNumber> given;
    auto look = looked.begin();
    std::optional<Error> failure;
    for (std::size_t i = 0; i < requests.size() && !failure; ++i) {
        Request& request = requests[i];
        const bool wasLookedAt = look != looked.end() && look->request == i;
        if (request.document != DocumentID{}) {
            continue;
        }
        // A reconcile may have run since the entry was looked up.
        RowNumber row = wasLookedAt ? rowOfLook(request, *look) : rowOf(request);
        request.isThere = wasLookedAt ? look->stands : row != noRow;
        if (row == noRow) {
            row = rowOfLook(request, {i, {request.status, 0, Date::now()}, false});
        }
        look += wasLookedAt ? 1 : 0;
        const std::uint32_t document = row == noRow ? 0 : documentOfRow(row, given);
        if (document == 0) {
            failure = errorWithPOSIXCode(EOVERFLOW, "give a document identifier to", request.name);
        }
        request.document = DocumentID{document};
    }
    // Nothing new means nothing to sync: what else changed is committed with the next that is.
    if (!failure && !given.empty()) {
        if (auto committed = commit(); !committed) {
            failure = committed.error();
        }
    }
    if (failure) {
        takeBack(given);
        if (!journal_->failure()) {
            lastDocument_ = lastBefore;
        }
        for (Request& request : requests) {
            request.document = {};
        }
        return Unexpected(*failure);
    }
    return {};
}

}  // namespace marrowdale::native
