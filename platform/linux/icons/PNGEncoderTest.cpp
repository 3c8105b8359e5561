#include <cerrno>

#include <gtest/gtest.h>

#include "platform/linux/icons/PNG.h"
#include "platform/linux/icons/PNGEncoder.h"

namespace marrowdale::native {
namespace {

Image picture() {
    return {.width = 2, .height = 1, .pixels = Data(Bytes{255, 0, 0, 255, 10, 20, 30, 128})};
}

TEST(PNGEncoderTest, whatItWritesIsTheSamePictureAgain) {
    PNGEncoder encoder;
    const auto data = encoder.makeData();
    const auto destination = encoder.makePNGDestination(*data, 1);
    ASSERT_TRUE(destination);
    destination->addImage(picture());
    EXPECT_EQ(destination->finalize(), ImageDestination::Finalized::yes);
    const auto read = imageWithPNG(*data, 16);
    ASSERT_TRUE(read);
    EXPECT_EQ(read->width, 2U);
    EXPECT_EQ(read->height, 1U);
    EXPECT_EQ(read->pixels, picture().pixels);
}

TEST(PNGEncoderTest, itHoldsExactlyOneImage) {
    PNGEncoder encoder;
    Bytes data;
    EXPECT_FALSE(encoder.makePNGDestination(data, 0));
    EXPECT_FALSE(encoder.makePNGDestination(data, 2));
    EXPECT_EQ(encoder.makePNGDestination(data, 1)->finalize(), ImageDestination::Finalized::no);
    const auto destination = encoder.makePNGDestination(data, 1);
    destination->addImage(picture());
    destination->addImage(picture());
    EXPECT_EQ(destination->finalize(), ImageDestination::Finalized::no);
    EXPECT_TRUE(data.empty());
}

TEST(PNGEncoderTest, anImageWithoutPixelsIsNotFinalized) {
    PNGEncoder encoder;
    Bytes data;
    const auto destination = encoder.makePNGDestination(data, 1);
    destination->addImage(Image{.width = 5, .height = 5, .pixels = {}});
    EXPECT_EQ(destination->finalize(), ImageDestination::Finalized::no);
}

TEST(PNGEncoderTest, filesThatAreNoneOrTooLargeAreRefused) {
    const Bytes png = *pngWithImage(picture());
    EXPECT_EQ(imageWithPNG(png, 1).error(), errorWithPOSIXCode(EFBIG));
    EXPECT_EQ(imageWithPNG(Bytes(100, 'x'), 16).error(), errorWithPOSIXCode(EBADMSG));
    for (std::size_t size = 0; size < png.size() - 12; ++size) {  // the closing chunk aside
        EXPECT_FALSE(imageWithPNG(std::span(png).first(size), 16)) << size;
    }
}

}  // namespace
}  // namespace marrowdale::native
