#include "host/requests/HarmlessText.h"

#include <array>
#include <cstdint>
#include <optional>

namespace marrowdale::host {

namespace {

bool isContinuation(char c) {
    return (static_cast<unsigned char>(c) & 0xC0U) == 0x80U;
}

// How many bytes a character takes, by its first byte; 0 for a byte that begins none.
std::size_t sequenceLength(unsigned char first) {
    if (first < 0x80) {
        return 1;
    }
    if (first >= 0xC2 && first <= 0xDF) {
        return 2;
    }
    if (first >= 0xE0 && first <= 0xEF) {
        return 3;
    }
    return first >= 0xF0 && first <= 0xF4 ? 4 : 0;
}

bool isShortestAndValid(char32_t codePoint, std::size_t length) {
    constexpr std::array<char32_t, 5> smallest{0, 0, 0x80, 0x800, 0x10000};
    const bool isSurrogate = codePoint >= 0xD800 && codePoint <= 0xDFFF;
    return codePoint >= smallest.at(length) && codePoint <= 0x10FFFF && !isSurrogate;
}

bool isHarmless(char32_t codePoint) {
    const bool isControl = codePoint < 0x20 || (codePoint >= 0x7F && codePoint <= 0x9F);
    const bool isSeparator = codePoint == 0x2028 || codePoint == 0x2029;
    const bool turnsDirection = (codePoint >= 0x202A && codePoint <= 0x202E) ||
                                (codePoint >= 0x2066 && codePoint <= 0x2069) ||
                                codePoint == 0x200E || codePoint == 0x200F || codePoint == 0x061C;
    return !isControl && !isSeparator && !turnsDirection;
}

void appendHex(std::string& out, char byte) {
    constexpr std::string_view digits = "0123456789abcdef";
    const auto value = static_cast<unsigned char>(byte);
    out += "\\x";
    out += digits[value >> 4U];
    out += digits[value & 0xFU];
}

std::optional<std::string_view> shortEscape(char byte) {
    switch (byte) {
        case '\n':
            return "\\n";
        case '\t':
            return "\\t";
        case '\r':
            return "\\r";
        case '\x1B':
            return "\\e";
        default:
            return std::nullopt;
    }
}

void appendEscape(std::string& out, std::string_view bytes) {
    for (const char byte : bytes) {
        if (const auto escape = shortEscape(byte)) {
            out += *escape;
        } else {
            appendHex(out, byte);
        }
    }
}

// Copies what is harmless and not in `special`, puts a backslash before what is in it, and escapes
// the rest.
std::string escapedWith(std::string_view text, std::string_view special) {
    std::string out;
    out.reserve(text.size() + 8);
    while (!text.empty()) {
        const LeadingCharacter character = leadingCharacter(text);
        const std::size_t length = character.length == 0 ? 1 : character.length;
        const std::string_view bytes = text.substr(0, length);
        if (character.length == 0 || !isHarmless(character.codePoint)) {
            appendEscape(out, bytes);
        } else {
            if (length == 1 && special.contains(bytes.front())) {
                out += '\\';
            }
            out += bytes;
        }
        text.remove_prefix(length);
    }
    return out;
}

}  // namespace

LeadingCharacter leadingCharacter(std::string_view text) {
    if (text.empty()) {
        return {};
    }
    const auto first = static_cast<unsigned char>(text.front());
    const std::size_t length = sequenceLength(first);
    if (length == 0 || text.size() < length) {
        return {};
    }
    constexpr std::array<std::uint8_t, 5> firstBits{0, 0x7F, 0x1F, 0x0F, 0x07};
    char32_t codePoint = first & firstBits.at(length);
    for (const char next : text.substr(1, length - 1)) {
        if (!isContinuation(next)) {
            return {};
        }
        codePoint = (codePoint << 6U) | (static_cast<unsigned char>(next) & 0x3FU);
    }
    return isShortestAndValid(codePoint, length) ? LeadingCharacter{codePoint, length}
                                                 : LeadingCharacter{};
}

bool isHarmless(std::string_view text) {
    while (!text.empty()) {
        const LeadingCharacter character = leadingCharacter(text);
        if (character.length == 0 || !isHarmless(character.codePoint)) {
            return false;
        }
        text.remove_prefix(character.length);
    }
    return true;
}

std::string escaped(std::string_view text) {
    return escapedWith(text, "\\");
}

std::string harmlessLine(std::string_view text) {
    return isHarmless(text) ? std::string(text) : escapedWith(text, {});
}

std::string harmlessName(std::string_view name) {
    if (isHarmless(name) && !name.starts_with("$'")) {
        return std::string(name);
    }
    return "$'" + escapedWith(name, "\\'") + "'";
}

}  // namespace marrowdale::host
