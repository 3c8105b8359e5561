#pragma once

#include <string>

#include "platform/foundation/Error.h"
#include "platform/linux/store/EntryMerger.h"
#include "platform/linux/store/Row.h"

namespace marrowdale::native {

// Looks at `path` below the open folder `root`, following no link anywhere in it and
// crossing no mount. The fingerprint
// is read only where `row` does not show by its status alone to be what it was. Errors: POSIX;
// ENOENT, ENOTDIR, ELOOP and EXDEV mean that nothing stands there.
[[nodiscard]] Expected<EntryLook> lookBeneath(int root, const std::string& path, const Row& row);

// Whether the file of the row stands at that path on that device now. Errors: the path can't be
// looked at (EACCES, …).
[[nodiscard]] Expected<bool> standsAt(int root, DeviceID device, const std::string& path,
                                      const Row& row);

}  // namespace marrowdale::native
