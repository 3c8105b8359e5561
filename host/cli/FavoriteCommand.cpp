#include "host/cli/FavoriteCommand.h"

#include <charconv>
#include <cmath>
#include <cstdint>
#include <optional>
#include <string_view>

#include <CLI/App.hpp>

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

void FavoriteCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
    arguments.add_option("RANK", rank_, "A number");
    arguments.add_flag("--clear", clears_, "Take the rank away");
}

std::expected<ItemAction, Failure> FavoriteCommand::action(CommandContext& context) {
    if (clears_ == !rank_.empty()) {
        return std::unexpected(Failure::commandLine("favorite wants either a RANK or --clear"));
    }
    ItemAction action;
    action.kind = ItemAction::Kind::favorite;
    if (!clears_) {
        action.rank = numberIn(rank_);
        if (!action.rank) {
            return std::unexpected(Failure::commandLine("no number: " + rank_));
        }
    }
    auto found = identifier(context, item_);
    if (!found) {
        return std::unexpected(found.error());
    }
    action.item = std::move(*found);
    return action;
}

}  // namespace marrowdale::host
