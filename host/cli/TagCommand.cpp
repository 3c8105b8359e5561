#include "host/cli/TagCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void TagCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
    arguments.add_option("TAG", tags_, "The tags that it is to have")->expected(0, -1);
}

std::expected<ItemAction, Failure> TagCommand::action(CommandContext& context) {
    auto found = identifier(context, item_);
    if (!found) {
        return std::unexpected(found.error());
    }
    ItemAction action;
    action.kind = ItemAction::Kind::tag;
    action.item = std::move(*found);
    action.tags = tags_;
    return action;
}

}  // namespace marrowdale::host
