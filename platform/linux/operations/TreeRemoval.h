#pragma once

#include <string>

#include "platform/foundation/Error.h"
#include "platform/linux/operations/OperationRun.h"

namespace marrowdale::native {

// Removes what stands at `name` in the open folder, a folder with all that is in it, at any depth.
// Links are removed, not followed; what vanishes meanwhile is gone, which is all that was asked.
// Success when nothing stands there. Errors: POSIX, EXDEV for a mount in the tree, and ECANCELED at
// a checkpoint of the run; what was not removed by then stays. `path` is how errors name the thing.
[[nodiscard]] Expected<void> removeTree(int folder, const std::string& name,
                                        const std::string& path, OperationRun& run);

}  // namespace marrowdale::native
