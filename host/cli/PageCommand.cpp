#include "host/cli/PageCommand.h"

#include <CLI/App.hpp>

#include "host/requests/FeedJson.h"
#include "platform/foundation/Base64.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

std::expected<Data, Failure> pageOf(const std::string& argument) {
    if (argument == "name") {
        return VantrelInitialPageSortedByName();
    }
    if (argument == "date") {
        return VantrelInitialPageSortedByDate();
    }
    auto bytes = base64Decoded(argument);
    if (!bytes) {
        return std::unexpected(Failure::commandLine(
            "--page wants a token as a page printed it (base64), or one of: date, name"));
    }
    return std::move(*bytes);
}

}  // namespace

void PageCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
    arguments.add_option("--page", page_, "Where to go on: a token, or one of: date, name")
        ->type_name("TOKEN")
        ->take_last()
        ->capture_default_str();
}

Outcome PageCommand::run(CommandContext& context) {
    const auto start = pageOf(page_);
    if (!start) {
        return std::unexpected(start.error());
    }
    const auto resolved = context.resolve(ItemArgument(item_));
    if (!resolved) {
        return std::unexpected(resolved.error());
    }
    const auto listing = resolved->requests.listing(resolved->identifier);
    if (!listing) {
        return std::unexpected(Failure::provider(listing.error()));
    }
    const auto page = (*listing)->page(*start);
    if (!page) {
        return std::unexpected(Failure::provider(page.error()));
    }
    if (context.json()) {
        context.output().writeLine(pageJson(*page));
        return {};
    }
    context.output().write(ItemTable(context.colour()).page(page->items));
    if (page->nextPage) {
        context.output().writeLine("next page: " + base64Encoded(page->nextPage->bytes()));
    }
    return {};
}

}  // namespace marrowdale::host
