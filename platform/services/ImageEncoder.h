#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>

#include "platform/foundation/Data.h"
#include "platform/services/Image.h"

namespace marrowdale {

// Where encoded images go. One thread.
class ImageDestination {
  public:
    virtual ~ImageDestination() = default;
    virtual void addImage(const Image& image) = 0;
    enum class Finalized : bool { no, yes };
    // Writes what was added. `no` where fewer or more images were added than the destination is
    // for, or one can't be encoded; then the buffer's contents mean nothing.
    [[nodiscard]] virtual Finalized finalize() = 0;
};

// Turns images into files of a format that other programs read. Any thread.
class ImageEncoder {
  public:
    virtual ~ImageEncoder() = default;

    // An empty buffer that grows; null where there is no room.
    [[nodiscard]] virtual std::unique_ptr<Bytes> makeData() = 0;
    // A destination that appends PNG to `data`, which must outlive it; null where none can be made.
    [[nodiscard]] virtual std::unique_ptr<ImageDestination> makePNGDestination(
        Bytes& data, std::size_t imageCount) = 0;
};

}  // namespace marrowdale
