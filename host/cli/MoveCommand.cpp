#include "host/cli/MoveCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void MoveCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
    arguments.add_option("--to", to_, "The folder that it goes to")->type_name("ITEM")->required();
    arguments.add_option("--name", name_, "Its new name")->type_name("NAME");
}

std::expected<ItemAction, Failure> MoveCommand::action(CommandContext& context) {
    auto found = identifier(context, item_);
    if (!found) {
        return std::unexpected(found.error());
    }
    auto parent = identifier(context, to_);
    if (!parent) {
        return std::unexpected(parent.error());
    }
    ItemAction action;
    action.kind = ItemAction::Kind::move;
    action.item = std::move(*found);
    action.parent = std::move(*parent);
    if (name_) {
        action.name = nameOnDisk(*name_);
    }
    return action;
}

}  // namespace marrowdale::host
