#include <array>
#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include "platform/linux/operations/FileCopy.h"
#include "platform/linux/operations/FileWork.h"
#include "platform/linux/operations/MoveNotes.h"
#include "platform/linux/operations/TreeCopy.h"
#include "platform/services/FileOperations.h"

// The part of FileWork that brings copies in.

namespace marrowdale::native {

namespace {

constexpr std::string_view importing = "import";

CopySource copySource(const WorkItem& item) {
    return {item.folder(), item.name(), item.status, item.url.path()};
}

Error importError(int code, const WorkItem& source, const URL& target) {
    return code == EEXIST ? errorFileExists(importing, target)
                          : errorWithPOSIXCode(code, importing, source.url.path());
}

Expected<void> sync(int descriptor, const WorkItem& source, int (*call)(int)) {
    return call(descriptor) == 0
               ? Expected<void>()
               : Unexpected(errorWithPOSIXCode(errno, importing, source.url.path()));
}

// No file without a name where the file system has none, or the kernel none on it.
bool knowsNoUnnamedFiles(int code) {
    return code == EOPNOTSUPP || code == EISDIR || code == ENOENT || code == EINVAL;
}

}  // namespace

Expected<URL> FileWork::import(const URL& source, const URL& folder, OperationRun& run) const {
    const std::string name(source.lastPathComponent());
    if (const auto checked = checkName(name, importing); !checked) {
        return Unexpected(checked.error());
    }
    auto found = Place::of(source, parts_.trees);
    const auto status = found ? found->look() : Unexpected(found.error());
    if (!status) {
        return Unexpected(errorWithPOSIXCode(status.error().code, importing, source.path()));
    }
    const WorkItem item{source, std::move(*found), *status};
    const auto opened = openFolderAt(folder, parts_.trees);
    if (!opened) {
        return Unexpected(opened.error());
    }
    // Better now than after the copy.
    if (statEntry(opened->get(), name.c_str())) {
        return Unexpected(errorFileExists(importing, opened->child(name)));
    }
    if (status->isDirectory()) {
        const auto within = liesIn(opened->get(), status->device, status->fileID);
        if (!within || *within) {
            return Unexpected(errorWithPOSIXCode(within ? EINVAL : within.error().code,
                                                 "import into itself the folder", source.path()));
        }
    }
    const bool needsNoFolder = status->isRegular() && parts_.importing == ImportMethod::unnamedFile;
    return needsNoFolder ? importFile(item, *opened, name, run)
                         : importThroughFolder(item, *opened, name, run);
}

Expected<URL> FileWork::importFile(const WorkItem& source, const WorkFolder& folder,
                                   const std::string& name, OperationRun& run) const {
    const UniqueFD target(::openat(folder.get(), ".", O_TMPFILE | O_WRONLY | O_CLOEXEC, 0600));
    if (!target) {
        const int code = errno;
        return knowsNoUnnamedFiles(code)
                   ? importThroughFolder(source, folder, name, run)
                   : Unexpected(errorWithPOSIXCode(code, importing, folder.child(name).path()));
    }
    run.expectBytes(source.status.size);
    const auto from = openSource(copySource(source));
    if (!from) {
        return Unexpected(from.error());
    }
    auto done = copyContents(from->get(), target.get(), source.status, source.url.path(), run);
    if (done) {
        copyAttributes(from->get(), target.get(), source.status, source.url.path(), run);
        done = sync(target.get(), source, ::fsync);
    }
    if (done) {
        done = run.checkpoint(importing, source.url.path());
    }
    if (!done) {
        return Unexpected(done.error());
    }
    URL imported = folder.child(name);
    const auto made = statEntry(target.get(), "");
    auto arrival = noteArrival(made ? parts_.ownMoves : nullptr, made ? made->fileID : FileID{},
                               folder.get(), name);
    if (const auto named = nameUnnamed(target.get(), folder.get(), name.c_str()); !named) {
        return Unexpected(importError(named.error().code, source, imported));
    }
    arrival.wasDone();
    run.didEntry();
    return imported;
}

Expected<URL> FileWork::importThroughFolder(const WorkItem& source, const WorkFolder& folder,
                                            const std::string& name, OperationRun& run) const {
    const auto temporary = parts_.temporaries.make(folder.get(), folder.url.path());
    if (!temporary) {
        return Unexpected(temporary.error());
    }
    const int made = temporary->descriptor();
    const auto copied = copyTree(copySource(source), made, name, run);
    auto done = copied ? sync(made, source, ::syncfs) : Unexpected(copied.error());
    if (done) {
        done = run.checkpoint(importing, source.url.path());
    }
    if (!done) {
        return Unexpected(done.error());
    }
    URL imported = folder.child(name);
    const auto moved =
        moveWithoutReplacing(made, name.c_str(), folder.get(), name.c_str(), parts_.noReplace);
    if (!moved) {
        return Unexpected(importError(moved.error().code, source, imported));
    }
    constexpr std::uint32_t ownerMayWrite = 0200;
    if (copied->isFolder && (copied->mode & ownerMayWrite) == 0 &&
        ::fchmodat(folder.get(), name.c_str(), copied->mode, 0) != 0) {
        run.warn("the copy of \"" + source.url.path() + "\" may be written to");
    }
    return imported;
}

}  // namespace marrowdale::native
