#include "host/cli/AppsCommand.h"

#include <CLI/App.hpp>

#include "host/requests/FeedJson.h"

namespace marrowdale::host {

void AppsCommand::declareArguments(CLI::App& /*arguments*/) {}

Outcome AppsCommand::run(CommandContext& context) {
    const auto requests = context.requests();
    if (!requests) {
        return std::unexpected(requests.error());
    }
    const auto libraries = (*requests)->appLibraries();
    if (!libraries) {
        return std::unexpected(Failure::provider(libraries.error()));
    }
    if (!context.json()) {
        context.output().write(ItemTable(context.colour()).page(*libraries));
        return {};
    }
    for (const auto& library : *libraries) {
        context.output().writeLine(itemJson(*library));
    }
    return {};
}

}  // namespace marrowdale::host
