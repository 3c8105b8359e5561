#include "host/cli/AppCommand.h"

#include <CLI/App.hpp>

#include "host/requests/FeedJson.h"

namespace marrowdale::host {

void AppCommand::declareArguments(CLI::App& arguments) {
    arguments
        .add_option("BUNDLE_IDENTIFIER", bundleIdentifier_,
                    "The application's identifier, such as org.example.Notes")
        ->required();
}

Outcome AppCommand::run(CommandContext& context) {
    const auto requests = context.requests();
    if (!requests) {
        return std::unexpected(requests.error());
    }
    const auto item = (*requests)->applicationContainer(bundleIdentifier_);
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
