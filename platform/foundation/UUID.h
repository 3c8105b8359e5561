#pragma once

#include <array>
#include <compare>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace marrowdale {

// 16 bytes that name one thing among all (RFC 4122).
struct UUID {
    std::array<std::uint8_t, 16> bytes{};

    friend auto operator<=>(const UUID&, const UUID&) = default;

    // A new random UUID (version 4).
    [[nodiscard]] static UUID random();
    // The standard textual form, upper-case: "C0FFEE00-0000-4000-8000-000000000001".
    [[nodiscard]] std::string text() const;
    // Reads the standard form in either case; no value for anything else.
    [[nodiscard]] static std::optional<UUID> fromText(std::string_view text);
};

}  // namespace marrowdale
