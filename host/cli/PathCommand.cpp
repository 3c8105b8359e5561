#include "host/cli/PathCommand.h"

#include <CLI/App.hpp>

#include "host/requests/FeedJson.h"
#include "host/requests/HarmlessText.h"

namespace marrowdale::host {

void PathCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
}

Outcome PathCommand::run(CommandContext& context) {
    const auto resolved = context.resolve(ItemArgument(item_));
    if (!resolved) {
        return std::unexpected(resolved.error());
    }
    const auto path = resolved->requests.pathOf(resolved->identifier);
    if (!path) {
        return std::unexpected(Failure::provider(path.error()));
    }
    if (context.json()) {
        context.output().writeLine(textJson("path", *path));
    } else {
        context.output().writeLine(context.isOnTerminal() ? harmlessName(*path) : *path);
    }
    return {};
}

}  // namespace marrowdale::host
