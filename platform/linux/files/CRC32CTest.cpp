#include <string_view>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/files/CRC32C.h"

namespace marrowdale::native {
namespace {

std::span<const std::byte> bytesOf(std::string_view text) {
    return std::as_bytes(std::span(text));
}

TEST(CRC32CTest, GivesThePublishedValues) {
    EXPECT_EQ(crc32c({}), 0U);
    EXPECT_EQ(crc32c(bytesOf("123456789")), 0xE3069283U);
    EXPECT_EQ(crc32c(std::vector<std::byte>(32, std::byte{0})), 0x8A9136AAU);
    EXPECT_EQ(crc32c(std::vector<std::byte>(32, std::byte{0xFF})), 0x62A8AB43U);
}

TEST(CRC32CTest, InstructionAndTableAgreeAtEveryLengthAndStart) {
    std::vector<std::byte> bytes;
    for (unsigned i = 0; i < 300; ++i) {
        bytes.push_back(static_cast<std::byte>(i * 37U + i / 7U));
    }
    for (std::size_t start = 0; start < 9; ++start) {
        for (std::size_t length = 0; length + start <= bytes.size(); ++length) {
            const auto part = std::span(bytes).subspan(start, length);
            ASSERT_EQ(crc32c(part), crc32cByTable(part)) << start << " " << length;
        }
    }
}

// Long runs are summed in lanes.
TEST(CRC32CTest, InstructionAndTableAgreeOnLongRuns) {
    std::vector<std::byte> bytes(100'000);
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        bytes[i] = static_cast<std::byte>(i * i / 3 + i / 11);
    }
    for (const std::size_t length : {8191U, 8192U, 8193U, 16'383U, 16'384U, 24'581U, 100'000U}) {
        const auto part = std::span(bytes).first(length);
        EXPECT_EQ(crc32c(part), crc32cByTable(part)) << length;
        EXPECT_EQ(crc32c(part.subspan(3), crc32c(part.first(3))), crc32cByTable(part)) << length;
    }
}

TEST(CRC32CTest, GoesOnFromAnEarlierPart) {
    const auto whole = bytesOf("a text in two parts");
    EXPECT_EQ(crc32c(whole.subspan(5), crc32c(whole.first(5))), crc32c(whole));
}

}  // namespace
}  // namespace marrowdale::native
