#pragma once

#include <compare>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace marrowdale {

// A point in time with nanoseconds, counted from 1970-01-01T00:00:00 UTC without leap seconds.
// `nanoseconds` is always 0 to 999,999,999 and counts forward, so half a second before the epoch is
// {-1, 500000000}. Every file time of the system can be held without loss.
struct Date {
    std::int64_t seconds = 0;
    std::uint32_t nanoseconds = 0;

    friend auto operator<=>(const Date&, const Date&) = default;

    // RFC 3339 in UTC with nine fractional digits: "2026-01-31T23:59:59.000000001Z". Years before
    // 0000 and after 9999 are written with a sign and as many digits as they need.
    [[nodiscard]] std::string rfc3339() const;

    // Reads RFC 3339 with any offset and up to nine fractional digits (the fraction may be absent),
    // and the signed years that rfc3339() writes. A leap second (23:59:60 UTC) is the second after
    // it. No value for anything else.
    [[nodiscard]] static std::optional<Date> fromRFC3339(std::string_view text);

    [[nodiscard]] static Date now();
};

}  // namespace marrowdale
