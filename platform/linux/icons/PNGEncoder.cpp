#include "platform/linux/icons/PNGEncoder.h"

#include <optional>

#include "platform/linux/icons/PNG.h"

namespace marrowdale::native {

namespace {

class PNGDestination final : public ImageDestination {
  public:
    explicit PNGDestination(Bytes& data) : data_(data) {}

    void addImage(const Image& image) override {
        ++added_;
        image_ = image;
    }
    Finalized finalize() override {
        if (added_ != 1) {
            return Finalized::no;
        }
        const auto bytes = pngWithImage(*image_);
        if (!bytes) {
            return Finalized::no;
        }
        data_.insert(data_.end(), bytes->begin(), bytes->end());
        return Finalized::yes;
    }

  private:
    Bytes& data_;
    std::optional<Image> image_;
    unsigned added_ = 0;
};

}  // namespace

std::unique_ptr<Bytes> PNGEncoder::makeData() {
    return std::make_unique<Bytes>();
}

std::unique_ptr<ImageDestination> PNGEncoder::makePNGDestination(Bytes& data,
                                                                 std::size_t imageCount) {
    return imageCount == 1 ? std::make_unique<PNGDestination>(data) : nullptr;
}

}  // namespace marrowdale::native
