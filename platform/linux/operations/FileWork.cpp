#include "platform/linux/operations/FileWork.h"

#include <cerrno>
#include <set>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/operations/MoveNotes.h"
#include "platform/linux/operations/TreeRemoval.h"
#include "platform/services/FileOperations.h"

namespace marrowdale::native {

namespace {

constexpr std::string_view making = "make the folder";
constexpr std::string_view renaming = "rename";
constexpr std::string_view moving = "move";
constexpr std::string_view removing = "remove";
// How many numbers are tried before all names of the folder are read.
constexpr std::uint64_t firstNumbers = 8;
constexpr std::size_t readBuffer = 64U << 10U;

bool isTaken(const Error& error) {
    return error.domain == ErrorDomain::posix && error.code == EEXIST;
}

Error moveError(int code, std::string_view operation, const WorkItem& item) {
    if (code == EINVAL && item.status.isDirectory()) {
        return errorWithPOSIXCode(code, std::string(operation) + " into itself the folder",
                                  item.url.path());
    }
    return errorWithPOSIXCode(code, operation, item.url.path());
}

// The names of the folder that begin so.
Expected<std::set<std::string, std::less<>>> namesBeginning(const WorkFolder& folder,
                                                            std::string_view start) {
    auto opened = openFolderBeneath(folder.get(), {});
    if (!opened) {
        return Unexpected(opened.error());
    }
    DirectoryReader reader(std::move(*opened), readBuffer);
    std::set<std::string, std::less<>> names;
    while (true) {
        const auto entry = reader.next();
        if (!entry) {
            return Unexpected(entry.error());
        }
        if (!*entry) {
            return names;
        }
        if ((*entry)->name.starts_with(start)) {
            names.emplace((*entry)->name);
        }
    }
}

bool isFull(const Error& error) {
    return error.code == ENOSPC || error.code == EDQUOT;
}

bool isSame(const EntryStatus& a, const EntryStatus& b) {
    return a.fileID == b.fileID && a.device == b.device;
}

// Whether what stands there is the file that the URL was made for, where it says which.
bool isMeant(const URL& url, const EntryStatus& status) {
    const auto value = url.cachedResourceValue(ResourceKey::fileID);
    const auto* number = value ? std::get_if<Number>(&*value) : nullptr;
    return number == nullptr || *number == Number(raw(status.fileID));
}

}  // namespace

Expected<URL> FileWork::createSubfolder(const URL& folder, std::string_view name) const {
    if (const auto checked = checkName(name, making); !checked) {
        return Unexpected(checked.error());
    }
    const auto opened = openFolderAt(folder, parts_.trees);
    if (!opened) {
        return Unexpected(opened.error());
    }
    URL made = opened->child(name);
    if (::mkdirat(opened->get(), std::string(name).c_str(), 0777) == 0) {
        return made;
    }
    const int code = errno;
    return Unexpected(code == EEXIST ? errorFileExists(making, made)
                                     : errorWithPOSIXCode(code, making, made.path()));
}

Expected<URL> FileWork::rename(const URL& item, const std::string& newName) const {
    if (const auto checked = checkName(newName, renaming); !checked) {
        return Unexpected(checked.error());
    }
    const auto found = findItem(item, parts_.trees, renaming);
    if (!found) {
        return Unexpected(found.error());
    }
    const auto folder = folderOf(*found);
    return folder ? moveTo(*found, *folder, newName, renaming) : Unexpected(folder.error());
}

Expected<URL> FileWork::move(const URL& item, const URL& folder,
                             const std::optional<std::string>& newName) const {
    const std::string name = newName.value_or(std::string(item.lastPathComponent()));
    if (const auto checked = checkName(name, moving); !checked) {
        return Unexpected(checked.error());
    }
    const auto found = findItem(item, parts_.trees, moving);
    if (!found) {
        return Unexpected(found.error());
    }
    const auto opened = openFolderAt(folder, parts_.trees);
    return opened ? moveTo(*found, *opened, name, moving) : Unexpected(opened.error());
}

Expected<URL> FileWork::moveTo(const WorkItem& item, const WorkFolder& folder,
                               const std::string& name, std::string_view operation) const {
    URL moved = folder.child(name);
    auto leaving = noteLeaving(parts_.ownMoves, OwnMoves::Kind::leaves, item);
    auto arrival = noteArrival(parts_.ownMoves, item.status.fileID, folder.get(), name);
    const auto done = moveWithoutReplacing(item.folder(), item.name(), folder.get(), name.c_str(),
                                           parts_.noReplace);
    if (done) {
        leaving.wasDone();
        arrival.wasDone();
        return moved;
    }
    if (!isTaken(done.error())) {
        return Unexpected(moveError(done.error().code, operation, item));
    }
    // Its own name is not in its way; another name of the same file is.
    const auto inTheWay = statEntry(folder.get(), name.c_str());
    const bool isItself = inTheWay && isSame(*inTheWay, item.status) &&
                          moved.standardized() == item.url.standardized();
    return isItself ? Expected<URL>(std::move(moved))
                    : Unexpected(errorFileExists(operation, moved));
}

Expected<URL> FileWork::moveAvoidingCollision(const URL& item, const URL& folder) const {
    const std::string name(item.lastPathComponent());
    if (const auto checked = checkName(name, moving); !checked) {
        return Unexpected(checked.error());
    }
    const auto found = findItem(item, parts_.trees, moving);
    if (!found) {
        return Unexpected(found.error());
    }
    const auto opened = openFolderAt(folder, parts_.trees);
    if (!opened) {
        return Unexpected(opened.error());
    }
    auto moved = moveTo(*found, *opened, name, moving);
    const bool isInTheWay = !moved && collidingURLOf(moved.error());
    return isInTheWay ? moveToFreeName(*found, *opened) : std::move(moved);
}

Expected<URL> FileWork::moveToFreeName(const WorkItem& item, const WorkFolder& folder) const {
    const std::string name = item.name();
    const NumberPlace place = numberPlace(name, item.status);
    std::set<std::string, std::less<>> taken;
    for (std::uint64_t number = 2;; ++number) {
        if (number == firstNumbers) {
            auto names = namesBeginning(folder, commonStart(name, place));
            if (!names) {
                return Unexpected(moveError(names.error().code, moving, item));
            }
            taken = std::move(*names);
        }
        const std::string next = numberedName(name, number, place);
        if (taken.contains(next)) {
            continue;
        }
        auto moved = moveTo(item, folder, next, moving);
        if (moved || !collidingURLOf(moved.error())) {
            return moved;
        }
    }
}

NumberPlace FileWork::numberPlace(std::string_view name, const EntryStatus& status) const {
    return status.isDirectory() && !parts_.packages.isPackageName(name)
               ? NumberPlace::atEnd
               : NumberPlace::beforeExtension;
}

Expected<void> FileWork::remove(const URL& item, OperationRun& run) const {
    const auto found = findItem(item, parts_.trees, removing);
    if (!found) {
        return Unexpected(found.error());
    }
    if (!isMeant(item, found->status)) {
        return Unexpected(errorWithPOSIXCode(ENOENT, removing, item.path()));
    }
    if (auto checked = run.checkpoint(removing, item.path()); !checked) {
        return checked;
    }
    auto note = noteLeaving(parts_.ownMoves, OwnMoves::Kind::isRemoved, *found);
    auto removed = removeApart(*found, run);
    if (removed) {
        note.wasDone();
    }
    return removed;
}

// It leaves its place whole, in one step, and goes where nobody looks: a name may be another
// file's by the time that it is removed.
Expected<void> FileWork::removeApart(const WorkItem& item, OperationRun& run) const {
    const bool isFolder = item.status.isDirectory();
    if (isFolder && ::unlinkat(item.folder(), item.name(), AT_REMOVEDIR) == 0) {
        return {};  // it was empty
    }
    const auto folder = folderOf(item);
    if (!folder) {
        return Unexpected(folder.error());
    }
    // What a cut of the power leaves of a file was to be removed anyway.
    const auto temporary = parts_.temporaries.make(
        folder->get(), folder->url.path(),
        isFolder ? Temporaries::Noting::synced : Temporaries::Noting::unsynced);
    if (!temporary) {
        // Where there is no room to take it apart in, removing it in its place makes some.
        return isFull(temporary.error()) ? removeInPlace(item, run)
                                         : Unexpected(errorWithPOSIXCode(
                                               temporary.error().code, removing, item.url.path()));
    }
    const auto apart = moveWithoutReplacing(item.folder(), item.name(), temporary->descriptor(),
                                            item.name(), parts_.noReplace);
    if (!apart) {
        // Where folders can't be moved it is taken apart in its place.
        return apart.error().code == ENOTSUP || apart.error().code == EXDEV
                   ? removeInPlace(item, run)
                   : Unexpected(errorWithPOSIXCode(apart.error().code, removing, item.url.path()));
    }
    const auto taken = statEntry(temporary->descriptor(), item.name());
    if (taken && !isSame(*taken, item.status)) {
        const auto back = bringBack(item, temporary->descriptor(), *folder);
        return Unexpected(
            errorWithPOSIXCode(back ? ENOENT : back.error().code, removing, item.url.path()));
    }
    run.passPointOfNoReturn();
    auto removed = removeTree(temporary->descriptor(), item.name(), item.url.path(), run);
    if (removed || removed.error().code == ECANCELED) {
        return {};  // gone from its place; the rest is swept at the next start
    }
    // What can't be removed must not stay hidden.
    const auto back = bringBack(item, temporary->descriptor(), *folder);
    return back ? std::move(removed) : back;
}

Expected<void> FileWork::bringBack(const WorkItem& item, int from, const WorkFolder& folder) const {
    const std::string name = item.name();
    const NumberPlace place = numberPlace(name, item.status);
    for (std::uint64_t number = 1;; ++number) {
        const std::string next = number == 1 ? name : numberedName(name, number, place);
        auto back =
            moveWithoutReplacing(from, item.name(), folder.get(), next.c_str(), parts_.noReplace);
        if (back || !isTaken(back.error())) {
            return back;
        }
    }
}

// Seen half gone by others, and by the next start if the process ends in between.
Expected<void> FileWork::removeInPlace(const WorkItem& item, OperationRun& run) {
    run.passPointOfNoReturn();
    return removeTree(item.folder(), item.name(), item.url.path(), run);
}

}  // namespace marrowdale::native
