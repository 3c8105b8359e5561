#pragma once

#include <cstddef>

#include "platform/services/DirectoryEnumerator.h"

namespace marrowdale {

// Where a walk over several roots stands: in which root, and where in it.
struct FSWalkPosition {
    std::size_t root = 0;
    DirectoryPosition position;
    friend bool operator==(const FSWalkPosition&, const FSWalkPosition&) = default;
};

}  // namespace marrowdale
