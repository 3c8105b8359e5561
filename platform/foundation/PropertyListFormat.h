#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace marrowdale::propertylist {

// The constants of the binary format, shared by its reader and its writer; see
// docs/formats/property-list.md.

inline constexpr std::string_view magic = "bplist00";
inline constexpr std::size_t trailerSize = 32;

// Upper half of an object's first byte; the lower half holds a size or a count.
enum class Kind : std::uint8_t {
    constant = 0x0,
    integer = 0x1,
    real = 0x2,
    date = 0x3,
    data = 0x4,
    asciiString = 0x5,
    utf16String = 0x6,
    array = 0xA,
    dictionary = 0xD,
};

inline constexpr std::uint8_t falseByte = 0x08;
inline constexpr std::uint8_t trueByte = 0x09;
inline constexpr std::uint8_t dateByte = 0x33;
inline constexpr std::uint8_t realByte = 0x23;   // eight bytes
inline constexpr std::uint8_t floatByte = 0x22;  // four bytes, read only
inline constexpr std::uint8_t countFollows = 0x0F;

// Dates count from 2001-01-01T00:00:00 UTC.
inline constexpr std::int64_t dateOrigin = 978'307'200;
// A date's greatest distance from there, so that no sum overflows.
inline constexpr std::int64_t dateRange = 9'200'000'000'000'000'000;

}  // namespace marrowdale::propertylist
