#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace marrowdale::host {

// A part of content: `length` bytes from `first` on.
struct ByteRange {
    std::uint64_t first = 0;
    std::uint64_t length = 0;

    friend bool operator==(const ByteRange&, const ByteRange&) = default;
};

enum class RangeKind : std::uint8_t {
    whole,  // no range, or one in a form that may be passed over (several of them, say)
    part,
    unreachable,  // begins behind the end
};
struct RequestedRange {
    RangeKind kind = RangeKind::whole;
    ByteRange range;
};

// What a Range field asks for of content of a size.
[[nodiscard]] RequestedRange requestedRange(std::optional<std::string_view> field,
                                            std::uint64_t size);

}  // namespace marrowdale::host
