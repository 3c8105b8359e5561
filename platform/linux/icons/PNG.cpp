#include "platform/linux/icons/PNG.h"

#include <cerrno>
#include <png.h>
#include <string_view>

namespace marrowdale::native {

namespace {

// The library's image record; what it allocated goes with it.
class PNGImage {
  public:
    PNGImage() { image_.version = PNG_IMAGE_VERSION; }
    ~PNGImage() { ::png_image_free(&image_); }
    PNGImage(const PNGImage&) = delete;
    PNGImage& operator=(const PNGImage&) = delete;

    png_image* get() { return &image_; }
    png_image* operator->() { return &image_; }
    [[nodiscard]] Unexpected failure(int code, std::string_view operation) const {
        return Unexpected(errorWithPOSIXCode(code, operation, &image_.message[0]));
    }

  private:
    png_image image_{};
};

}  // namespace

Expected<Bytes> pngWithImage(const Image& image) {
    PNGImage png;
    png->width = image.width;
    png->height = image.height;
    png->format = PNG_FORMAT_RGBA;
    const auto pixels = image.pixels.bytes();
    if (pixels.empty() || pixels.size() != PNG_IMAGE_SIZE(*png.get())) {
        return png.failure(EINVAL, "write PNG");
    }
    png_alloc_size_t size = PNG_IMAGE_PNG_SIZE_MAX(*png.get());
    Bytes bytes(size);
    if (::png_image_write_to_memory(png.get(), bytes.data(), &size, 0, pixels.data(), 0, nullptr) ==
        0) {
        return png.failure(EINVAL, "write PNG");
    }
    bytes.resize(size);
    return bytes;
}

Expected<Image> imageWithPNG(std::span<const std::uint8_t> bytes, std::uint32_t largestSide) {
    PNGImage png;
    if (::png_image_begin_read_from_memory(png.get(), bytes.data(), bytes.size()) == 0) {
        return png.failure(EBADMSG, "read PNG");
    }
    if (png->width > largestSide || png->height > largestSide) {
        return png.failure(EFBIG, "read PNG");
    }
    png->format = PNG_FORMAT_RGBA;
    Bytes pixels(PNG_IMAGE_SIZE(*png.get()));
    if (::png_image_finish_read(png.get(), nullptr, pixels.data(), 0, nullptr) == 0) {
        return png.failure(EBADMSG, "read PNG");
    }
    return Image{.width = png->width, .height = png->height, .pixels = Data(std::move(pixels))};
}

}  // namespace marrowdale::native
