#include "host/cli/InfoCommand.h"

#include <CLI/App.hpp>

#include "host/requests/FeedJson.h"

namespace marrowdale::host {

void InfoCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
}

Outcome InfoCommand::run(CommandContext& context) {
    const auto resolved = context.resolve(ItemArgument(item_));
    if (!resolved) {
        return std::unexpected(resolved.error());
    }
    const auto item = resolved->requests.item(resolved->identifier);
    if (!item) {
        return std::unexpected(Failure::provider(item.error()));
    }
    if (context.json()) {
        context.output().writeLine(itemJson(**item));
    } else {
        context.output().write(itemDetails(**item));
    }
    return {};
}

}  // namespace marrowdale::host
