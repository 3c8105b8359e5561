#include "host/cli/UsedCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void UsedCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
    arguments.add_option("DATE", date_, "RFC 3339, such as 2026-01-31T23:59:59Z");
    arguments.add_flag("--clear", clears_, "Take the date away");
}

std::expected<ItemAction, Failure> UsedCommand::action(CommandContext& context) {
    if (clears_ == !date_.empty()) {
        return std::unexpected(Failure::commandLine("used wants either a DATE or --clear"));
    }
    ItemAction action;
    action.kind = ItemAction::Kind::used;
    if (!clears_) {
        action.date = Date::fromRFC3339(date_);
        if (!action.date) {
            return std::unexpected(Failure::commandLine("no date of RFC 3339: " + date_));
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
