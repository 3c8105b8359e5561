#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "host/browser/BrowserServer.h"
#include "host/browser/DocumentBrowserSite.h"

namespace marrowdale::host {

// The document browser of a service, for as long as it lives.
class BrowserService {
  public:
    // Where it is looked for when nothing else was said: an address that stays the same over
    // restarts can be kept as a bookmark.
    static constexpr std::uint16_t usualPort = 8474;

    // At that port (0: any free one). Without one, at the usual port, or any free one where that is
    // taken. The service outlives the object and, until then, tells others its addresses.
    [[nodiscard]] static Expected<std::unique_ptr<BrowserService>> start(
        HostService& service, std::optional<std::uint16_t> port);

    ~BrowserService();
    BrowserService(const BrowserService&) = delete;
    BrowserService& operator=(const BrowserService&) = delete;

    // For a person to open: begins a session, once.
    [[nodiscard]] std::string newAddress() { return site_.newLaunchAddress(); }

  private:
    BrowserService(HostService& service, std::unique_ptr<BrowserServer> server)
        : api_(service.api()), site_(service, server->port()), server_(std::move(server)) {}

    Api& api_;
    DocumentBrowserSite site_;
    std::unique_ptr<BrowserServer> server_;  // goes first
};

}  // namespace marrowdale::host
