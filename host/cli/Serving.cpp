#include "host/cli/Serving.h"

#include <memory>

#include "host/browser/BrowserService.h"
#include "host/cli/BrowserAddress.h"
#include "host/daemon/ServiceNotification.h"
#include "host/daemon/StopSignals.h"
#include "host/daemon/TrashKeeper.h"

namespace marrowdale::host {

namespace {

std::expected<std::unique_ptr<BrowserService>, Failure> startBrowser(const Serving& serving,
                                                                     HostService& service) {
    if (serving.browser == Serving::Browser::none) {
        return nullptr;
    }
    auto browser = BrowserService::start(service, serving.port);
    if (!browser) {
        return std::unexpected(Failure::start(StartFailure::from(std::move(browser.error()))));
    }
    return std::move(*browser);
}

std::unique_ptr<TrashKeeper> startTrashKeeper(const Serving& serving, HostService& service) {
    if (!serving.trashAge) {
        return nullptr;
    }
    TrashKeeper::Options options;
    options.age = *serving.trashAge;
    options.failed = [&service](const Error& error) {
        service.log().error("can't remove what was trashed long ago; " + error.description());
    };
    return std::make_unique<TrashKeeper>(service.requests(), std::move(options));
}

void tellThatItIsReady(const Serving& serving, const CommandContext& context,
                       const HostService& service, BrowserService* browser) {
    std::optional<std::string> address;
    if (browser != nullptr && serving.browser == Serving::Browser::announced) {
        address = browser->newAddress();
    }
    tellBrowserAddress(context, service.settings().rootPath, address);
    if (address && serving.told) {
        serving.told(*address);
    }
}

}  // namespace

Outcome Serving::run(const CommandContext& context) const {
    StopSignals signals;
    auto service = context.prepareService();
    if (!service) {
        return std::unexpected(service.error());
    }
    const auto started = startBrowser(*this, **service);
    if (!started) {
        return std::unexpected(started.error());
    }
    if (auto listening = (*service)->listen(); !listening) {
        return std::unexpected(Failure::start(listening.error()));
    }
    const auto trashKeeper = startTrashKeeper(*this, **service);
    signals.begin();
    tellThatItIsReady(*this, context, **service, started->get());
    notifyServiceManager(context.environment(), "READY=1");
    signals.wait();
    notifyServiceManager(context.environment(), "STOPPING=1");
    return {};
}

}  // namespace marrowdale::host
