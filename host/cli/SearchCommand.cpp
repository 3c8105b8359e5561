#include "host/cli/SearchCommand.h"

#include <CLI/App.hpp>

#include "host/requests/FeedJson.h"

namespace marrowdale::host {

void SearchCommand::declareArguments(CLI::App& arguments) {
    arguments
        .add_option("TEXT", texts_, "A part of a name or tag; with several, all must be there")
        ->required()
        ->expected(1, -1);
}

Outcome SearchCommand::run(CommandContext& context) {
    const auto requests = context.requests();
    if (!requests) {
        return std::unexpected(requests.error());
    }
    const auto found = (*requests)->search(texts_);
    if (!found) {
        return std::unexpected(Failure::provider(found.error()));
    }
    if (!context.json()) {
        context.output().write(ItemTable(context.colour()).page(*found));
        return {};
    }
    for (const auto& item : *found) {
        context.output().writeLine(itemJson(*item));
    }
    return {};
}

}  // namespace marrowdale::host
