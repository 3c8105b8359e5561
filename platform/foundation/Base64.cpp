#include "platform/foundation/Base64.h"

#include <algorithm>
#include <array>
#include <cstddef>

namespace marrowdale {

namespace {

constexpr std::string_view alphabet =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
constexpr std::size_t bytesInGroup = 3;
constexpr std::size_t charactersInGroup = 4;
constexpr std::uint8_t noDigit = 0xFF;

constexpr std::array<std::uint8_t, 256> digitValues = [] {
    std::array<std::uint8_t, 256> values{};
    values.fill(noDigit);
    for (std::size_t i = 0; i < alphabet.size(); ++i) {
        values[static_cast<unsigned char>(alphabet[i])] = static_cast<std::uint8_t>(i);
    }
    return values;
}();

// One to three bytes.
void appendGroup(std::string& text, std::span<const std::uint8_t> group) {
    std::uint32_t bits = 0;
    for (std::size_t i = 0; i < bytesInGroup; ++i) {
        bits = (bits << 8) | (i < group.size() ? group[i] : 0U);
    }
    for (std::size_t i = 0; i < charactersInGroup; ++i) {
        text += i <= group.size() ? alphabet[(bits >> (18 - 6 * i)) & 0x3F] : '=';
    }
}

// Two to four characters, the padding taken off.
bool appendBytes(Bytes& bytes, std::string_view group) {
    std::uint32_t bits = 0;
    for (std::size_t i = 0; i < charactersInGroup; ++i) {
        const std::uint8_t digit =
            i < group.size() ? digitValues[static_cast<unsigned char>(group[i])] : std::uint8_t{0};
        if (digit == noDigit) {
            return false;
        }
        bits = (bits << 6) | digit;
    }
    const std::size_t count = group.size() - 1;
    for (std::size_t i = 0; i < count; ++i) {
        bytes.push_back(static_cast<std::uint8_t>(bits >> (16 - 8 * i)));
    }
    return ((bits << (8 * count)) & 0xFFFFFF) == 0;
}

}  // namespace

std::string base64Encoded(std::span<const std::uint8_t> bytes) {
    std::string text;
    text.reserve((bytes.size() + bytesInGroup - 1) / bytesInGroup * charactersInGroup);
    while (!bytes.empty()) {
        const std::size_t count = std::min(bytes.size(), bytesInGroup);
        appendGroup(text, bytes.first(count));
        bytes = bytes.subspan(count);
    }
    return text;
}

std::optional<Data> base64Decoded(std::string_view text) {
    if (text.size() % charactersInGroup != 0) {
        return std::nullopt;
    }
    Bytes bytes;
    bytes.reserve(text.size() / charactersInGroup * bytesInGroup);
    while (!text.empty()) {
        std::string_view group = text.substr(0, charactersInGroup);
        text.remove_prefix(charactersInGroup);
        for (int padding = 0; padding < 2 && text.empty() && group.ends_with('='); ++padding) {
            group.remove_suffix(1);
        }
        if (!appendBytes(bytes, group)) {
            return std::nullopt;
        }
    }
    return Data(std::move(bytes));
}

}  // namespace marrowdale
