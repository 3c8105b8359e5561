#include "platform/foundation/PercentEncoding.h"

#include <cstddef>

#include "platform/foundation/HexDigits.h"

namespace marrowdale {

namespace {

constexpr bool standsForItself(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
           c == '.' || c == '_' || c == '~' || c == '/';
}

}  // namespace

std::string percentEncodedPath(std::string_view path) {
    std::string text;
    text.reserve(path.size());
    for (const char c : path) {
        if (standsForItself(c)) {
            text += c;
        } else {
            const auto byte = static_cast<unsigned char>(c);
            text += '%';
            text += upperCaseHexDigits[byte >> 4];
            text += upperCaseHexDigits[byte & 0x0F];
        }
    }
    return text;
}

std::optional<std::string> percentDecoded(std::string_view text) {
    std::string bytes;
    bytes.reserve(text.size());
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '%') {
            bytes += text[i];
            continue;
        }
        if (text.size() - i < 3) {
            return std::nullopt;
        }
        const auto high = hexDigitValue(text[i + 1]);
        const auto low = hexDigitValue(text[i + 2]);
        if (!high || !low) {
            return std::nullopt;
        }
        bytes += static_cast<char>((*high << 4) | *low);
        i += 2;
    }
    return bytes;
}

}  // namespace marrowdale
