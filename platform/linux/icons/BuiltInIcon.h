#pragma once

#include "platform/services/Image.h"

namespace marrowdale::native {

// The icon of last resort: a plain tile, `pixels` on a side, made without any file.
[[nodiscard]] Image builtInIcon(unsigned pixels);

}  // namespace marrowdale::native
