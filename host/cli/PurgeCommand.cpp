#include "host/cli/PurgeCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void PurgeCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("--older-than", date_, "RFC 3339, such as 2026-01-31T23:59:59Z")
        ->type_name("DATE")
        ->required();
}

std::expected<ItemAction, Failure> PurgeCommand::action(CommandContext& /*context*/) {
    ItemAction action;
    action.kind = ItemAction::Kind::purge;
    action.date = Date::fromRFC3339(date_);
    if (!action.date) {
        return std::unexpected(Failure::commandLine("no date of RFC 3339: " + date_));
    }
    return action;
}

}  // namespace marrowdale::host
