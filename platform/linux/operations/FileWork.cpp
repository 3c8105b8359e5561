#include "platform/linux/operations/FileWork.h"

#include <cerrno>
#include <set>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include "platform/linux/files/DirectoryReader.h"
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

bool isSame(const EntryStatus& a, const EntryStatus& b) {
    return a.fileID == b.fileID && a.device == b.device;
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
    const auto done = moveWithoutReplacing(item.folder(), item.name(), folder.get(), name.c_str(),
                                           parts_.noReplace);
    if (done) {
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
    if (auto checked = run.checkpoint(removing, item.path()); !checked) {
        return checked;
    }
    const bool isFolder = found->status.isDirectory();
    if (::unlinkat(found->folder(), found->name(), isFolder ? AT_REMOVEDIR : 0) == 0) {
        return {};
    }
    const int code = errno;
    if (isFolder && (code == ENOTEMPTY || code == EEXIST)) {
        return removeFolder(*found, run);
    }
    return Unexpected(errorWithPOSIXCode(code, removing, item.path()));
}

// The folder leaves its place whole, in one step, and is taken apart where nobody looks.
Expected<void> FileWork::removeFolder(const WorkItem& item, OperationRun& run) const {
    const auto folder = folderOf(item);
    if (!folder) {
        return Unexpected(folder.error());
    }
    const auto temporary = parts_.temporaries.make(folder->get(), folder->url.path());
    if (!temporary) {
        return Unexpected(temporary.error());
    }
    const auto apart = moveWithoutReplacing(item.folder(), item.name(), temporary->descriptor(),
                                            item.name(), parts_.noReplace);
    if (!apart) {
        // Where folders can't be moved it is taken apart in its place.
        return apart.error().code == ENOTSUP
                   ? removeTree(item.folder(), item.name(), item.url.path(), run)
                   : Unexpected(errorWithPOSIXCode(apart.error().code, removing, item.url.path()));
    }
    run.passPointOfNoReturn();
    auto removed = removeTree(temporary->descriptor(), item.name(), item.url.path(), run);
    if (removed || removed.error().code == ECANCELED) {
        return {};  // gone from its place; the rest is swept at the next start
    }
    // What can't be removed must not stay hidden.
    const std::string name = item.name();
    for (std::uint64_t number = 1;; ++number) {
        const std::string next =
            number == 1 ? name : numberedName(name, number, numberPlace(name, item.status));
        const auto back = moveWithoutReplacing(temporary->descriptor(), item.name(), folder->get(),
                                               next.c_str(), parts_.noReplace);
        if (back || !isTaken(back.error())) {
            return removed;
        }
    }
}

}  // namespace marrowdale::native
