#include "host/cli/BrowseCommand.h"

#include <cerrno>

#include <CLI/App.hpp>

#include "host/cli/BrowserAddress.h"
#include "host/cli/Serving.h"
#include "host/daemon/TrashKeeper.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

Failure withoutBrowser(const RemoteRequests& service) {
    return Failure::start(StartFailure::refusal(
        service.serviceProcess() +
        " serves your documents without the document browser; end it and try again"));
}

Failure ofAnotherRoot(const RemoteRequests& service, const std::string& root) {
    return Failure::start(
        StartFailure::refusal(service.serviceProcess() + " serves " + root +
                              "; end it, or give another --state for another --root"));
}

}  // namespace

void BrowseCommand::declareArguments(CLI::App& arguments) {
    arguments.add_flag("--no-open", printsOnly_, "Print the address and open nothing");
}

Outcome BrowseCommand::run(CommandContext& context) {
    auto running = context.runningService();
    if (!running) {
        return std::unexpected(running.error());
    }
    if (*running != nullptr) {
        return showThatOf(**running, context);
    }
    auto served = serve(context);
    if (served) {
        return served;
    }
    // Somebody else may have been quicker.
    running = context.runningService();
    return running && *running != nullptr ? showThatOf(**running, context) : served;
}

Outcome BrowseCommand::showThatOf(RemoteRequests& service, const CommandContext& context) const {
    const auto root = service.pathOf(VantrelRootContainerItemIdentifier);
    if (!root) {
        return std::unexpected(Failure::provider(root.error()));
    }
    const auto wanted = context.namedRootPath();
    if (!wanted) {
        return std::unexpected(Failure::start(wanted.error()));
    }
    if (*wanted && **wanted != *root) {
        return std::unexpected(ofAnotherRoot(service, *root));
    }
    const auto address = service.newBrowserAddress();
    if (!address) {
        const bool isMissing = address.error() == errorWithPOSIXCode(ENXIO);
        return std::unexpected(isMissing ? withoutBrowser(service)
                                         : Failure::provider(address.error()));
    }
    tellBrowserAddress(context, *root, *address);
    show(context, *address);
    return {};
}

Outcome BrowseCommand::serve(const CommandContext& context) const {
    return Serving{.trashAge = TrashKeeper::usualAge,
                   .told = [&](const std::string& address) { show(context, address); }}
        .run(context);
}

void BrowseCommand::show(const CommandContext& context, const std::string& address) const {
    const auto state = context.stateFolder();
    if (!printsOnly_ && state) {
        // The address was printed, for whom it does not come up.
        std::ignore = showInWebBrowser(context.environment(), *state, address);
    }
}

}  // namespace marrowdale::host
