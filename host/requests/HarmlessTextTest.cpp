#include <gtest/gtest.h>

#include "host/requests/HarmlessText.h"

namespace marrowdale::host {
namespace {

TEST(HarmlessTextTest, plainNamesStayAsTheyAre) {
    for (const std::string_view name : {"a.txt", "with space", "-rf", "Ärger.txt", "日本語", "it's",
                                        "back\\slash", "\U0001F600"}) {
        EXPECT_EQ(harmlessName(name), name);
        EXPECT_TRUE(isHarmless(name)) << name;
    }
}

TEST(HarmlessTextTest, controlCharactersAndBrokenBytesAreQuotedAsAShellReadsThem) {
    EXPECT_EQ(harmlessName("a\nb"), "$'a\\nb'");
    EXPECT_EQ(harmlessName("\x1B[31mred"), "$'\\e[31mred'");
    EXPECT_EQ(harmlessName("it's\t"), "$'it\\'s\\t'");
    EXPECT_EQ(harmlessName("\x80\xFF"), "$'\\x80\\xff'");
    EXPECT_EQ(harmlessName("a\\\x7F"), "$'a\\\\\\x7f'");
    EXPECT_EQ(harmlessName("$'x'"), "$'$\\'x\\''");
}

TEST(HarmlessTextTest, whatTurnsTheDirectionOfALineIsEscaped) {
    EXPECT_EQ(harmlessName("a\u202Egnp.exe"), "$'a\\xe2\\x80\\xaegnp.exe'");
    EXPECT_EQ(harmlessName("a\u2028b"), "$'a\\xe2\\x80\\xa8b'");
    EXPECT_EQ(harmlessName("\u0085"), "$'\\xc2\\x85'");
}

TEST(HarmlessTextTest, onlyShortestUTF8Counts) {
    EXPECT_EQ(leadingCharacter("\xC0\xAF").length, 0U);          // overlong
    EXPECT_EQ(leadingCharacter("\xE0\x80\xAF").length, 0U);      // overlong
    EXPECT_EQ(leadingCharacter("\xED\xB2\x80").length, 0U);      // surrogate
    EXPECT_EQ(leadingCharacter("\xF4\x90\x80\x80").length, 0U);  // beyond the last character
    EXPECT_EQ(leadingCharacter("\xE2\x82").length, 0U);          // cut
    EXPECT_EQ(leadingCharacter("\xE2\x82\xACx").codePoint, U'\u20AC');
    EXPECT_EQ(leadingCharacter("\xF4\x8F\xBF\xBF").codePoint, U'\U0010FFFF');
    EXPECT_EQ(leadingCharacter({}).length, 0U);
}

TEST(HarmlessTextTest, aLineStaysOneLine) {
    EXPECT_EQ(harmlessLine("[ERROR] can't open \"a\nb\\c\""), "[ERROR] can't open \"a\\nb\\c\"");
    EXPECT_EQ(escaped("a\\\n"), "a\\\\\\n");
}

}  // namespace
}  // namespace marrowdale::host
