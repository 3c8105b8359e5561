#pragma once

#include <cstdint>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"

namespace marrowdale::native {

// How something gets a name without ever taking another's.
enum class NoReplaceMethod : std::uint8_t {
    rename,         // the kernel's rename that refuses; where that is refused, as below
    linkAndUnlink,  // for files; folders can't be moved at all then
};

// Moves `from` of one open folder to `to` of another. Errors: POSIX, without subject: EEXIST when
// the name is taken, EINVAL for a folder that would come to lie in itself, ENOTSUP for a folder
// where the file system can't promise that nothing is replaced.
[[nodiscard]] Expected<void> moveWithoutReplacing(int fromFolder, const char* from, int toFolder,
                                                  const char* to, NoReplaceMethod method);

// Gives an open file that has no name (O_TMPFILE) its name. EEXIST as above.
[[nodiscard]] Expected<void> nameUnnamed(int file, int folder, const char* name);

// Whether `folder` is the folder (known by its identity), or lies in it, at any depth.
[[nodiscard]] Expected<bool> liesIn(int folder, DeviceID device, FileID fileID);

}  // namespace marrowdale::native
