#include "platform/linux/store/DiskCheck.h"

#include <cerrno>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

namespace {

bool meansNothingThere(const Error& error) {
    return error.code == ENOENT || error.code == ENOTDIR || error.code == ELOOP ||
           error.code == EXDEV;
}

// Opens the folder that holds `path`, which is too long for one call.
Expected<UniqueFD> openParent(int root, const std::string& path) {
    return openFolderBeneath(root, path.substr(0, path.rfind('/')));
}

Expected<UniqueFD> openEntry(int root, const std::string& path) {
    struct open_how how{};
    how.flags = O_PATH | O_NOFOLLOW | O_CLOEXEC;
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS | RESOLVE_NO_XDEV;
    // EAGAIN: a rename elsewhere made the kernel unsure whether the path stayed below.
    constexpr int tries = 16;
    for (int i = 0;; ++i) {
        UniqueFD entry(
            static_cast<int>(::syscall(SYS_openat2, root, path.c_str(), &how, sizeof how)));
        if (entry) {
            return entry;
        }
        if (i == tries || (errno != EAGAIN && errno != EINTR)) {
            return Unexpected(errorWithPOSIXCode(errno, "look at", path));
        }
    }
}

Expected<EntryLook> lookAt(int folder, const char* name, const Row& row) {
    EntryLook look;
    look.lookedAt = Date::now();
    const auto status = statEntry(folder, name);
    if (!status) {
        return Unexpected(status.error());
    }
    // An open file never is: the way to it crosses no mount.
    if (status->isMountPoint && *name != '\0') {
        return Unexpected(errorWithPOSIXCode(EXDEV, "look at", name));
    }
    look.status = *status;
    if (row.fileID == raw(status->fileID) && !EntryMerger::isUnchanged(row, *status)) {
        const auto fingerprint = handleFingerprint(folder, name);
        look.fingerprint = fingerprint ? *fingerprint : 0;
    }
    return look;
}

}  // namespace

Expected<EntryLook> lookBeneath(int root, const std::string& path, const Row& row) {
    if (path.find('/') == std::string::npos) {
        return lookAt(root, path.c_str(), row);  // no folder on the way could be a link
    }
    const auto entry = openEntry(root, path);
    if (entry) {
        return lookAt(entry->get(), "", row);
    }
    // A link itself can't be opened so; its folder can.
    if (entry.error().code != ENAMETOOLONG && entry.error().code != ELOOP) {
        return Unexpected(entry.error());
    }
    const auto parent = openParent(root, path);
    if (!parent) {
        return Unexpected(parent.error());
    }
    return lookAt(parent->get(), path.c_str() + path.rfind('/') + 1, row);
}

Expected<bool> standsAt(int root, DeviceID device, const std::string& path, const Row& row) {
    const auto look = lookBeneath(root, path, row);
    if (!look) {
        return meansNothingThere(look.error()) ? Expected<bool>(false) : Unexpected(look.error());
    }
    if (look->status.device != device) {
        return false;
    }
    return EntryMerger::isUnchanged(row, look->status) || EntryMerger::isSameFile(row, *look, true);
}

}  // namespace marrowdale::native
