#include "platform/linux/files/EntryStatus.h"

#include <cerrno>
#include <fcntl.h>
#include <linux/magic.h>
#include <linux/stat.h>
#include <optional>
#include <sys/stat.h>
#include <sys/vfs.h>

#include "platform/linux/files/FileHandle.h"

namespace marrowdale::native {

namespace {

// The fields an item is made of; more would cost some file systems a look at the disk.
constexpr unsigned statusFields = STATX_TYPE | STATX_MODE | STATX_NLINK | STATX_UID | STATX_GID |
                                  STATX_INO | STATX_SIZE | STATX_MTIME | STATX_CTIME | STATX_BTIME;

Date dateOf(const struct statx_timestamp& time) {
    return {time.tv_sec, time.tv_nsec};
}

EntryStatus entryStatusOf(const struct statx& found) {
    EntryStatus status;
    status.device = deviceOf(found.stx_dev_major, found.stx_dev_minor);
    status.fileID = FileID{found.stx_ino};
    status.mode = found.stx_mode;
    status.linkCount = found.stx_nlink;
    status.owner = found.stx_uid;
    status.group = found.stx_gid;
    status.size = found.stx_size;
    status.modified = dateOf(found.stx_mtime);
    status.changed = dateOf(found.stx_ctime);
    status.hasBirth = (found.stx_mask & STATX_BTIME) != 0;
    if (status.hasBirth) {
        status.birth = dateOf(found.stx_btime);
    }
    status.isImmutable = (found.stx_attributes & STATX_ATTR_IMMUTABLE) != 0;
    status.isMountPoint = (found.stx_attributes & STATX_ATTR_MOUNT_ROOT) != 0;
    return status;
}

Expected<EntryStatus> look(int directory, const char* name, int flags) {
    struct statx found{};
    if (::statx(directory, name, flags | AT_NO_AUTOMOUNT, statusFields, &found) != 0) {
        return Unexpected(errorWithPOSIXCode(errno, "look at", name));
    }
    return entryStatusOf(found);
}

// File systems of this kernel's own, whose answers are never older than the question.
bool isLocal(std::uint64_t type) {
    constexpr std::uint64_t xfs = 0x58465342;
    return type == EXT4_SUPER_MAGIC || type == xfs || type == BTRFS_SUPER_MAGIC ||
           type == TMPFS_MAGIC || type == F2FS_SUPER_MAGIC;
}

// Whether `name`, which is no mount point, lies on such a file system.
bool liesOnLocal(DeviceID device, int directory, const char* name) {
    static thread_local std::optional<DeviceID> known;
    static thread_local bool knownIsLocal = false;
    if (known != device) {
        struct statfs found{};
        const int result =
            directory == AT_FDCWD ? ::statfs(name, &found) : ::fstatfs(directory, &found);
        knownIsLocal = result == 0 && isLocal(static_cast<std::uint64_t>(found.f_type));
        known = device;
    }
    return knownIsLocal;
}

}  // namespace

DeviceID deviceOf(std::uint32_t major, std::uint32_t minor) {
    return DeviceID{(major << 20U) | (minor & 0xFFFFFU)};
}

// What is mounted in a tree may have nobody who answers, and a question to it would wait for ever.
// The kernel tells of itself that the place is a mount point, which is all that is needed of it.
Expected<EntryStatus> statEntry(int directory, const char* name) {
    if (*name == '\0') {
        return look(directory, name, AT_SYMLINK_NOFOLLOW | AT_EMPTY_PATH);
    }
    auto found = look(directory, name, AT_SYMLINK_NOFOLLOW | AT_STATX_DONT_SYNC);
    if (!found || found->isMountPoint || liesOnLocal(found->device, directory, name)) {
        return found;
    }
    return look(directory, name, AT_SYMLINK_NOFOLLOW);
}

Expected<EntryStatus> statTarget(int directory, const char* name) {
    return look(directory, name, 0);
}

Expected<std::uint32_t> handleFingerprint(int directory, const char* name) {
    const Expected<FileHandle> handle = fileHandle(directory, name);
    if (handle) {
        return handle->fingerprint();
    }
    const int code = handle.error().code;
    if (code == EOPNOTSUPP || code == EOVERFLOW || code == ENOSYS || code == EPERM) {
        return 0U;
    }
    return Unexpected(handle.error());
}

bool isSettled(const Date& changed, Date now) {
    constexpr std::uint32_t unsureNanoseconds = 10'000'000;
    if (now.nanoseconds < unsureNanoseconds) {
        --now.seconds;
        now.nanoseconds += 1'000'000'000;
    }
    now.nanoseconds -= unsureNanoseconds;
    return changed < now;
}

}  // namespace marrowdale::native
