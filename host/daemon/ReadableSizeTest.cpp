#include <gtest/gtest.h>

#include "host/daemon/ReadableSize.h"

namespace marrowdale::host {
namespace {

TEST(ReadableSizeTest, sizesAreShort) {
    EXPECT_EQ(readableSize(0), "0 B");
    EXPECT_EQ(readableSize(999), "999 B");
    EXPECT_EQ(readableSize(1000), "1.0 kB");
    EXPECT_EQ(readableSize(9949), "9.9 kB");
    EXPECT_EQ(readableSize(9950), "10 kB");
    EXPECT_EQ(readableSize(999'499), "999 kB");
    EXPECT_EQ(readableSize(999'500), "1.0 MB");
    EXPECT_EQ(readableSize(UINT64_MAX), "18 EB");
}

}  // namespace
}  // namespace marrowdale::host
