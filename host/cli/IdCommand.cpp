#include "host/cli/IdCommand.h"

#include <CLI/App.hpp>

#include "host/cli/JsonWriter.h"
#include "host/daemon/HarmlessText.h"

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
        JsonWriter writer;
        writer.beginObject().key("itemIdentifier").string(resolved->identifier).endObject();
        context.output().writeLine(writer.take());
    } else {
        context.output().writeLine(harmlessName(resolved->identifier));
    }
    return {};
}

}  // namespace marrowdale::host
