#include "platform/linux/operations/NoReplace.h"

#include <cerrno>
#include <cstdio>
#include <fcntl.h>
#include <string>
#include <unistd.h>

#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

namespace {

Unexpected failed(int code) {
    return Unexpected(errorWithPOSIXCode(code));
}

Expected<void> linkAndUnlink(int fromFolder, const char* from, const EntryStatus& status,
                             int toFolder, const char* to) {
    if (::linkat(fromFolder, from, toFolder, to, 0) != 0) {
        return failed(errno == EPERM || errno == EOPNOTSUPP ? ENOTSUP : errno);
    }
    // Somebody may have put another file there since.
    const auto now = statEntry(fromFolder, from);
    const bool isTheSame = now && now->fileID == status.fileID && now->device == status.device;
    if (isTheSame && ::unlinkat(fromFolder, from, 0) != 0) {
        const int code = errno;
        ::unlinkat(toFolder, to, 0);
        return failed(code);
    }
    return {};
}

// The kernel does not say whether it refuses the flag or the place.
Expected<void> withoutTheFlag(int fromFolder, const char* from, int toFolder, const char* to) {
    const auto status = statEntry(fromFolder, from);
    if (!status) {
        return failed(status.error().code);
    }
    if (!status->isDirectory()) {
        return linkAndUnlink(fromFolder, from, *status, toFolder, to);
    }
    if (statEntry(toFolder, to)) {
        return failed(EEXIST);
    }
    const auto within = liesIn(toFolder, status->device, status->fileID);
    if (!within) {
        return Unexpected(within.error());
    }
    return failed(*within ? EINVAL : ENOTSUP);
}

}  // namespace

Expected<void> moveWithoutReplacing(int fromFolder, const char* from, int toFolder, const char* to,
                                    NoReplaceMethod method) {
    if (method == NoReplaceMethod::rename) {
        if (::renameat2(fromFolder, from, toFolder, to, RENAME_NOREPLACE) == 0) {
            return {};
        }
        if (errno != EINVAL && errno != ENOSYS && errno != EOPNOTSUPP) {
            return failed(errno);
        }
    }
    return withoutTheFlag(fromFolder, from, toFolder, to);
}

Expected<void> nameUnnamed(int file, int folder, const char* name) {
    if (::linkat(file, "", folder, name, AT_EMPTY_PATH) == 0) {
        return {};
    }
    if (errno == EEXIST) {
        return failed(EEXIST);
    }
    // Older kernels want a privilege for that, and none for this.
    const std::string path = "/proc/self/fd/" + std::to_string(file);
    return ::linkat(AT_FDCWD, path.c_str(), folder, name, AT_SYMLINK_FOLLOW) == 0 ? Expected<void>()
                                                                                  : failed(errno);
}

Expected<bool> liesIn(int folder, DeviceID device, FileID fileID) {
    UniqueFD at(::openat(folder, ".", O_PATH | O_DIRECTORY | O_CLOEXEC));
    EntryStatus before;
    while (at) {
        const auto status = statEntry(at.get(), "");
        if (!status) {
            return failed(status.error().code);
        }
        if (status->fileID == fileID && status->device == device) {
            return true;
        }
        if (status->fileID == before.fileID && status->device == before.device) {
            return false;  // the top, which is above itself
        }
        before = *status;
        at = UniqueFD(::openat(at.get(), "..", O_PATH | O_DIRECTORY | O_CLOEXEC));
    }
    return failed(errno);
}

}  // namespace marrowdale::native
