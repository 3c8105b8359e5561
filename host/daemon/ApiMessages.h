#pragma once

#include <memory>
#include <optional>
#include <stop_token>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace marrowdale::host {

// A request as it came over a connection, taken apart. Texts are bytes, percent-decoded.
struct ApiRequest {
    std::string method;
    std::vector<std::string> path;  // the segments between slashes
    std::vector<std::pair<std::string, std::string>> query;
    std::string body;

    // None when the target is no path, or is encoded wrongly.
    [[nodiscard]] static std::optional<ApiRequest> fromTarget(std::string_view method,
                                                              std::string_view target);
    // The first value of that name.
    [[nodiscard]] std::optional<std::string> parameter(std::string_view name) const;
    [[nodiscard]] std::vector<std::string> parameters(std::string_view name) const;
};

struct ApiAnswer {
    unsigned status = 200;
    std::string body;
    std::string contentType = "application/json";
};

// Takes the answer to one request: either `answer` once, or `beginEvents`, any number of events,
// and `endEvents`. Any thread. A reply that goes without an answer is one of status 500.
class ApiReply {
  public:
    virtual ~ApiReply() = default;
    virtual void answer(ApiAnswer answer) = 0;
    virtual void beginEvents() = 0;
    // One event of a stream (server-sent events). An event of the same key that is still waiting
    // for a slow reader is replaced, so what waits is bounded by the number of keys.
    virtual void event(std::string_view key, std::string_view name, std::string data) = 0;
    virtual void endEvents() = 0;
    // Keeps something that sends events for as long as there is somebody to send them to; it is let
    // go on a thread that may wait.
    virtual void keepUntilGone(std::shared_ptr<void> thing) = 0;
    // Asked for a stop when the client has gone, or the server ends.
    [[nodiscard]] virtual std::stop_token gone() const = 0;
};

}  // namespace marrowdale::host
