#pragma once

#include <cstdint>

#include "platform/foundation/Error.h"
#include "platform/services/Image.h"

namespace marrowdale::native {

// The icon service's own form of an icon: a small header with a checksum, and the pixels as they
// are in an Image. See docs/formats/cached-bitmap.md.

inline constexpr std::uint32_t largestBitmapSide = 1024;

// EINVAL for an image without pixels, with a side beyond the largest one, or with another number of
// bytes than its sides ask for.
[[nodiscard]] Expected<Data> cachedBitmapWithImage(const Image& image);
// Whether it is a whole bitmap.
[[nodiscard]] bool isCachedBitmap(const Data& data);
// EBADMSG for anything that is not a whole bitmap.
[[nodiscard]] Expected<Image> imageWithCachedBitmap(const Data& data);

}  // namespace marrowdale::native
