#pragma once

#include <string>

#include "platform/foundation/Error.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/operations/OperationRun.h"

namespace marrowdale::native {

// Copies the contents of one open regular file into another, empty one: by sharing the blocks where
// the file system can, else in the kernel, else through memory. Holes stay holes. Fails with EBUSY
// when the source was changed meanwhile (`before` is its status when it was opened), with ECANCELED
// at a checkpoint. `path`: how errors name the source.
[[nodiscard]] Expected<void> copyContents(int from, int to, const EntryStatus& before,
                                          const std::string& path, OperationRun& run);

// Gives an open file or folder what belongs to another beside its contents: the attributes that
// users may set, the permission bits (without those that lend an owner's rights) and the times.
// What the target can't take is told as a warning of the run, for the contents are worth more.
void copyAttributes(int from, int to, const EntryStatus& source, const std::string& path,
                    OperationRun& run);

// Whether it is the same file with the same contents as when `before` was read.
[[nodiscard]] Expected<void> checkUnchanged(int file, const EntryStatus& before,
                                            const std::string& path);

}  // namespace marrowdale::native
