#include <gtest/gtest.h>

#include "platform/foundation/Utf8.h"

namespace marrowdale {
namespace {

TEST(Utf8Test, everyCodePointComesBack) {
    for (char32_t codePoint = 0; codePoint <= 0x10FFFF; ++codePoint) {
        if (codePoint >= 0xD800 && codePoint <= 0xDFFF) {
            continue;
        }
        std::string text;
        appendCodePoint(text, codePoint);
        std::string_view rest = text;
        ASSERT_EQ(takeCodePoint(rest), codePoint);
        ASSERT_TRUE(rest.empty());
    }
}

TEST(Utf8Test, illFormedTextIsRefusedAndLeftAsItIs) {
    for (const char* text :
         {"\x80", "\xBF", "\xC0\x80", "\xC1\xBF", "\xC2", "\xC2 ", "\xE0\x80\x80", "\xE0\x9F\xBF",
          "\xE2\x82", "\xED\xA0\x80", "\xED\xBF\xBF", "\xF0\x80\x80\x80", "\xF0\x8F\xBF\xBF",
          "\xF0\x9F\x98", "\xF4\x90\x80\x80", "\xF5\x80\x80\x80", "\xFE", "\xFF"}) {
        std::string_view rest = text;
        EXPECT_FALSE(takeCodePoint(rest)) << text;
        EXPECT_EQ(rest, text);
        EXPECT_FALSE(isUtf8(std::string("a") + text));
    }
}

TEST(Utf8Test, asciiIsUtf8AndNotTheOtherWayRound) {
    EXPECT_TRUE(isAscii(""));
    EXPECT_TRUE(isAscii("a\x7F"));
    EXPECT_FALSE(isAscii("\xC3\xA4"));
    EXPECT_TRUE(isUtf8("\xC3\xA4 and \xF0\x9F\x98\x80"));
    EXPECT_TRUE(isUtf8(std::string_view("\0", 1)));
}

}  // namespace
}  // namespace marrowdale
