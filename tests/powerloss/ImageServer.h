#pragma once

#include <string>

#include "tests/powerloss/MemoryFile.h"
#include "tests/powerloss/WriteLog.h"

namespace marrowdale::tests {

// Mounts a file system with the one file `image` on the folder, and serves it on this thread until
// it is unmounted. A byte is written to `ready` when it is mounted. Answers what the process ends
// with.
[[nodiscard]] int serveImage(const std::string& folder, MemoryFile& contents, WriteLog& log,
                             int ready);

}  // namespace marrowdale::tests
