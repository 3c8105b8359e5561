#pragma once

#include <functional>
#include <memory>
#include <stop_token>
#include <string>
#include <string_view>

#include "platform/foundation/Error.h"

namespace marrowdale::host {

struct HttpRequest {
    std::string method = "GET";
    std::string target = {};  // percent-encoded, with its query
    std::string body = {};    // JSON where there is one
};

struct HttpAnswer {
    unsigned status = 0;
    std::string body;
};

// Hears one event of a stream.
using EventTaker = std::function<void(std::string_view name, std::string_view data)>;

// A connection to the service of a state folder, over its socket. Waits for every answer. One
// thread. Errors are POSIX: ENOENT or ECONNREFUSED where no service runs, EACCES where it is
// another user's, ECONNRESET where it went away before it answered.
class HttpConnection {
  public:
    [[nodiscard]] static Expected<std::unique_ptr<HttpConnection>> open(
        const std::string& stateFolder);

    ~HttpConnection();
    HttpConnection(const HttpConnection&) = delete;
    HttpConnection& operator=(const HttpConnection&) = delete;

    // Another thread may ask for a stop, which ends the connection: ECANCELED.
    [[nodiscard]] Expected<HttpAnswer> send(const HttpRequest& request, std::stop_token stop = {});

    // Sends a request that is answered with events, and tells of each until the stream ends or the
    // stop is asked for; then the connection can't be used again. An answer that is no stream of
    // events is the value; an ended stream is an answer without a body.
    [[nodiscard]] Expected<HttpAnswer> follow(const HttpRequest& request, const EventTaker& taker,
                                              std::stop_token stop);

  private:
    class Socket;
    explicit HttpConnection(std::unique_ptr<Socket> socket);
    std::unique_ptr<Socket> socket_;
};

}  // namespace marrowdale::host
