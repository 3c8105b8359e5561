#include "host/cli/MkdirCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void MkdirCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("NAME", name_, "The name of the new folder")->required();
    arguments.add_option("--in", in_, "The folder that it is made in")
        ->type_name("ITEM")
        ->required();
}

std::expected<ItemAction, Failure> MkdirCommand::action(CommandContext& context) {
    auto parent = identifier(context, in_);
    if (!parent) {
        return std::unexpected(parent.error());
    }
    ItemAction action;
    action.kind = ItemAction::Kind::create;
    action.name = nameOnDisk(name_);
    action.parent = std::move(*parent);
    return action;
}

}  // namespace marrowdale::host
