#include "host/cli/DeleteCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void DeleteCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
}

std::expected<ItemAction, Failure> DeleteCommand::action(CommandContext& context) {
    auto found = identifier(context, item_);
    if (!found) {
        return std::unexpected(found.error());
    }
    ItemAction action;
    action.kind = ItemAction::Kind::remove;
    action.item = std::move(*found);
    return action;
}

}  // namespace marrowdale::host
