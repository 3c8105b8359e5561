#include "platform/foundation/UUID.h"

#include <cstddef>
#include <random>

#include "platform/foundation/HexDigits.h"

namespace marrowdale {

namespace {

constexpr std::size_t textLength = 36;

constexpr bool isDashPosition(std::size_t position) {
    return position == 8 || position == 13 || position == 18 || position == 23;
}

}  // namespace

UUID UUID::random() {
    std::random_device source;
    UUID uuid;
    for (std::size_t i = 0; i < uuid.bytes.size(); i += 4) {
        const std::uint32_t word = source();
        for (std::size_t j = 0; j < 4; ++j) {
            uuid.bytes[i + j] = static_cast<std::uint8_t>(word >> (8 * j));
        }
    }
    uuid.bytes[6] = static_cast<std::uint8_t>((uuid.bytes[6] & 0x0F) | 0x40);  // version 4
    uuid.bytes[8] = static_cast<std::uint8_t>((uuid.bytes[8] & 0x3F) | 0x80);  // RFC 4122 variant
    return uuid;
}

std::string UUID::text() const {
    std::string text;
    text.reserve(textLength);
    for (const std::uint8_t byte : bytes) {
        if (isDashPosition(text.size())) {
            text += '-';
        }
        text += upperCaseHexDigits[byte >> 4];
        text += upperCaseHexDigits[byte & 0x0F];
    }
    return text;
}

std::optional<UUID> UUID::fromText(std::string_view text) {
    if (text.size() != textLength) {
        return std::nullopt;
    }
    UUID uuid;
    std::size_t nibble = 0;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (isDashPosition(i)) {
            if (text[i] != '-') {
                return std::nullopt;
            }
            continue;
        }
        const auto value = hexDigitValue(text[i]);
        if (!value) {
            return std::nullopt;
        }
        auto& byte = uuid.bytes[nibble / 2];
        byte = static_cast<std::uint8_t>((byte << 4) | *value);
        ++nibble;
    }
    return uuid;
}

}  // namespace marrowdale
