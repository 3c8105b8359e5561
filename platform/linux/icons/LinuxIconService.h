#pragma once

#include "platform/linux/icons/CachedBitmap.h"
#include "platform/services/IconService.h"

namespace marrowdale::native {

// Reads cached bitmaps. Any thread.
class LinuxIconService final : public IconService {
  public:
    Expected<Image> imageFromCachedBitmap(const Data& data) override {
        return imageWithCachedBitmap(data);
    }
};

}  // namespace marrowdale::native
