#include "platform/linux/files/CRC32C.h"

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
// The instruction takes three cycles and can begin anew in each: four neighbouring lanes are summed
// at once, and joined. What bytes do to a sum is linear, so a lane's sum is moved past the next
// lane by what as many zero bytes make of each of its bits.
constexpr std::size_t laneBytes = 2048;
constexpr std::size_t lanes = 4;

using BitImages = std::array<std::uint32_t, 32>;

constexpr std::uint32_t imageOf(std::uint32_t value, const BitImages& images) {
    std::uint32_t image = 0;
    for (std::size_t bit = 0; bit < images.size(); ++bit) {
        image ^= ((value >> bit) & 1U) != 0 ? images[bit] : 0;
    }
    return image;
}

// By doubling, so for a power of two.
constexpr BitImages imagesPastZeros(std::size_t count) {
    BitImages images{};
    for (std::size_t bit = 0; bit < images.size(); ++bit) {
        const std::uint32_t value = std::uint32_t{1} << bit;
        images[bit] = (value >> 8U) ^ table[value & 0xFFU];
    }
    for (; count > 1; count /= 2) {
        const BitImages once = images;
        for (std::uint32_t& image : images) {
            image = imageOf(image, once);
        }
    }
    return images;
}

using LaneTables = std::array<std::array<std::uint32_t, 256>, 4>;

constexpr LaneTables makeLaneTables() {
    const BitImages images = imagesPastZeros(laneBytes);
    LaneTables tables{};
    for (std::size_t place = 0; place < tables.size(); ++place) {
        for (std::uint32_t byte = 0; byte < 256; ++byte) {
            tables[place][byte] = imageOf(byte << (8 * place), images);
        }
    }
    return tables;
}

constexpr LaneTables laneTables = makeLaneTables();

std::uint64_t pastLane(std::uint64_t value) {
    return laneTables[0][value & 0xFFU] ^ laneTables[1][(value >> 8U) & 0xFFU] ^
           laneTables[2][(value >> 16U) & 0xFFU] ^ laneTables[3][(value >> 24U) & 0xFFU];
}

std::uint64_t wordAt(const std::byte* at) {
    std::uint64_t word = 0;
    std::memcpy(&word, at, sizeof(word));
    return word;
}

__attribute__((target("sse4.2"))) std::uint64_t sumOfLanes(const std::byte* at,
                                                           std::uint64_t value) {
    std::uint64_t second = 0;
    std::uint64_t third = 0;
    std::uint64_t fourth = 0;
    for (const std::byte* const end = at + laneBytes; at < end; at += 8) {
        value = __builtin_ia32_crc32di(value, wordAt(at));
        second = __builtin_ia32_crc32di(second, wordAt(at + laneBytes));
        third = __builtin_ia32_crc32di(third, wordAt(at + 2 * laneBytes));
        fourth = __builtin_ia32_crc32di(fourth, wordAt(at + 3 * laneBytes));
    }
    return pastLane(pastLane(pastLane(value) ^ second) ^ third) ^ fourth;
}

__attribute__((target("sse4.2"))) std::uint32_t crc32cByInstruction(
    std::span<const std::byte> bytes, std::uint32_t before) {
    std::uint64_t value = ~before;
    const std::byte* at = bytes.data();
    std::size_t left = bytes.size();
    for (; left >= lanes * laneBytes; left -= lanes * laneBytes, at += lanes * laneBytes) {
        value = sumOfLanes(at, value);
    }
    for (; left >= 8; left -= 8, at += 8) {
        value = __builtin_ia32_crc32di(value, wordAt(at));
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
