#include "platform/foundation/Utf8.h"

#include <algorithm>
#include <cstddef>

namespace marrowdale {

namespace {

// What the first byte of a form of several bytes says.
struct Form {
    std::size_t length;
    char32_t bits;      // those that the first byte carries
    char32_t smallest;  // the least code point that needs this form
};

std::optional<Form> formOf(unsigned char first) {
    if (first >= 0xC2 && first <= 0xDF) {
        return Form{2, first & 0x1FU, 0x80};
    }
    if (first >= 0xE0 && first <= 0xEF) {
        return Form{3, first & 0x0FU, 0x800};
    }
    if (first >= 0xF0 && first <= 0xF4) {
        return Form{4, first & 0x07U, 0x10000};
    }
    return std::nullopt;
}

constexpr char continuation(char32_t bits) {
    return static_cast<char>(0x80 | (bits & 0x3F));
}

}  // namespace

std::optional<char32_t> takeCodePoint(std::string_view& text) {
    const auto first = static_cast<unsigned char>(text.front());
    if (first < 0x80) {
        text.remove_prefix(1);
        return first;
    }
    const auto form = formOf(first);
    if (!form || text.size() < form->length) {
        return std::nullopt;
    }
    char32_t codePoint = form->bits;
    for (std::size_t i = 1; i < form->length; ++i) {
        const auto byte = static_cast<unsigned char>(text[i]);
        if ((byte & 0xC0) != 0x80) {
            return std::nullopt;
        }
        codePoint = (codePoint << 6) | (byte & 0x3FU);
    }
    const bool isSurrogate = codePoint >= 0xD800 && codePoint <= 0xDFFF;
    if (codePoint < form->smallest || codePoint > 0x10FFFF || isSurrogate) {
        return std::nullopt;
    }
    text.remove_prefix(form->length);
    return codePoint;
}

void appendCodePoint(std::string& text, char32_t codePoint) {
    if (codePoint < 0x80) {
        text += static_cast<char>(codePoint);
    } else if (codePoint < 0x800) {
        text += static_cast<char>(0xC0 | (codePoint >> 6));
        text += continuation(codePoint);
    } else if (codePoint < 0x10000) {
        text += static_cast<char>(0xE0 | (codePoint >> 12));
        text += continuation(codePoint >> 6);
        text += continuation(codePoint);
    } else {
        text += static_cast<char>(0xF0 | (codePoint >> 18));
        text += continuation(codePoint >> 12);
        text += continuation(codePoint >> 6);
        text += continuation(codePoint);
    }
}

bool isUtf8(std::string_view text) {
    while (!text.empty()) {
        if (!takeCodePoint(text)) {
            return false;
        }
    }
    return true;
}

bool isAscii(std::string_view text) {
    return std::ranges::all_of(text, [](char c) { return static_cast<unsigned char>(c) < 0x80; });
}

}  // namespace marrowdale
