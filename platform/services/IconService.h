#pragma once

#include "platform/foundation/Error.h"
#include "platform/services/Image.h"

namespace marrowdale {

// Reads the form in which icons are handed around: a cached bitmap. Any thread.
class IconService {
  public:
    virtual ~IconService() = default;

    // EBADMSG for data that is no whole cached bitmap.
    [[nodiscard]] virtual Expected<Image> imageFromCachedBitmap(const Data& data) = 0;
};

}  // namespace marrowdale
