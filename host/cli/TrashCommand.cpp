#include "host/cli/TrashCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void TrashCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
}

std::expected<ItemAction, Failure> TrashCommand::action(CommandContext& context) {
    auto found = identifier(context, item_);
    if (!found) {
        return std::unexpected(found.error());
    }
    ItemAction action;
    action.kind = ItemAction::Kind::trash;
    action.item = std::move(*found);
    return action;
}

}  // namespace marrowdale::host
