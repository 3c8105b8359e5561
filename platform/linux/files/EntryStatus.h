#pragma once

#include <cstdint>

#include "platform/foundation/Date.h"
#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"

namespace marrowdale::native {

// What one statx of an entry says; the entry itself, links not followed.
struct EntryStatus {
    DeviceID device{};
    FileID fileID{};
    std::uint32_t mode = 0;  // st_mode: type and permission bits
    std::uint32_t linkCount = 0;
    std::uint32_t owner = 0;
    std::uint32_t group = 0;
    std::uint64_t size = 0;
    Date birth;  // the epoch where the file system keeps none (hasBirth is false)
    Date modified;
    Date changed;
    bool hasBirth = false;
    bool isImmutable = false;   // the file system refuses every change, whoever asks
    bool isMountPoint = false;  // the root of a mount: another tree stands here

    [[nodiscard]] bool isDirectory() const { return (mode & 0170000U) == 0040000U; }
    [[nodiscard]] bool isRegular() const { return (mode & 0170000U) == 0100000U; }
    [[nodiscard]] bool isSymbolicLink() const { return (mode & 0170000U) == 0120000U; }
};

// The kernel's encoding of a device number.
[[nodiscard]] DeviceID deviceOf(std::uint32_t major, std::uint32_t minor);

// Looks at `name` in the open folder `directory` (AT_FDCWD for an absolute path; an empty name for
// the open file itself). Never follows a link, never waits for a mount: not for one to be made, nor
// for who serves one, so what is said of a mount point may be old, but for its device. Errors:
// POSIX; the subject is the name.
[[nodiscard]] Expected<EntryStatus> statEntry(int directory, const char* name);

// The same for what a final link leads to (every link on the way is followed); `name` is not empty.
// ENOENT for a link that leads nowhere, ELOOP for a loop of links.
[[nodiscard]] Expected<EntryStatus> statTarget(int directory, const char* name);

// Whether a file that was looked at at `now`, or later, with that change time would show another
// one after any change: false where the time is younger than 10 ms, the file systems' clock, or
// lies in the future.
[[nodiscard]] bool isSettled(const Date& changed, Date now);

// A fingerprint of the kernel's file handle of `name` in `directory` (as above), which a file keeps
// through renames and which differs, with the inode number, from that of the file that had the
// inode number before. 0 where the file system gives no handles.
[[nodiscard]] Expected<std::uint32_t> handleFingerprint(int directory, const char* name);

}  // namespace marrowdale::native
