#pragma once

#include <cerrno>
#include <cstdint>
#include <memory>

#include "platform/services/IconService.h"
#include "platform/services/ImageEncoder.h"

namespace marrowdale {

// Takes every non-empty run of bytes for a picture of one pixel, whose bytes it keeps.
class FakeIconService : public IconService {
  public:
    Expected<Image> imageFromCachedBitmap(const Data& data) override {
        if (data.empty()) {
            return Unexpected(errorWithPOSIXCode(EBADMSG));
        }
        return Image{.width = 1, .height = 1, .pixels = data};
    }
};

// "Encodes" a picture as the text "PNG" and its bytes, as far as a test lets it. Any thread; the
// faults are set between calls.
class FakeImageEncoder : public ImageEncoder {
  public:
    enum class Fault : std::uint8_t { none, noData, noDestination, notFinalized };
    Fault fault = Fault::none;

    std::unique_ptr<Bytes> makeData() override {
        return fault == Fault::noData ? nullptr : std::make_unique<Bytes>();
    }
    std::unique_ptr<ImageDestination> makePNGDestination(Bytes& data,
                                                         std::size_t imageCount) override {
        return fault == Fault::noDestination
                   ? nullptr
                   : std::make_unique<Destination>(*this, data, imageCount);
    }

  private:
    class Destination : public ImageDestination {
      public:
        Destination(const FakeImageEncoder& encoder, Bytes& data, std::size_t imageCount)
            : encoder_(encoder), data_(data), expected_(imageCount) {}
        void addImage(const Image& image) override {
            ++added_;
            const Data start = Data::fromText("PNG");
            data_.insert(data_.end(), start.bytes().begin(), start.bytes().end());
            const auto pixels = image.pixels.bytes();
            data_.insert(data_.end(), pixels.begin(), pixels.end());
        }
        Finalized finalize() override {
            return encoder_.fault != Fault::notFinalized && added_ == expected_ ? Finalized::yes
                                                                                : Finalized::no;
        }

      private:
        const FakeImageEncoder& encoder_;
        Bytes& data_;
        std::size_t expected_;
        std::size_t added_ = 0;
    };
};

}  // namespace marrowdale
