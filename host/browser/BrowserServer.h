#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>

#include "host/browser/BrowserSite.h"
#include "platform/foundation/Error.h"

namespace marrowdale::host {

// How long the listener waits for others, and how much it takes of them.
struct BrowserLimits {
    std::chrono::milliseconds headTime =
        std::chrono::seconds(10);                                  // from its first byte to its end
    std::chrono::milliseconds idleTime = std::chrono::minutes(1);  // between two requests
    std::chrono::milliseconds pieceTime = std::chrono::minutes(5);  // without a byte in or out
    std::size_t connections = 1000;
};

// Listens on the loopback address and hands requests to a site.
//
// One thread waits on all connections, so that a client that is slow, or silent, keeps nobody
// waiting; what may wait for the disk or the provider runs on a few threads of their own. A
// connection costs some kilobytes while nothing is sent, and two pieces of 64 KiB at most while
// content is. When there are too many, the one that has been idle for longest is closed.
class BrowserServer {
  public:
    // Port 0: any free one. Fails where the port is taken (EADDRINUSE) or can't be listened on.
    [[nodiscard]] static Expected<std::unique_ptr<BrowserServer>> start(std::uint16_t port,
                                                                        BrowserLimits limits = {});
    // Closes every connection and waits for calls of the site that run.
    ~BrowserServer();
    BrowserServer(const BrowserServer&) = delete;
    BrowserServer& operator=(const BrowserServer&) = delete;

    [[nodiscard]] std::uint16_t port() const;
    // Begins to take connections. The site outlives the server.
    void serve(BrowserSite& site);

  private:
    class Core;
    explicit BrowserServer(std::unique_ptr<Core> core);
    std::unique_ptr<Core> core_;
};

}  // namespace marrowdale::host
