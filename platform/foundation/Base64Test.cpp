#include <set>

#include <gtest/gtest.h>

#include "platform/foundation/Base64.h"

namespace marrowdale {
namespace {

std::string encodedText(std::string_view text) {
    return base64Encoded(Data::fromText(text).bytes());
}

TEST(Base64Test, writesTheStandardExamples) {
    EXPECT_EQ(encodedText(""), "");
    EXPECT_EQ(encodedText("f"), "Zg==");
    EXPECT_EQ(encodedText("fo"), "Zm8=");
    EXPECT_EQ(encodedText("foo"), "Zm9v");
    EXPECT_EQ(encodedText("foob"), "Zm9vYg==");
    EXPECT_EQ(encodedText("fooba"), "Zm9vYmE=");
    EXPECT_EQ(encodedText("foobar"), "Zm9vYmFy");
    EXPECT_EQ(encodedText("\xFB\xFF\xBF"), "+/+/");
}

TEST(Base64Test, bytesOfEveryLengthComeBack) {
    Bytes bytes;
    for (int length = 0; length < 600; ++length) {
        EXPECT_EQ(base64Decoded(base64Encoded(bytes)), Data(bytes));
        bytes.push_back(static_cast<std::uint8_t>(length * 37));
    }
}

TEST(Base64Test, refusesEverythingElse) {
    for (const char* text :
         {"Z", "Zg", "Zg=", "Zg= =", "Zg==\n", " Zg==", "Zg==Zg==", "=",
          "====", "Z===", "Zh==", "Zm9=", "Zm-v", "Zm_v", "Zm9v=", "Zm9vZ", "Zg=A", "Zm\xC3v"}) {
        EXPECT_FALSE(base64Decoded(text)) << text;
    }
}

// Of all texts of one group, each that is read is the one that is written for its bytes.
TEST(Base64Test, everyGroupThatIsReadIsTheOneThatIsWritten) {
    const std::string_view characters = "AQZgz09+/=-";
    for (const char a : characters) {
        for (const char b : characters) {
            for (const char c : characters) {
                for (const char d : characters) {
                    const std::string text{a, b, c, d};
                    if (const auto data = base64Decoded(text)) {
                        EXPECT_EQ(base64Encoded(data->bytes()), text);
                    }
                }
            }
        }
    }
}

}  // namespace
}  // namespace marrowdale
