#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <stop_token>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "host/browser/HttpHead.h"
#include "host/daemon/ApiMessages.h"
#include "platform/foundation/Error.h"

namespace marrowdale::host {

// Content of an answer that is not in memory: read piece by piece, as fast as the client takes it,
// on threads that may wait, one call at a time.
class ContentSource {
  public:
    virtual ~ContentSource() = default;
    // Fills the beginning of the buffer and answers how much; 0 at the end. An error ends the
    // connection, so that the client knows that something is missing.
    [[nodiscard]] virtual Expected<std::size_t> read(std::span<char> buffer) = 0;
};

// An answer. Content is `body`, or comes from `source`, then of a known length or in chunks, the
// last of which says that nothing is missing.
struct BrowserResponse {
    unsigned status = 200;
    std::vector<std::pair<std::string, std::string>> fields = {};
    std::string body = {};
    std::unique_ptr<ContentSource> source = nullptr;
    std::optional<std::uint64_t> length = std::nullopt;  // of the source's content
};

// Where the content of an upload goes, on threads that may wait, one call at a time. One that goes
// without `finish` leaves nothing behind.
class ContentSink {
  public:
    virtual ~ContentSink() = default;
    [[nodiscard]] virtual Expected<void> write(std::span<const char> bytes) = 0;
    // All has come. `gone` is asked for a stop when nobody waits for the answer any more.
    [[nodiscard]] virtual BrowserResponse finish(const std::stop_token& gone) = 0;
    // What a failed write is answered with.
    [[nodiscard]] virtual BrowserResponse failed(const Error& error) = 0;
};

// Takes the answer to a request: an answer of the API, a stream of events, or a response.
class BrowserReply : public ApiReply {
  public:
    // Once, in place of `answer` and `beginEvents`. Any thread.
    virtual void respond(BrowserResponse response) = 0;
    // Ends the connection when that stop is asked for.
    virtual void endWith(const std::stop_token& stop) = 0;
};

// A request as the site sees it: taken apart, with its body.
struct BrowserRequest {
    HttpHead head;
    ApiRequest request;
};

// What a listener serves. Called on threads that may wait, several at once.
class BrowserSite {
  public:
    virtual ~BrowserSite() = default;
    // Why a request is not even looked at; none for one that may go on. May not wait.
    [[nodiscard]] virtual std::optional<BrowserResponse> refusal(const HttpHead& head) = 0;
    // What is wrong with how a request was sent; the status tells.
    [[nodiscard]] virtual BrowserResponse fault(unsigned status, std::string_view reason) = 0;
    virtual void handle(const BrowserRequest& request,
                        const std::shared_ptr<BrowserReply>& reply) = 0;
    // Where the content of a PUT goes, or why it is not taken.
    [[nodiscard]] virtual std::variant<std::unique_ptr<ContentSink>, BrowserResponse> upload(
        const BrowserRequest& request) = 0;
};

}  // namespace marrowdale::host
