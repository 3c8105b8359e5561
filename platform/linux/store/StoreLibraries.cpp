// The folders that are recorded beside the root: found, lost and found again.

#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <set>
#include <utility>

#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/store/StoreCore.h"

namespace marrowdale::native {

namespace {

// A library's row keeps where it stood, so that what was in it is known to be gone when the folder
// is, though nobody asks for it any more.
constexpr const char* pathAttribute = "path";
constexpr std::size_t longestKey = 254;

bool isGoodKey(std::string_view key) {
    return !key.empty() && key.size() <= longestKey && !key.contains('/') && !key.contains('\0');
}

bool meetInOneAnother(std::string_view a, std::string_view b) {
    return isAtOrBelow(a, b) || isAtOrBelow(b, a);
}

using Paths = std::set<std::string, std::less<>>;

// Whether one of the paths is that one, above it or below it.
bool meetsOneOf(const Paths& paths, std::string_view path) {
    for (std::string_view above = path; !above.empty(); above = above.substr(0, above.rfind('/'))) {
        if (paths.contains(above)) {
            return true;
        }
    }
    const auto next = paths.lower_bound(std::string(path) + "/");
    return next != paths.end() && isAtOrBelow(*next, path);
}

// What stands at a library's path. Nothing is asked of what is mounted there or on the
// application's own folder above it, of which there may be nobody to answer: that is EXDEV.
Expected<EntryStatus> lookAtLibrary(const std::string& path) {
    const auto documents = path.rfind('/');
    const auto application = documents == 0 ? 0 : path.rfind('/', documents - 1);
    const auto base = holdFolder(path.substr(0, application + 1));
    const auto folder = base ? holdFolderBeneath(base->get(), path.substr(application + 1))
                             : Unexpected(base.error());
    return folder ? statEntry(folder->get(), "") : Unexpected(folder.error());
}

// Whether the error of a look says that no folder is there.
bool isMissing(const Error& error) {
    return error.code == ENOENT || error.code == ENOTDIR || error.code == ELOOP;
}

}  // namespace

// Of two that get in each other's way the one with the lower key counts, of two with one key the
// one with the lower path.
std::vector<Store::Core::WantedLibrary> Store::Core::wantedLibraries(
    std::vector<LibraryFolder> libraries, const std::string& rootPath) {
    std::ranges::sort(libraries);
    const auto repeated = std::ranges::unique(libraries, {}, &LibraryFolder::key);
    libraries.erase(repeated.begin(), repeated.end());
    std::vector<WantedLibrary> wanted;
    Paths taken;
    for (LibraryFolder& library : libraries) {
        const bool isRefused = !isGoodKey(library.key) || !library.path.starts_with('/') ||
                               meetInOneAnother(rootPath, library.path) ||
                               meetsOneOf(taken, library.path);
        if (!isRefused) {
            taken.insert(library.path);
        }
        wanted.push_back({std::move(library), isRefused});
    }
    return wanted;
}

Expected<void> Store::Core::setLibraries(std::vector<LibraryFolder> libraries) {
    auto wanted = wantedLibraries(std::move(libraries), rootPath());
    {
        const MutexLock lock(mutex_);
        wanted_ = std::move(wanted);
        wantedChanged_ = true;
    }
    return lookForMissing();
}

std::vector<EventRoot> Store::Core::eventRoots() const {
    std::vector<EventRoot> roots{{{}, rootPath(), true}};
    for (const auto& library : roots_.libraries()) {
        // A refused one is no tree of its own.
        if (!library->problem || library->problem->code != EINVAL) {
            roots.push_back({library->storedPath(), library->path, library->isRecorded()});
        }
    }
    return roots;
}

Store::Core::Bound Store::Core::bindLibraries() {
    std::vector<WantedLibrary> wanted;
    bool changed = false;
    {
        const MutexLock lock(mutex_);
        wanted = wanted_;
        changed = std::exchange(wantedChanged_, false);
    }
    if (changed) {
        retireOthers(wanted);
    }
    Bound news;
    std::vector<RecordedRoots::FolderPointer> libraries;
    for (const WantedLibrary& library : wanted) {
        libraries.push_back(bound(library, libraries, news));
    }
    roots_.setLibraries(std::move(libraries));
    return news;
}

// The library as it stands now; one that was open and stands where it stood is as it was.
RecordedRoots::FolderPointer Store::Core::bound(
    const WantedLibrary& library, const std::vector<RecordedRoots::FolderPointer>& others,
    Bound& news) {
    auto before = roots_.library(library.folder.key);
    if (before != nullptr && before->path != library.folder.path) {
        before = nullptr;
    }
    const auto standing = lookAtLibrary(library.folder.path);
    if (!library.isRefused && before != nullptr && standing && before->isAt(*standing)) {
        return before;
    }
    auto folder = std::make_shared<RecordedRoots::Folder>();
    folder->key = library.folder.key;
    folder->path = library.folder.path;
    if (library.isRefused) {
        folder->problem = errorWithPOSIXCode(EINVAL, "record", folder->path);
        noteLibraryProblem(*folder, before);
    } else if (auto look = openLibrary(*folder, others)) {
        placeLibrary(*folder, *look, news);
    } else {
        folder->problem = look.error();
        folder->parent = before != nullptr ? before->parent : FileID{};
        noteLibraryProblem(*folder, before);
    }
    return folder;
}

// A library that is removed while it is held open tells so too late, when it is let go of. Where
// its parent can't be watched, whoever knows the libraries tells, as of those that are new.
void Store::Core::watchParent(int library, RecordedRoots::Folder& folder) const {
    const UniqueFD parent(::openat(library, "..", O_PATH | O_DIRECTORY | O_CLOEXEC));
    const auto status = parent ? statEntry(parent.get(), "") : Unexpected(Error{});
    const auto unindexed = unindexedFolders();
    if (watcher_ && status && status->device == device_ &&
        std::ranges::find(unindexed, status->fileID) == unindexed.end() &&
        watcher_->watchFolder(parent.get(), status->fileID)) {
        folder.parent = status->fileID;
    }
}

Expected<EntryLook> Store::Core::openLibrary(
    RecordedRoots::Folder& folder, const std::vector<RecordedRoots::FolderPointer>& others) const {
    const auto refusal = [&](int code) {
        return Unexpected(errorWithPOSIXCode(code, "record", folder.path));
    };
    auto opened = openFolder(folder.path);
    if (!opened) {
        return refusal(opened.error().code);
    }
    const Date now = Date::now();
    const auto status = statEntry(opened->get(), "");
    const auto fingerprint = handleFingerprint(opened->get(), "");
    if (!status || !fingerprint) {
        return refusal(status ? fingerprint.error().code : status.error().code);
    }
    if (status->device != device_) {
        return refusal(EXDEV);
    }
    watchParent(opened->get(), folder);  // and then see whether it still is where it was
    if (canonicalPath(folder.path).value_or(std::string()) != folder.path) {
        return refusal(ELOOP);
    }
    const auto unindexed = unindexedFolders();
    const bool isTaken =
        roots_.root().isAt(*status) ||
        std::ranges::any_of(others, [&](const auto& other) { return other->isAt(*status); });
    if (isTaken || std::ranges::find(unindexed, status->fileID) != unindexed.end()) {
        return refusal(EINVAL);
    }
    folder.open = std::move(*opened);
    folder.device = status->device;
    folder.file = status->fileID;
    return EntryLook{*status, *fingerprint, now};
}

// A row for the folder: the one it had, or a new one where another folder stood at its path.
void Store::Core::placeLibrary(const RecordedRoots::Folder& folder, const EntryLook& look,
                               Bound& news) {
    const std::string name = folder.storedPath();
    const MutexLock lock(mutex_);
    RowNumber row = index_.child(rootRow, name);
    if (row != noRow && !EntryMerger::isSameFile(index_.row(row), look, true)) {
        changes_.leave(row);
        row = noRow;
    }
    if (row == noRow) {
        // It may have been a folder in one of the trees until now.
        for (const RowNumber other : index_.rowsOfFile(raw(look.status.fileID))) {
            if (!index_.row(other).has(Row::limbo) &&
                EntryMerger::isSameFile(index_.row(other), look, false)) {
                changes_.leave(other);
            }
        }
        row = index_.add(rootRow, name, EntryMerger::valuesOf(look));
        if (row == noRow) {
            return;
        }
        changes_.appeared(row);
        news.fresh.push_back(row);
    } else {
        // Whatever happened there while it was not recorded.
        news.mustLookAtAll = true;
    }
    index_.setAttributes(row, {{pathAttribute, folder.path}});
}

// What was in a folder that is gone is gone; what is in one that can't be looked at is kept.
void Store::Core::noteLibraryProblem(const RecordedRoots::Folder& folder,
                                     const RecordedRoots::FolderPointer& before) {
    const bool isKnown =
        before != nullptr && before->problem && before->problem->code == folder.problem->code;
    if (!isKnown && folder.problem->code != ENOENT) {
        log("the documents in " + folder.path +
            " can't be recorded: " + folder.problem->description());
    }
    RowNumber row = noRow;
    {
        const MutexLock lock(mutex_);
        row = isGoodKey(folder.key) ? index_.child(rootRow, folder.storedPath()) : noRow;
    }
    if (row != noRow) {
        retire(row, lookAtLibrary(folder.path));
    }
}

void Store::Core::retireOthers(std::span<const WantedLibrary> wanted) {
    std::set<std::string_view> keys;
    for (const WantedLibrary& library : wanted) {
        keys.insert(library.folder.key);
    }
    std::vector<std::pair<RowNumber, std::string>> others;
    {
        const MutexLock lock(mutex_);
        RowNumber child = index_.row(rootRow).firstChild();
        for (; child != noRow; child = index_.row(child).next) {
            if (index_.isLibrary(child) && !keys.contains(index_.name(child).substr(1))) {
                const CarriedAttributes& known = index_.attributes(child);
                others.emplace_back(child, known.empty() ? std::string() : known.front().second);
            }
        }
    }
    for (const auto& [row, path] : others) {
        retire(row, lookAtLibrary(path));
    }
}

// The library is looked at no more. What is in it keeps its rows, and so its identifiers, as long
// as its folder is where it was.
void Store::Core::retire(RowNumber row, const Expected<EntryStatus>& standing) {
    const MutexLock lock(mutex_);
    const bool isGone =
        standing ? standing->device == device_ && raw(standing->fileID) != index_.row(row).fileID
                 : isMissing(standing.error());
    if (isGone) {
        changes_.leave(row);
        return;
    }
    if (!index_.row(row).has(Row::untold)) {
        index_.row(row).set(Row::untold, true);
        index_.markDirty(row);
        unwatchTree(row);
    }
}

void Store::Core::unwatchTree(RowNumber folder) {
    std::vector<RowNumber> left{folder};
    while (!left.empty()) {
        const RowNumber next = left.back();
        left.pop_back();
        watches_->unwatch(FileID{index_.row(next).fileID});
        index_.row(next).set(Row::unlisted, true);
        for (RowNumber below = index_.row(next).firstChild(); below != noRow;
             below = index_.row(below).next) {
            if (index_.row(below).isFolder()) {
                left.push_back(below);
            }
        }
    }
}

Expected<bool> Store::Core::followLibraries(const TreeScope& scope) {
    Bound news = bindLibraries();
    if (news.mustLookAtAll) {
        return false;
    }
    if (news.fresh.empty()) {
        return true;
    }
    Reconciler reconciler(scope);
    if (auto listed = reconciler.runOn(std::move(news.fresh)); !listed) {
        return Unexpected(listed.error());
    }
    return !anyStands(reconciler.missedFolders());
}

// Whoever is told of the library now forgot what was in it when it went.
void Store::Core::tellReturnedLibraries() {
    const auto libraries = roots_.libraries();
    const MutexLock lock(mutex_);
    for (const auto& library : libraries) {
        const RowNumber row =
            library->isOpen() ? index_.child(rootRow, library->storedPath()) : noRow;
        if (row != noRow && index_.row(row).has(Row::untold)) {
            changes_.appearedWithAllBelow(row);
            index_.row(row).set(Row::untold, false);
            index_.markDirty(row);
        }
    }
}

}  // namespace marrowdale::native
