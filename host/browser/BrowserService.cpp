#include "host/browser/BrowserService.h"

#include <cerrno>

namespace marrowdale::host {

Expected<std::unique_ptr<BrowserService>> BrowserService::start(HostService& service,
                                                                std::optional<std::uint16_t> port) {
    auto server = BrowserServer::start(port.value_or(usualPort));
    if (!server && !port && server.error() == errorWithPOSIXCode(EADDRINUSE)) {
        server = BrowserServer::start(0);
    }
    if (!server) {
        return Unexpected(server.error());
    }
    std::unique_ptr<BrowserService> browser(new BrowserService(service, std::move(*server)));
    browser->server_->serve(browser->site_);
    browser->api_.offerBrowser([site = &browser->site_] { return site->newLaunchAddress(); });
    return browser;
}

BrowserService::~BrowserService() {
    api_.offerBrowser(nullptr);
}

}  // namespace marrowdale::host
