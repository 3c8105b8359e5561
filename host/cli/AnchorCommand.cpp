#include "host/cli/AnchorCommand.h"

#include <CLI/App.hpp>

#include "host/requests/FeedJson.h"
#include "platform/foundation/Base64.h"

namespace marrowdale::host {

void AnchorCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", item_, "A path, a word, or an identifier")->required();
}

Outcome AnchorCommand::run(CommandContext& context) {
    const auto resolved = context.resolve(ItemArgument(item_));
    if (!resolved) {
        return std::unexpected(resolved.error());
    }
    const auto anchor = resolved->requests.anchor(resolved->identifier);
    if (!anchor) {
        return std::unexpected(Failure::provider(anchor.error()));
    }
    if (context.json()) {
        context.output().writeLine(anchorJson(*anchor));
    } else {
        context.output().writeLine(*anchor ? base64Encoded((*anchor)->bytes())
                                           : "changes can't be followed here");
    }
    return {};
}

}  // namespace marrowdale::host
