#include "host/browser/BrowserConnection.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <boost/asio/co_spawn.hpp>
#include <boost/asio/detached.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/write.hpp>
#include <cerrno>
#include <charconv>
#include <sys/socket.h>

#include "host/browser/HttpResponse.h"
#include "host/requests/ErrorJson.h"

namespace marrowdale::host {

namespace {

using asio::ip::tcp;

constexpr std::size_t pieceSize = std::size_t{64} << 10U;
constexpr std::size_t readSize = std::size_t{4} << 10U;
constexpr std::uint64_t longestBody = std::uint64_t{1} << 20U;
constexpr std::uint64_t mostDropped = std::uint64_t{64} << 20U;
constexpr unsigned badRequest = 400;
constexpr unsigned tooMuchContent = 413;
constexpr unsigned serverError = 500;

bool peerHasGone(int descriptor) {
    char byte = 0;
    const ssize_t count = ::recv(descriptor, &byte, 1, MSG_PEEK | MSG_DONTWAIT);
    return count == 0 || (count < 0 && errno != EAGAIN && errno != EINTR);
}

std::string_view reasonOf(HeadFault fault) {
    switch (fault) {
        case HeadFault::malformed:
            return "that is no request";
        case HeadFault::tooLarge:
            return "the head of the request is too long";
        case HeadFault::unknownEncoding:
            return "content of a known length is wanted";
        case HeadFault::unknownVersion:
            break;
    }
    return "HTTP/1.1 is wanted";
}

// An empty one is the last.
std::string chunkOf(std::string_view content) {
    std::array<char, 2 * sizeof(std::size_t)> digits{};
    constexpr int hexadecimal = 16;
    const auto written =
        std::to_chars(digits.data(), digits.data() + digits.size(), content.size(), hexadecimal);
    std::string chunk(digits.data(), written.ptr);
    return chunk.append("\r\n").append(content).append("\r\n");
}

// Paths have one form: what could be read as another one by somebody else is refused.
bool isPlain(const ApiRequest& request) {
    return std::ranges::none_of(request.path, [](const std::string& segment) {
        return segment == "." || segment == ".." || segment.contains('/') || segment.contains('\0');
    });
}

}  // namespace

// The site's way to the connection; every call is carried over to the listener's thread.
class BrowserConnection::Reply final : public BrowserReply {
  public:
    explicit Reply(std::shared_ptr<BrowserConnection> connection)
        : connection_(std::move(connection)) {}
    ~Reply() override {
        if (!isAnswered_) {
            answer({.status = serverError,
                    .body = errorJson(errorWithPOSIXCode(EIO, "answer the request", {}))});
        }
    }
    Reply(const Reply&) = delete;
    Reply& operator=(const Reply&) = delete;

    void respond(BrowserResponse response) override {
        isAnswered_ = true;
        tell([response = std::make_shared<BrowserResponse>(std::move(response))](Answers& answers) {
            answers.response = std::move(*response);
        });
    }
    void answer(ApiAnswer answer) override { respond(responseOf(std::move(answer))); }
    void beginEvents() override {
        isAnswered_ = true;
        tell([](Answers& answers) { answers.isStream = true; });
    }
    void event(std::string_view key, std::string_view name, std::string data) override {
        tell([key = std::string(key),
              text = "event: " + std::string(name) + "\ndata: " + data + "\n\n"](Answers& answers) {
            const auto same = std::ranges::find_if(answers.events, [&](const auto& event) {
                return !key.empty() && event.key == key;
            });
            if (same == answers.events.end()) {
                answers.events.push_back({key, text});
            } else {
                same->text = text;
            }
        });
    }
    void endEvents() override {
        tell([](Answers& answers) { answers.isEnded = true; });
    }
    void keepUntilGone(std::shared_ptr<void> thing) override {
        tell([thing = std::move(thing)](Answers& answers) mutable {
            answers.kept = std::move(thing);
        });
    }
    [[nodiscard]] std::stop_token gone() const override { return connection_->gone_.get_token(); }
    void endWith(const std::stop_token& stop) override {
        tell([stop, connection = connection_.get()](Answers& answers) {
            answers.ending = std::make_unique<std::stop_callback<std::function<void()>>>(
                stop, [weak = connection->weak_from_this()] {
                    if (const auto ended = weak.lock()) {
                        asio::post(ended->socket_.get_executor(), [ended] { ended->close(); });
                    }
                });
        });
    }

