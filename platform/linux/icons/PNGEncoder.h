#pragma once

#include "platform/services/ImageEncoder.h"

namespace marrowdale::native {

// Writes PNG. Any thread.
class PNGEncoder final : public ImageEncoder {
  public:
    std::unique_ptr<Bytes> makeData() override;
    // PNG holds one image: null for another count.
    std::unique_ptr<ImageDestination> makePNGDestination(Bytes& data,
                                                         std::size_t imageCount) override;
};

}  // namespace marrowdale::native
