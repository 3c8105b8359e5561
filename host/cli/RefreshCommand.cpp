#include "host/cli/RefreshCommand.h"

#include <CLI/App.hpp>

namespace marrowdale::host {

void RefreshCommand::declareArguments(CLI::App& /*arguments*/) {}

Outcome RefreshCommand::run(CommandContext& context) {
    const auto requests = context.requests();
    if (!requests) {
        return std::unexpected(requests.error());
    }
    if (auto refreshed = (*requests)->refreshApplications(); !refreshed) {
        return std::unexpected(Failure::provider(refreshed.error()));
    }
    return {};
}

}  // namespace marrowdale::host
