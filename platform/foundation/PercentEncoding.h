#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace marrowdale {

// Percent-encoding (RFC 3986) of bytes, whatever they are. Any thread.

// Encodes every byte but "/" and the unreserved characters (letters, digits, "-", ".", "_", "~"),
// with upper-case digits.
[[nodiscard]] std::string percentEncodedPath(std::string_view path);

// No value when a "%" is not followed by two hexadecimal digits.
[[nodiscard]] std::optional<std::string> percentDecoded(std::string_view text);

}  // namespace marrowdale
