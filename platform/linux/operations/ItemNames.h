#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "platform/foundation/Error.h"

namespace marrowdale::native {

inline constexpr std::size_t longestName = 255;

// Fails for what can't be the name of a file: EINVAL when it is empty, "." or "..", or holds a "/"
// or a NUL, ENAMETOOLONG past 255 bytes. The subject is the name.
[[nodiscard]] Expected<void> checkName(std::string_view name, std::string_view operation);

// Where a number goes that makes a taken name a free one.
enum class NumberPlace : std::uint8_t { beforeExtension, atEnd };

// "name.ext" with 2: "name 2.ext". A name that begins with its only dot has no extension, nor has
// one with a blank behind its last dot. At most 255 bytes: the part before the number is cut where
// need be, never within a character of UTF-8.
[[nodiscard]] std::string numberedName(std::string_view name, std::uint64_t number,
                                       NumberPlace place);

// What begins every numbered form of the name, whatever the number.
[[nodiscard]] std::string_view commonStart(std::string_view name, NumberPlace place);

}  // namespace marrowdale::native
