#include "platform/linux/store/CRC32C.h"

#include <array>
#include <cstring>

namespace marrowdale::native {

namespace {

constexpr std::array<std::uint32_t, 256> makeTable() {
    std::array<std::uint32_t, 256> table{};
    for (std::uint32_t byte = 0; byte < 256; ++byte) {
        std::uint32_t value = byte;
        for (int bit = 0; bit < 8; ++bit) {
            value = (value >> 1U) ^ ((value & 1U) != 0 ? 0x82F63B78U : 0U);
        }
        table[byte] = value;
    }
    return table;
}

constexpr std::array<std::uint32_t, 256> table = makeTable();

#if defined(__x86_64__)
__attribute__((target("sse4.2"))) std::uint32_t crc32cByInstruction(
    std::span<const std::byte> bytes, std::uint32_t before) {
    std::uint64_t value = ~before;
    const std::byte* at = bytes.data();
    std::size_t left = bytes.size();
    for (; left >= 8; left -= 8, at += 8) {
        std::uint64_t word = 0;
        std::memcpy(&word, at, 8);
        value = __builtin_ia32_crc32di(value, word);
    }
    auto narrow = static_cast<std::uint32_t>(value);
    for (; left > 0; --left, ++at) {
        narrow = __builtin_ia32_crc32qi(narrow, static_cast<unsigned char>(*at));
    }
    return ~narrow;
}
#endif

}  // namespace

std::uint32_t crc32cByTable(std::span<const std::byte> bytes, std::uint32_t before) {
    std::uint32_t value = ~before;
    for (const std::byte byte : bytes) {
        value = (value >> 8U) ^ table[(value ^ std::to_integer<std::uint32_t>(byte)) & 0xFFU];
    }
    return ~value;
}

std::uint32_t crc32c(std::span<const std::byte> bytes, std::uint32_t before) {
#if defined(__x86_64__)
    static const bool hasInstruction = __builtin_cpu_supports("sse4.2") != 0;
    if (hasInstruction) {
        return crc32cByInstruction(bytes, before);
    }
#endif
    return crc32cByTable(bytes, before);
}

}  // namespace marrowdale::native
