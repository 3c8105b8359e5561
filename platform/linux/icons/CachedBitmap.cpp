#include "platform/linux/icons/CachedBitmap.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <span>
#include <string_view>

#include "platform/linux/files/CRC32C.h"

namespace marrowdale::native {

namespace {

constexpr std::string_view magic = "mrwbmp2\n";
constexpr std::size_t widthAt = 8;
constexpr std::size_t heightAt = 12;
constexpr std::size_t checksumAt = 16;
constexpr std::size_t pixelsAt = 20;
constexpr std::size_t bytesInPixel = 4;

void put32(std::span<std::uint8_t> bytes, std::size_t at, std::uint32_t value) {
    for (std::size_t i = 0; i < sizeof(value); ++i) {
        bytes[at + i] = static_cast<std::uint8_t>(value >> (8 * i));
    }
}

std::uint32_t get32(std::span<const std::uint8_t> bytes, std::size_t at) {
    std::uint32_t value = 0;
    for (std::size_t i = 0; i < sizeof(value); ++i) {
        value |= static_cast<std::uint32_t>(bytes[at + i]) << (8 * i);
    }
    return value;
}

// Over everything but itself.
std::uint32_t checksum(std::span<const std::uint8_t> bytes) {
    const std::uint32_t header = crc32c(std::as_bytes(bytes.first(checksumAt)));
    return crc32c(std::as_bytes(bytes.subspan(pixelsAt)), header);
}

bool isSide(std::uint32_t side) {
    return side >= 1 && side <= largestBitmapSide;
}

bool isImage(std::uint32_t width, std::uint32_t height, std::size_t bytes) {
    return isSide(width) && isSide(height) && bytes == bytesInPixel * width * height;
}

}  // namespace

Expected<Data> cachedBitmapWithImage(const Image& image) {
    const auto pixels = image.pixels.bytes();
    if (!isImage(image.width, image.height, pixels.size())) {
        return Unexpected(errorWithPOSIXCode(EINVAL, "make a bitmap", ""));
    }
    Bytes bytes(pixelsAt + pixels.size());
    std::ranges::copy(magic, bytes.begin());
    put32(bytes, widthAt, image.width);
    put32(bytes, heightAt, image.height);
    std::ranges::copy(pixels, bytes.begin() + pixelsAt);
    put32(bytes, checksumAt, checksum(bytes));
    return Data(std::move(bytes));
}

bool isCachedBitmap(const Data& data) {
    const auto bytes = data.bytes();
    return bytes.size() >= pixelsAt && std::ranges::equal(bytes.first(widthAt), magic) &&
           isImage(get32(bytes, widthAt), get32(bytes, heightAt), bytes.size() - pixelsAt) &&
           get32(bytes, checksumAt) == checksum(bytes);
}

Expected<Image> imageWithCachedBitmap(const Data& data) {
    if (!isCachedBitmap(data)) {
        return Unexpected(errorWithPOSIXCode(EBADMSG, "read a bitmap", ""));
    }
    return Image{.width = get32(data.bytes(), widthAt),
                 .height = get32(data.bytes(), heightAt),
                 .pixels = Data::copyOf(data.bytes().subspan(pixelsAt))};
}

}  // namespace marrowdale::native
