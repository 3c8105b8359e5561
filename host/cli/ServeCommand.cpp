#include "host/cli/ServeCommand.h"

#include <CLI/App.hpp>

#include "host/daemon/ServiceNotification.h"
#include "host/daemon/StopSignals.h"
#include "host/requests/FeedJson.h"
#include "host/requests/HarmlessText.h"

namespace marrowdale::host {

void ServeCommand::declareArguments(CLI::App& /*arguments*/) {}

Outcome ServeCommand::run(CommandContext& context) {
    StopSignals signals;
    auto service = context.startService();
    if (!service) {
        return std::unexpected(service.error());
    }
    signals.begin();
    const std::string& root = (*service)->settings().rootPath;
    context.output().writeLine(context.json() ? textJson("serving", root)
                                              : "serving " + harmlessName(root));
    context.output().flush();
    notifyServiceManager(context.environment(), "READY=1");
    signals.wait();
    notifyServiceManager(context.environment(), "STOPPING=1");
    return {};
}

}  // namespace marrowdale::host
