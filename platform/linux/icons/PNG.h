#pragma once

#include <span>

#include "platform/foundation/Error.h"
#include "platform/services/Image.h"

namespace marrowdale::native {

// The bytes of a PNG file, eight bits a channel. EINVAL for an image that PNG can't hold.
[[nodiscard]] Expected<Bytes> pngWithImage(const Image& image);

// The picture in a PNG file, whatever its depth and colours. EBADMSG for what is none, EFBIG for
// one with a side above `largestSide`, of which no pixel is read.
[[nodiscard]] Expected<Image> imageWithPNG(std::span<const std::uint8_t> bytes,
                                           std::uint32_t largestSide);

}  // namespace marrowdale::native
