#include <gtest/gtest.h>

#include "platform/foundation/PercentEncoding.h"

namespace marrowdale {
namespace {

TEST(PercentEncodingTest, encodesAllButUnreservedCharactersAndSlashes) {
    EXPECT_EQ(percentEncodedPath("/aZ09-._~"), "/aZ09-._~");
    EXPECT_EQ(percentEncodedPath("a b%?#\n\xFF"), "a%20b%25%3F%23%0A%FF");
}

TEST(PercentEncodingTest, everyByteComesBack) {
    std::string bytes;
    for (int byte = 0; byte < 256; ++byte) {
        bytes += static_cast<char>(byte);
    }
    EXPECT_EQ(percentDecoded(percentEncodedPath(bytes)), bytes);
}

TEST(PercentEncodingTest, readsDigitsOfEitherCaseAndRefusesBadEscapes) {
    EXPECT_EQ(percentDecoded("%c3%A4"), "\xC3\xA4");
    for (const char* text : {"%", "%4", "a%", "a%4", "%4g", "%g4", "%%41", "% 1", "%+1"}) {
        EXPECT_EQ(percentDecoded(text), std::nullopt) << text;
    }
}

}  // namespace
}  // namespace marrowdale
