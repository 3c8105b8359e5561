#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace marrowdale {

// UTF-8 (RFC 3629), strictly: no surrogates, no overlong forms, nothing above U+10FFFF. Any thread.

// Takes one code point off the front of `text`. No value, and `text` as it was, where the front is
// not well-formed. `text` must not be empty.
[[nodiscard]] std::optional<char32_t> takeCodePoint(std::string_view& text);

// `codePoint` must be a code point and no surrogate.
void appendCodePoint(std::string& text, char32_t codePoint);

[[nodiscard]] bool isUtf8(std::string_view text);
[[nodiscard]] bool isAscii(std::string_view text);

}  // namespace marrowdale