  private:
    template <typename Change>
    void tell(Change change) {
        asio::post(connection_->socket_.get_executor(),
                   [connection = connection_, change = std::move(change)]() mutable {
                       if (!connection->isClosed_) {
                           change(connection->answers_);
                           connection->answered_.cancel();
                       }
                   });
    }

    std::shared_ptr<BrowserConnection> connection_;
    std::atomic<bool> isAnswered_ = false;
};

BrowserConnection::BrowserConnection(Owner& owner, BrowserSite& site, ConnectionThreads& threads,
                                     const BrowserLimits& limits, tcp::socket socket)
    : owner_(owner),
      site_(site),
      threads_(threads),
      limits_(limits),
      socket_(std::move(socket)),
      deadline_(socket_.get_executor()),
      answered_(socket_.get_executor()) {}

void BrowserConnection::start() {
    expectWithin(limits_.idleTime);
    asio::co_spawn(socket_.get_executor(), serve(), asio::detached);
    asio::co_spawn(socket_.get_executor(), watchTime(), asio::detached);
}

void BrowserConnection::close() {
    if (isClosed_) {
        return;
    }
    isClosed_ = true;
    gone_.request_stop();
    Code ignored;
    socket_.close(ignored);
    deadline_.cancel();
    answered_.cancel();
    // What sends events is let go on a thread that may wait.
    asio::post(threads_.requests(),
               [kept = std::move(answers_.kept), ending = std::move(answers_.ending)]() mutable {
                   ending.reset();
                   kept.reset();
               });
    owner_.ended(shared_from_this());
}

void BrowserConnection::expectWithin(std::chrono::milliseconds time) {
    deadline_.expires_after(time);
}

Awaitable<void> BrowserConnection::watchTime() {
    const auto self = shared_from_this();
    while (!isClosed_) {
        // A new deadline ends the wait for the old one.
        std::ignore = co_await deadline_.async_wait(asQuietly);
        if (deadline_.expiry() <= Clock::now()) {
            close();
        }
    }
}

void BrowserConnection::watchForTheEnd() {
    if (isWatching_ || isClosed_) {
        return;
    }
    isWatching_ = true;
    socket_.async_wait(tcp::socket::wait_read, [self = shared_from_this()](const Code& code) {
        self->isWatching_ = false;
        // More bytes are the next request, whose turn comes.
        if (!self->isClosed_ && !code && peerHasGone(self->socket_.native_handle())) {
            self->close();
        }
    });
}

template <typename Work>
Awaitable<std::invoke_result_t<Work>> BrowserConnection::on(asio::thread_pool& threads, Work work) {
    using Result = std::invoke_result_t<Work>;
    auto made = std::make_shared<std::optional<Result>>();
    const auto isDone = std::make_shared<asio::steady_timer>(socket_.get_executor(),
                                                             asio::steady_timer::time_point::max());
    asio::post(threads,
               [work = std::move(work), made, isDone, executor = socket_.get_executor()]() mutable {
                   made->emplace(work());
                   asio::post(executor, [isDone] { isDone->expires_at(Clock::time_point::min()); });
               });
    while (isDone->expiry() != Clock::time_point::min()) {
        std::ignore = co_await isDone->async_wait(asQuietly);
    }
    co_return std::move(**made);
}

Awaitable<void> BrowserConnection::serve() {
    const auto self = shared_from_this();
    while (!isClosed_ && co_await serveOne()) {
    }
    close();
}

Awaitable<bool> BrowserConnection::serveOne() {
    isIdle_ = true;
    answers_ = Answers();
    auto head = co_await readHead();
    if (!head) {
        co_return false;
    }
    expectWithin(limits_.pieceTime);
    keepsAlive_ = head->keepsAlive;
    if (auto refused = site_.refusal(*head)) {
        co_await sendLast(*refused);
        co_return false;
    }
    auto request = ApiRequest::fromTarget(head->method, head->target);
    if (!request || !isPlain(*request)) {
        co_await sendFault(badRequest, "that is no address");
        co_return false;
    }
    BrowserRequest whole{std::move(*head), std::move(*request)};
    if (whole.head.method == "PUT") {
        co_return co_await takeUpload(whole);
    }
    if (!co_await readBody(whole)) {
        co_return false;
    }
    co_return co_await handle(whole);
}

Awaitable<bool> BrowserConnection::readMore() {
    const std::size_t before = input_.size();
    input_.resize(before + readSize);
    const auto [code, count] =
        co_await socket_.async_read_some(asio::buffer(input_.data() + before, readSize), asQuietly);
    input_.resize(before + count);
    co_return !code && !isClosed_;
}

Awaitable<std::optional<HttpHead>> BrowserConnection::readHead() {
    expectWithin(limits_.idleTime);
    while (true) {
        if (isIdle_ && !input_.empty()) {
            isIdle_ = false;
            expectWithin(limits_.headTime);
        }
        const auto end = HttpHead::endOf(input_);
        if (end && !*end) {
            if (!co_await readMore()) {
                co_return std::nullopt;
            }
            continue;
        }
        auto head = end ? HttpHead::parsed(std::string_view(input_).substr(0, **end))
                        : std::expected<HttpHead, HeadFault>(std::unexpected(end.error()));
        if (!head) {
            co_await sendFault(static_cast<unsigned>(head.error()), reasonOf(head.error()));
            co_return std::nullopt;
        }
        input_.erase(0, **end);
        co_return std::move(*head);
    }
}

Awaitable<bool> BrowserConnection::readBody(BrowserRequest& request) {
    const std::uint64_t length = request.head.contentLength;
    if (length > longestBody) {
        co_await sendFault(tooMuchContent, "that is too much content");
        co_return false;
    }
    while (input_.size() < length) {
        expectWithin(limits_.headTime);
        if (!co_await readMore()) {
            co_return false;
        }
    }
    expectWithin(limits_.pieceTime);
    request.request.body = input_.substr(0, length);
    input_.erase(0, length);
    co_return true;
}

Awaitable<bool> BrowserConnection::handle(BrowserRequest& request) {
    auto reply = std::make_shared<Reply>(shared_from_this());
    watchForTheEnd();
    asio::post(threads_.requests(), [&site = site_, request = std::move(request),
                                     reply = std::move(reply)] { site.handle(request, reply); });
    // However long the provider takes.
    deadline_.expires_at(Clock::time_point::max());
    while (!isClosed_ && !answers_.response && !answers_.isStream) {
        answered_.expires_at(Clock::time_point::max());
        std::ignore = co_await answered_.async_wait(asQuietly);
    }
    if (isClosed_) {
        co_return false;
    }
    expectWithin(limits_.pieceTime);
    if (answers_.isStream) {
        co_return co_await sendEvents();
    }
    BrowserResponse response = std::move(*answers_.response);
    co_return co_await send(response);
}

Awaitable<bool> BrowserConnection::takeUpload(BrowserRequest& request) {
    const std::uint64_t length = request.head.contentLength;
    const bool wantsToBeAsked = request.head.field("expect") == "100-continue";
    auto begun = co_await on(threads_.requests(),
                             [&site = site_, &request] { return site.upload(request); });
    if (auto* refused = std::get_if<BrowserResponse>(&begun)) {
        co_await sendLast(*refused);
        co_return false;
    }
    auto& sink = std::get<std::unique_ptr<ContentSink>>(begun);
    if (wantsToBeAsked && !co_await write("HTTP/1.1 100 Continue\r\n\r\n")) {
        co_return false;
    }
    auto failure = co_await fill(*sink, length);
    if (failure) {
        co_await sendLast(*failure);
        co_return false;
    }
    if (isClosed_) {
        // Left unfinished, on a thread that may wait.
        co_await on(threads_.content(), [&sink] {
            sink.reset();
            return true;
        });
        co_return false;
    }
    watchForTheEnd();
    deadline_.expires_at(Clock::time_point::max());
    const std::stop_token gone = gone_.get_token();
    auto response = co_await on(threads_.requests(), [&sink, &gone] {
        auto answer = sink->finish(gone);
        sink.reset();
        return answer;
    });
    if (isClosed_) {
        co_return false;
    }
    expectWithin(limits_.pieceTime);
    co_return co_await send(response);
}

// None when all has come, or the connection has ended.
Awaitable<std::optional<BrowserResponse>> BrowserConnection::fill(ContentSink& sink,
                                                                  std::uint64_t length) {
    std::string piece = input_.substr(0, length);
    input_.erase(0, piece.size());
    for (std::uint64_t left = length; left > 0;) {
        if (piece.empty()) {
            expectWithin(limits_.pieceTime);
            piece.resize(std::min<std::uint64_t>(left, pieceSize));
            const auto [code, count] =
                co_await socket_.async_read_some(asio::buffer(piece), asQuietly);
            if (code || isClosed_) {
                close();
                co_return std::nullopt;
            }
            piece.resize(count);
        }
        left -= piece.size();
        const auto written = co_await on(threads_.content(), [&] { return sink.write(piece); });
        if (!written) {
            co_return sink.failed(written.error());
        }
        piece.clear();
    }
    co_return std::nullopt;
}

Awaitable<bool> BrowserConnection::write(std::string_view text) {
    while (!text.empty() && !isClosed_) {
        expectWithin(limits_.pieceTime);
        const auto [code, count] = co_await socket_.async_write_some(
            asio::buffer(text.data(), std::min(text.size(), pieceSize)), asQuietly);
        if (code) {
            co_return false;
        }
        text.remove_prefix(count);
    }
    co_return !isClosed_;
}

Awaitable<bool> BrowserConnection::send(BrowserResponse& response) {
    const auto length = response.source ? response.length : response.body.size();
    const bool goesOn = keepsAlive_;
    const std::string head = headOf(response, length, goesOn);
    if (!response.source) {
        const std::string whole = head + response.body;
        co_return co_await write(whole) && goesOn;
    }
    const bool isSent = co_await write(head) && co_await sendSource(*response.source, length);
    co_await on(threads_.content(), [&response] {
        response.source.reset();
        return true;
    });
    co_return isSent&& goesOn;
}

Awaitable<bool> BrowserConnection::sendSource(ContentSource& source,
                                              std::optional<std::uint64_t> length) {
    std::string piece;
    for (std::uint64_t left = length.value_or(UINT64_MAX); left > 0;) {
        piece.resize(std::min<std::uint64_t>(left, pieceSize));
        const auto count = co_await on(threads_.content(), [&] { return source.read(piece); });
        // Where something is missing, the end of the connection tells.
        if (!count || (*count == 0 && length)) {
            co_return false;
        }
        piece.resize(*count);
        if (!length) {
            piece = chunkOf(piece);
        }
        if (!co_await write(piece)) {
            co_return false;
        }
        if (*count == 0) {
            co_return true;
        }
        left -= *count;
    }
    co_return true;
}

Awaitable<bool> BrowserConnection::sendEvents() {
    // Without a length: the stream ends with the connection.
    if (!co_await write(headOfEvents())) {
        co_return false;
    }
    while (!isClosed_) {
        if (!answers_.events.empty()) {
            const std::string text = std::move(answers_.events.front().text);
            answers_.events.pop_front();
            if (!co_await write(text)) {
                co_return false;
            }
            continue;
        }
        if (answers_.isEnded) {
            co_return false;
        }
        deadline_.expires_at(Clock::time_point::max());
        answered_.expires_at(Clock::time_point::max());
        std::ignore = co_await answered_.async_wait(asQuietly);
    }
    co_return false;
}

Awaitable<void> BrowserConnection::sendFault(unsigned status, std::string_view reason) {
    BrowserResponse response = site_.fault(status, reason);
    co_await sendLast(response);
}

Awaitable<void> BrowserConnection::sendLast(BrowserResponse& response) {
    keepsAlive_ = false;
    co_await send(response);
    if (isClosed_) {
        co_return;
    }
    Code code;
    socket_.shutdown(tcp::socket::shutdown_send, code);
    expectWithin(limits_.headTime);
    std::string dropped(pieceSize, '\0');
    for (std::uint64_t left = mostDropped; !code && !isClosed_ && left > 0;) {
        const auto [failure, count] =
            co_await socket_.async_read_some(asio::buffer(dropped), asQuietly);
        code = failure;
        left -= std::min<std::uint64_t>(left, count);
    }
}

}  // namespace marrowdale::host
