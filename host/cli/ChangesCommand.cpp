#include "host/cli/ChangesCommand.h"

#include <CLI/App.hpp>

#include "host/requests/FeedJson.h"
#include "host/requests/HarmlessText.h"
#include "platform/foundation/Base64.h"

namespace marrowdale::host {

namespace {

void print(const ItemChanges& changes, CommandContext& context) {
    Output& output = context.output();
    if (context.json()) {
        output.writeLine(changesJson(changes));
    } else {
        for (const std::string& identifier : changes.deleted) {
            output.writeLine("deleted  " + harmlessName(identifier));
        }
        output.write(ItemTable(context.colour()).page(changes.updated));
        output.writeLine((changes.moreComing == MoreComing::yes ? "more since: " : "now at: ") +
                         base64Encoded(changes.anchor.bytes()));
    }
    output.flush();
}

}  // namespace

void ChangesCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
    arguments.add_option("--since", since_, "The anchor, as `anchor` or `changes` printed it")
        ->type_name("TOKEN")
        ->take_last()
        ->required();
    arguments.add_flag("--all", all_, "Go on until nothing more comes");
}

Outcome ChangesCommand::run(CommandContext& context) {
    auto since = base64Decoded(since_);
    if (!since) {
        return std::unexpected(
            Failure::commandLine("--since wants an anchor as it was printed (base64)"));
    }
    const auto resolved = context.resolve(ItemArgument(item_));
    if (!resolved) {
        return std::unexpected(resolved.error());
    }
    MoreComing moreComing = MoreComing::yes;
    while (moreComing == MoreComing::yes && !context.output().hasFailed()) {
        const auto changes = resolved->requests.changes(resolved->identifier, *since);
        if (!changes) {
            return std::unexpected(Failure::provider(changes.error()));
        }
        print(*changes, context);
        since = changes->anchor;
        moreComing = all_ ? changes->moreComing : MoreComing::no;
    }
    return {};
}

}  // namespace marrowdale::host
