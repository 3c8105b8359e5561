#include "host/cli/PathCommand.h"

#include <CLI/App.hpp>

#include "host/cli/JsonWriter.h"
#include "host/daemon/HarmlessText.h"

namespace marrowdale::host {

void PathCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
}

Outcome PathCommand::run(CommandContext& context) {
    const auto resolved = context.resolve(ItemArgument(item_));
    if (!resolved) {
        return std::unexpected(resolved.error());
    }
    const auto url = resolved->requests.urlOf(resolved->identifier);
    if (!url) {
        return std::unexpected(Failure::provider(url.error()));
    }
    if (context.json()) {
        JsonWriter writer;
        writer.beginObject().key("path").string(url->path()).endObject();
        context.output().writeLine(writer.take());
    } else {
        context.output().writeLine(context.isOnTerminal() ? harmlessName(url->path())
                                                          : url->path());
    }
    return {};
}

}  // namespace marrowdale::host
