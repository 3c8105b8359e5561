#include "host/cli/ValueCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void ValueCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
    arguments.add_option(words_.value, value_, words_.valueHelp);
    arguments.add_flag("--clear", clears_, words_.clearHelp);
}

std::expected<ItemAction, Failure> ValueCommand::action(CommandContext& context) {
    if (clears_ == !value_.empty()) {
        return std::unexpected(Failure::commandLine(std::string(name()) + " wants either a " +
                                                    words_.value + " or --clear"));
    }
    ItemAction action;
    action.kind = kind_;
    if (!clears_ && !take(value_, action)) {
        return std::unexpected(Failure::commandLine(std::string(complaint()) + ": " + value_));
    }
    auto found = identifier(context, item_);
    if (!found) {
        return std::unexpected(found.error());
    }
    action.item = std::move(*found);
    return action;
}

}  // namespace marrowdale::host
