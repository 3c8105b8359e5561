#include "platform/linux/files/EntryStatus.h"

#include <cerrno>
#include <fcntl.h>
#include <linux/stat.h>
#include <sys/stat.h>

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

}  // namespace

DeviceID deviceOf(std::uint32_t major, std::uint32_t minor) {
    return DeviceID{(major << 20U) | (minor & 0xFFFFFU)};
}

Expected<EntryStatus> statEntry(int directory, const char* name) {
    struct statx found{};
    const int flags = AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT | (*name == '\0' ? AT_EMPTY_PATH : 0);
    if (::statx(directory, name, flags, statusFields, &found) != 0) {
        return Unexpected(errorWithPOSIXCode(errno, "look at", name));
    }
    return entryStatusOf(found);
}

Expected<EntryStatus> statTarget(int directory, const char* name) {
    struct statx found{};
    if (::statx(directory, name, AT_NO_AUTOMOUNT, statusFields, &found) != 0) {
        return Unexpected(errorWithPOSIXCode(errno, "look at", name));
    }
    return entryStatusOf(found);
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
