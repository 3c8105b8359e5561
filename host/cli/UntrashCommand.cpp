#include "host/cli/UntrashCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void UntrashCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
    arguments.add_option("--to", to_, "The folder that it goes to (default: where it was)")
        ->type_name("ITEM");
}

std::expected<ItemAction, Failure> UntrashCommand::action(CommandContext& context) {
    auto found = identifier(context, item_);
    if (!found) {
        return std::unexpected(found.error());
    }
    ItemAction action;
    action.kind = ItemAction::Kind::untrash;
    action.item = std::move(*found);
    if (to_) {
        auto parent = identifier(context, *to_);
        if (!parent) {
            return std::unexpected(parent.error());
        }
        action.parent = std::move(*parent);
    }
    return action;
}

}  // namespace marrowdale::host
