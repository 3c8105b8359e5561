#include "host/cli/ImportCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void ImportCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("PATH", path_, "The file or folder to copy")->required();
    arguments.add_option("--into", into_, "The folder that takes it in")
        ->type_name("ITEM")
        ->required();
}

std::expected<ItemAction, Failure> ImportCommand::action(CommandContext& context) {
    if (path_.empty()) {
        return std::unexpected(Failure::commandLine("import wants a PATH"));
    }
    auto parent = identifier(context, into_);
    if (!parent) {
        return std::unexpected(parent.error());
    }
    ItemAction action;
    action.kind = ItemAction::Kind::import;
    action.path = entryPath(nameOnDisk(path_), context.environment());
    action.parent = std::move(*parent);
    return action;
}

}  // namespace marrowdale::host
