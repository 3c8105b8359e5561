#include "host/cli/WatchCommand.h"

#include <CLI/App.hpp>

#include "host/daemon/StopSignals.h"
#include "host/requests/FeedJson.h"
#include "host/requests/HarmlessText.h"
#include "platform/foundation/Mutex.h"

namespace marrowdale::host {

namespace {

std::expected<std::vector<std::string>, Failure> containersOf(const std::vector<std::string>& items,
                                                              HostRequests& requests,
                                                              const Environment& environment) {
    std::vector<std::string> containers;
    for (const std::string& item : items) {
        auto identifier = ItemArgument(item).identifier(requests, environment);
        if (!identifier) {
            return std::unexpected(CommandContext::lookUpFailure(identifier.error()));
        }
        containers.push_back(std::move(*identifier));
    }
    return containers;
}

}  // namespace

void WatchCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", items_, "What to hold open: by default root and working-set")
        ->expected(0, -1);
}

Outcome WatchCommand::run(CommandContext& context) {
    StopSignals signals;
    const auto requests = context.liveRequests();
    if (!requests) {
        return std::unexpected(requests.error());
    }
    const auto containers =
        containersOf(items_.empty() ? std::vector<std::string>{"root", "working-set"} : items_,
                     **requests, context.environment());
    if (!containers) {
        return std::unexpected(containers.error());
    }
    Mutex mutex;  // of the output, which a signal's thread writes to
    const auto result = (*requests)->watch(
        *containers, [&] { signals.begin(); },
        [&](std::string_view container) {
            const MutexLock lock(mutex);
            context.output().writeLine(context.json() ? textJson("signal", container)
                                                      : harmlessName(container));
            context.output().flush();
            if (context.output().hasFailed()) {
                signals.stop();
            }
        },
        signals.token());
    return result ? Outcome() : std::unexpected(Failure::provider(result.error()));
}

}  // namespace marrowdale::host
