#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <span>

namespace marrowdale::native {

// How much history is kept: what is younger than `age`, and the newest `events` whatever the clock
// says; but never more than `bytes` of segments, as far as they are not needed to load the index.
struct Retention {
    std::chrono::seconds age = std::chrono::days(30);
    std::uint64_t events = 1'000'000;
    std::uint64_t bytes = std::uint64_t{1} << 30U;
};

// What retention looks at in one segment.
struct SegmentAge {
    std::int64_t created = 0;        // seconds since 1970, as the clock stood
    std::uint64_t eventsBehind = 0;  // that are kept in the segments after it
    std::uint64_t bytes = 0;
};

// How many of the segments, oldest first, may go. The last `needed` stay in any case, at least one.
//
// The events of a segment are not younger than the segment after it. Clocks are set, though: a date
// in the future, or before one of an earlier segment, says nothing, and the next one that does
// counts. So nothing is taken for older than it is, but by a clock that is wrong now.
[[nodiscard]] std::size_t surplusSegments(std::span<const SegmentAge> segments, std::size_t needed,
                                          const Retention& retention, std::int64_t now);

}  // namespace marrowdale::native
