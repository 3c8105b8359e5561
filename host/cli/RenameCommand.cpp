#include "host/cli/RenameCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void RenameCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
    arguments.add_option("NAME", name_, "Its new name")->required();
}

std::expected<ItemAction, Failure> RenameCommand::action(CommandContext& context) {
    auto found = identifier(context, item_);
    if (!found) {
        return std::unexpected(found.error());
    }
    ItemAction action;
    action.kind = ItemAction::Kind::rename;
    action.item = std::move(*found);
    action.name = nameOnDisk(name_);
    return action;
}

}  // namespace marrowdale::host
