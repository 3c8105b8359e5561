#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "platform/foundation/Data.h"

namespace marrowdale {

// Base64 (RFC 4648, section 4): the standard alphabet, padded, in one line. Any thread.

[[nodiscard]] std::string base64Encoded(std::span<const std::uint8_t> bytes);

// Reads exactly what base64Encoded writes, so that a text stands for its bytes alone: no value for
// another alphabet, white space, missing padding, or left-over bits that are not zero.
[[nodiscard]] std::optional<Data> base64Decoded(std::string_view text);

}  // namespace marrowdale
