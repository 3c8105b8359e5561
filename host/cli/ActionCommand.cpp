#include "host/cli/ActionCommand.h"

#include "host/cli/ActionReport.h"
#include "host/cli/ItemArgument.h"
#include "host/daemon/StopSignals.h"
#include "host/requests/FeedJson.h"

namespace marrowdale::host {

Outcome ActionCommand::run(CommandContext& context) {
    StopSignals signals;
    const auto action = this->action(context);
    if (!action) {
        return std::unexpected(action.error());
    }
    const auto requests = context.requests();
    if (!requests) {
        return std::unexpected(requests.error());
    }
    signals.begin();
    ActionReport report(context.json() ? ActionReport::Form::json : ActionReport::Form::people);
    const auto item = (*requests)->perform(*action, report, signals.token());
    report.finish();
    if (!item) {
        return std::unexpected(Failure::provider(item.error()));
    }
    if (*item && context.json()) {
        context.output().writeLine(itemJson(**item));
    } else if (*item) {
        context.output().write(itemDetails(**item));
    }
    return {};
}

std::expected<std::string, Failure> ActionCommand::identifier(CommandContext& context,
                                                              const std::string& item) {
    auto resolved = context.resolve(ItemArgument(item));
    if (!resolved) {
        return std::unexpected(resolved.error());
    }
    return std::move(resolved->identifier);
}

std::string ActionCommand::nameOnDisk(const std::string& name) {
    return withBytesOfSurrogates(name).value_or(name);
}

}  // namespace marrowdale::host
