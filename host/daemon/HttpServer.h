#pragma once

#include <functional>
#include <memory>
#include <string>

#include "host/daemon/ApiMessages.h"
#include "platform/foundation/Error.h"

namespace marrowdale::host {

// Takes requests over connections and hands each to a handler; sends what the handler answers.
//
// One thread waits on all connections, so that a client that reads slowly, never reads, or goes
// away keeps nobody waiting; handlers run on a few threads of their own. A connection carries one
// request after another. Requests may be as long as their headers allow and bodies of 1 MiB.
class HttpServer {
  public:
    // Answers one request, at once or later; called on the server's threads, several at once. No
    // exception may leave it.
    using Handler = std::function<void(ApiRequest request, std::shared_ptr<ApiReply> reply)>;

    [[nodiscard]] static std::unique_ptr<HttpServer> start(Handler handler);
    // Takes no more requests, tells replies that nobody is there any more, waits for handlers that
    // run, closes every connection, and removes the socket.
    ~HttpServer();
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;

    // Takes connections over the socket of a state folder, which is made (mode 0600) under another
    // name first, so that it is never seen before it listens; one that a killed service left is
    // replaced. Only processes of this process's user are answered. Errors: POSIX.
    [[nodiscard]] Expected<void> listenInFolder(const std::string& stateFolder);

  private:
    class Core;
    explicit HttpServer(std::unique_ptr<Core> core);
    std::unique_ptr<Core> core_;
};

}  // namespace marrowdale::host
