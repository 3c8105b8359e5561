#include <set>

#include <gtest/gtest.h>

#include "platform/foundation/UUID.h"

namespace marrowdale {
namespace {

constexpr std::string_view exampleText = "C0FFEE00-0123-4567-89AB-CDEF00000001";

TEST(UUIDTest, keepsItsText) {
    const auto uuid = UUID::fromText(exampleText);
    ASSERT_TRUE(uuid);
    EXPECT_EQ(uuid->bytes,
              (std::array<std::uint8_t, 16>{0xC0, 0xFF, 0xEE, 0x00, 0x01, 0x23, 0x45, 0x67, 0x89,
                                            0xAB, 0xCD, 0xEF, 0x00, 0x00, 0x00, 0x01}));
    EXPECT_EQ(uuid->text(), exampleText);
}

TEST(UUIDTest, readsLowerCase) {
    EXPECT_EQ(UUID::fromText("c0ffee00-0123-4567-89ab-cdef00000001"), UUID::fromText(exampleText));
}

TEST(UUIDTest, everyTruncationAndEveryReplacedCharacterIsRefused) {
    for (std::size_t i = 0; i < exampleText.size(); ++i) {
        EXPECT_FALSE(UUID::fromText(exampleText.substr(0, i))) << i;
        std::string text(exampleText);
        text[i] = 'g';
        EXPECT_FALSE(UUID::fromText(text)) << text;
    }
    EXPECT_FALSE(UUID::fromText(std::string(exampleText) + "0"));
    EXPECT_FALSE(UUID::fromText("C0FFEE0-00123-4567-89AB-CDEF00000001"));
}

TEST(UUIDTest, randomOnesDifferAndAreOfVersionFour) {
    std::set<UUID> seen;
    for (int i = 0; i < 1000; ++i) {
        const UUID uuid = UUID::random();
        EXPECT_EQ(uuid.bytes[6] >> 4, 4);
        EXPECT_EQ(uuid.bytes[8] >> 6, 2);
        seen.insert(uuid);
    }
    EXPECT_EQ(seen.size(), 1000U);
}

}  // namespace
}  // namespace marrowdale
