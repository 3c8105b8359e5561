#include "host/cli/IdCommand.h"

#include <CLI/App.hpp>

#include "host/requests/FeedJson.h"
#include "host/requests/HarmlessText.h"

namespace marrowdale::host {

void IdCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("PATH", path_, "A path of any form")->required();
}

Outcome IdCommand::run(CommandContext& context) {
    const auto resolved = context.resolvePath(path_);
    if (!resolved) {
        return std::unexpected(resolved.error());
    }
    if (context.json()) {
        context.output().writeLine(textJson("itemIdentifier", resolved->identifier));
    } else {
        context.output().writeLine(harmlessName(resolved->identifier));
    }
    return {};
}

}  // namespace marrowdale::host
