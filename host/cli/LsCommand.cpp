#include "host/cli/LsCommand.h"

#include <CLI/App.hpp>

#include "host/cli/FollowedPages.h"
#include "host/requests/ItemJson.h"

namespace marrowdale::host {

namespace {

void printJson(const std::vector<FileProviderItemPtr>& items, Output& output) {
    JsonWriter writer;
    for (const auto& item : items) {
        appendItem(writer, *item);
        output.writeLine(writer.take());
    }
}

}  // namespace

void LsCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->capture_default_str();
}

Outcome LsCommand::run(CommandContext& context) {
    const auto resolved = context.resolve(ItemArgument(item_));
    if (!resolved) {
        return std::unexpected(resolved.error());
    }
    const auto listing = resolved->requests.listing(resolved->identifier);
    if (!listing) {
        return std::unexpected(Failure::provider(listing.error()));
    }
    Output& output = context.output();
    ItemTable table(context.colour());
    const auto result = followPages(**listing, [&](const std::vector<FileProviderItemPtr>& items) {
        if (context.json()) {
            printJson(items, output);
        } else {
            output.write(table.page(items));
        }
        output.flush();
        return !output.hasFailed();
    });
    if (!result) {
        return std::unexpected(Failure::provider(result.error()));
    }
    return {};
}

}  // namespace marrowdale::host
