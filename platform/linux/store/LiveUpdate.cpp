#include "platform/linux/store/LiveUpdate.h"

#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <utility>

#include "platform/linux/store/FolderDigest.h"

namespace marrowdale::native {

namespace {

bool meansGone(int code) {
    return code == ENOENT || code == ENOTDIR || code == ELOOP || code == EXDEV || code == ESTALE;
}

}  // namespace

LiveUpdate::LiveUpdate(const TreeScope& scope)
    : scope_(scope), mutex_(scope.mutex), merger_(scope.index, scope.changes, scope.saves) {}

Expected<LiveUpdate::Left> LiveUpdate::process(HintSet& hints) {
    left_ = {};
    addFilePlaces(hints);
    const auto places = hints.takePlaces();
    for (std::size_t first = 0; first < places.size();) {
        std::size_t last = first;
        while (last < places.size() && places[last].folder == places[first].folder) {
            ++last;
        }
        processFolder(places, first, last);
        first = last;
    }
    if (!toList_.empty()) {
        Reconciler reconciler(scope_);
        auto listed = reconciler.runOn(std::exchange(toList_, {}));
        if (!listed) {
            return Unexpected(listed.error());
        }
        left_.missedFolders = reconciler.missedFolders();
    }
    return std::move(left_);
}

// A file that is watched itself was changed, through whichever of its names.
void LiveUpdate::addFilePlaces(HintSet& hints) {
    for (const FileID file : hints.takeFiles()) {
        const MutexLock lock(mutex_);
        for (const RowNumber number : scope_.index.rowsOfFile(raw(file))) {
            const Row& row = scope_.index.row(number);
            if (!row.has(Row::limbo) && row.parent != noRow) {
                HintSet::Hint hint;
                hint.what = WatchHint::changed;
                hint.folder = FileID{scope_.index.row(row.parent).fileID};
                hint.name = scope_.index.name(number);
                hints.add(hint);
            }
        }
    }
}

RowNumber LiveUpdate::folderRow(FileID folder) const {
    for (const RowNumber number : scope_.index.rowsOfFile(raw(folder))) {
        const Row& row = scope_.index.row(number);
        if (row.isFolder() && !row.has(Row::limbo)) {
            return number;
        }
    }
    return noRow;
}

bool LiveUpdate::isInLimbo(FileID folder) const {
    return std::ranges::any_of(scope_.index.rowsOfFile(raw(folder)), [&](RowNumber number) {
        const Row& row = scope_.index.row(number);
        return row.isFolder() && row.has(Row::limbo);
    });
}

std::optional<UniqueFD> LiveUpdate::openFolderOf(FileID folder) {
    std::string path;
    {
        const MutexLock lock(mutex_);
        const RowNumber number = folderRow(folder);
        if (number == noRow) {
            // One in limbo may be found yet, and its hints are needed then.
            return isInLimbo(folder) ? std::optional<UniqueFD>(UniqueFD()) : std::nullopt;
        }
        if (!scope_.index.path(number, path)) {
            return UniqueFD();
        }
    }
    const auto place = scope_.roots.place(path);
    if (!place) {
        return std::nullopt;
    }
    auto opened = holdFolderBeneath(place->folder(), place->path);
    if (!opened) {
        return UniqueFD();
    }
    const auto status = statEntry(opened->get(), "");
    const bool isIt = status && status->fileID == folder && status->device == scope_.device;
    return isIt ? std::move(*opened) : UniqueFD();
}

void LiveUpdate::processFolder(const std::vector<HintSet::Hint>& hints, std::size_t first,
                               std::size_t last) {
    const auto opened = openFolderOf(hints[first].folder);
    for (std::size_t i = first; i < last; ++i) {
        const HintSet::Hint& hint = hints[i];
        left_.rootMoved = left_.rootMoved || (hint.what & WatchHint::rootMoved) != 0;
        if (!opened) {
            // It is in no served tree any more; what comes of it is somebody else's.
            if (!scope_.roots.isParent(hint.folder)) {
                scope_.watches.unwatch(hint.folder);
            }
        } else if (!*opened) {
            left_.hints.push_back(hint);
        } else {
            merge(hint.name.empty() ? lookAtFolderItself(opened->get(), hint)
                                    : look(opened->get(), hint));
        }
    }
}

LiveUpdate::Found LiveUpdate::lookAtFolderItself(int folder, const HintSet::Hint& hint) const {
    Found found;
    found.hint = &hint;
    const auto status = statEntry(folder, "");
    if (status) {
        found.isThere = true;
        found.look.status = *status;
        const UniqueFD readable(::openat(folder, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
        found.digest = folderDigest(readable.get(), *status);
    }
    return found;
}

LiveUpdate::Found LiveUpdate::look(int folder, const HintSet::Hint& hint) {
    Found found;
    found.hint = &hint;
    found.look.lookedAt = Date::now();
    const auto status = statEntry(folder, hint.name.c_str());
    if (!status) {
        // What can't be looked at is kept as it was known.
        found.isHidden = !meansGone(status.error().code);
        return found;
    }
    found.isHidden = status->device != scope_.device || status->isMountPoint ||
                     std::ranges::find(scope_.skipped, status->fileID) != scope_.skipped.end();
    found.isThere = true;
    found.look.status = *status;
    if (!found.isHidden) {
        lookClosely(folder, hint, found);
    }
    return found;
}

// The handle first and then the status again: both are of what stands there now, or another hint
// is on its way.
void LiveUpdate::lookClosely(int folder, const HintSet::Hint& hint, Found& found) {
    const char* name = hint.name.c_str();
    const auto fingerprint = handleFingerprint(folder, name);
    const auto again = statEntry(folder, name);
    if (fingerprint && again && again->fileID == found.look.status.fileID &&
        again->birth == found.look.status.birth) {
        found.look.status = *again;
        found.look.fingerprint = *fingerprint;
    }
    if (found.look.status.isRegular()) {
        found.look.attributes = scope_.carrier.read(folder, name);
    }
    scope_.watches.watchFile(folder, name, found.look.status);
    if (found.look.status.isDirectory()) {
        const UniqueFD readable(
            ::openat(folder, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
        found.digest = folderDigest(readable.get(), found.look.status);
    }
}

void LiveUpdate::merge(const Found& found) {
    const MutexLock lock(mutex_);
    const RowNumber folder = folderRow(found.hint->folder);
    if (folder == noRow || found.isHidden) {
        return;
    }
    if (found.hint->name.empty()) {
        if (found.digest) {
            merger_.noteFolderDigest(folder, *found.digest);
        }
        return;
    }
    if ((found.hint->what & WatchHint::movedTo) != 0 &&
        found.hint->fromFolder == found.hint->folder) {
        scope_.saves.renamedAway(found.hint->folder, found.hint->fromName);
    }
    if (!found.isThere) {
        merger_.noteAbsent(folder, found.hint->name);
        return;
    }
    const RowNumber before = scope_.index.child(folder, found.hint->name);
    const bool wasKnown =
        before != noRow && EntryMerger::isSameFile(scope_.index.row(before), found.look, true);
    const RowNumber row = merger_.merge(folder, found.hint->name, found.look);
    if (row == noRow) {
        left_.hints.push_back(*found.hint);  // folders are being moved about
        return;
    }
    constexpr std::uint32_t wasAway = WatchHint::movedTo | WatchHint::gone;
    if (wasKnown && row == before && (found.hint->what & wasAway) != 0) {
        scope_.changes.returned(row);
    }
    tellArrival(*found.hint, found);
    if (scope_.index.row(row).isFolder()) {
        if (scope_.index.row(row).has(Row::unlisted)) {
            toList_.push_back(row);
        } else if (found.digest && wasKnown) {
            merger_.noteFolderDigest(row, *found.digest);
        }
    }
}

void LiveUpdate::tellArrival(const HintSet::Hint& hint, const Found& found) {
    if ((hint.what & WatchHint::movedTo) != 0) {
        const bool isIt = hint.fingerprint == 0 || found.look.fingerprint == 0 ||
                          hint.fingerprint == found.look.fingerprint;
        if (isIt) {
            const bool within = hint.fromFolder == hint.folder;
            scope_.saves.arrived(
                hint.folder, hint.name,
                within ? SafeSaves::Arrival::renamedWithin : SafeSaves::Arrival::movedIn,
                within ? hint.fromName : std::string());
            return;
        }
    }
    if ((hint.what & WatchHint::appeared) != 0) {
        scope_.saves.arrived(hint.folder, hint.name, SafeSaves::Arrival::made, {});
    }
}

}  // namespace marrowdale::native
