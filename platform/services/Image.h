#pragma once

#include <cstdint>

#include "platform/foundation/Data.h"

namespace marrowdale {

// A picture: rows from the top, pixels from the left, four bytes a pixel (red, green, blue, alpha;
// colours not multiplied by alpha), without gaps.
struct Image {
    std::uint32_t width = 0;
    std::uint32_t height = 0;
    Data pixels;  // 4 * width * height bytes
};

}  // namespace marrowdale
