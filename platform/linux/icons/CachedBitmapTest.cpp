#include <cerrno>

#include <gtest/gtest.h>

#include "platform/linux/icons/CachedBitmap.h"
#include "platform/linux/icons/LinuxIconService.h"

namespace marrowdale::native {
namespace {

Image picture(std::uint32_t width, std::uint32_t height) {
    Bytes pixels(std::size_t{4} * width * height);
    for (std::size_t i = 0; i < pixels.size(); ++i) {
        pixels[i] = static_cast<std::uint8_t>(i * 7);
    }
    return {.width = width, .height = height, .pixels = Data(std::move(pixels))};
}

TEST(CachedBitmapTest, anImageComesBackAsItWas) {
    LinuxIconService icons;
    for (const auto& [width, height] :
         {std::pair(1U, 1U), std::pair(3U, 2U), std::pair(180U, 180U), std::pair(1024U, 1U)}) {
        const Image image = picture(width, height);
        const auto read = icons.imageFromCachedBitmap(*cachedBitmapWithImage(image));
        ASSERT_TRUE(read);
        EXPECT_EQ(read->width, width);
        EXPECT_EQ(read->height, height);
        EXPECT_EQ(read->pixels, image.pixels);
    }
}

TEST(CachedBitmapTest, whatIsNoImageHasNoBitmap) {
    for (Image image : {Image{}, Image{.width = 1, .height = 1, .pixels = {}},
                        Image{.width = 1025, .height = 1, .pixels = Data(Bytes(4100))},
                        Image{.width = 1, .height = 1, .pixels = Data(Bytes(5))}}) {
        EXPECT_EQ(cachedBitmapWithImage(image).error(), errorWithPOSIXCode(EINVAL));
    }
}

TEST(CachedBitmapTest, aBitmapCutAnywhereIsRefused) {
    const Data whole = *cachedBitmapWithImage(picture(3, 3));
    for (std::size_t size = 0; size < whole.size(); ++size) {
        EXPECT_EQ(imageWithCachedBitmap(Data::copyOf(whole.bytes().first(size))).error(),
                  errorWithPOSIXCode(EBADMSG));
    }
}

TEST(CachedBitmapTest, aByteOfAnotherValueIsNoticedWhereverItIs) {
    const Data whole = *cachedBitmapWithImage(picture(2, 2));
    for (std::size_t at = 0; at < whole.size(); ++at) {
        for (unsigned value = 0; value < 256; ++value) {
            Bytes bytes(whole.bytes().begin(), whole.bytes().end());
            if (bytes[at] == value) {
                continue;
            }
            bytes[at] = static_cast<std::uint8_t>(value);
            EXPECT_FALSE(imageWithCachedBitmap(Data(std::move(bytes))));
        }
    }
}

}  // namespace
}  // namespace marrowdale::native
