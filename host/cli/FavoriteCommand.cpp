#include "host/cli/FavoriteCommand.h"

#include <charconv>
#include <cmath>
#include <cstdint>
#include <optional>
#include <string_view>

namespace marrowdale::host {

namespace {

template <typename T>
std::optional<Number> read(std::string_view text) {
    T value{};
    const auto end = text.data() + text.size();
    const auto result = std::from_chars(text.data(), end, value);
    return result.ec == std::errc() && result.ptr == end ? std::optional<Number>(value)
                                                         : std::nullopt;
}

// Whole numbers in full, of either sign; others as fractions.
std::optional<Number> numberIn(std::string_view text) {
    if (auto number = read<std::uint64_t>(text)) {
        return number;
    }
    if (auto number = read<std::int64_t>(text)) {
        return number;
    }
    auto number = read<double>(text);
    const bool isFinite = number && std::isfinite(std::get<double>(*number));
    return isFinite ? number : std::nullopt;
}

}  // namespace

bool FavoriteCommand::take(const std::string& text, ItemAction& action) const {
    action.rank = numberIn(text);
    return action.rank.has_value();
}

}  // namespace marrowdale::host
