#include "host/daemon/HttpServer.h"

#include <atomic>
#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/thread_pool.hpp>
#include <boost/asio/write.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>
#include <cerrno>
#include <chrono>
#include <deque>
#include <set>
#include <sys/socket.h>
#include <sys/stat.h>
#include <thread>
#include <unistd.h>

#include "host/requests/ErrorJson.h"
#include "host/requests/SocketPlace.h"

namespace marrowdale::host {

namespace {

namespace asio = boost::asio;
namespace http = boost::beast::http;
using Code = boost::system::error_code;
using Stream = asio::generic::stream_protocol::socket;
using LocalProtocol = asio::local::stream_protocol;

constexpr std::size_t workerCount = 8;
constexpr std::uint64_t longestBody = std::uint64_t{1} << 20U;
constexpr std::uint32_t longestHeader = std::uint32_t{64} << 10U;
constexpr unsigned badRequest = 400;
constexpr unsigned serverError = 500;

bool isOurOwnUsers(int descriptor) {
    ucred peer{};
    socklen_t size = sizeof peer;
    return ::getsockopt(descriptor, SOL_SOCKET, SO_PEERCRED, &peer, &size) == 0 &&
           peer.uid == ::geteuid();
}

bool peerHasGone(int descriptor) {
    char byte = 0;
    const ssize_t count = ::recv(descriptor, &byte, 1, MSG_PEEK | MSG_DONTWAIT);
    return count == 0 || (count < 0 && errno != EAGAIN && errno != EINTR);
}

}  // namespace

// Everything but the handlers runs on the one thread of `context_`.
class HttpServer::Core {
  public:
    explicit Core(Handler handler) : handler_(std::move(handler)) {}

    void start() {
        thread_ = std::thread([this] { context_.run(); });
    }
    void stop();
    [[nodiscard]] Expected<void> listenInFolder(const std::string& stateFolder);

  private:
    class Session;
    class Reply;

    void acceptNext();
    void take(LocalProtocol::socket socket);
    void forget(const std::shared_ptr<Session>& session) { sessions_.erase(session); }

    Handler handler_;
    asio::io_context context_{1};
    asio::executor_work_guard<asio::io_context::executor_type> work_{context_.get_executor()};
    asio::thread_pool workers_{workerCount};
    LocalProtocol::acceptor acceptor_{context_};
    asio::steady_timer retry_{context_};
    std::string socketPath_;
    std::unique_ptr<SocketPlace> place_;
    std::set<std::shared_ptr<Session>> sessions_;
    std::thread thread_;
};

// One connection.
class HttpServer::Core::Session : public std::enable_shared_from_this<Session> {
  public:
    Session(Core& core, Stream stream) : core_(core), stream_(std::move(stream)) {}

    void readRequest();
    void close();

    void sendAnswer(ApiAnswer answer);
    void beginEvents();
    void queueEvent(std::string key, std::string text);
    void endEvents();
    void keep(std::shared_ptr<void> thing);

    [[nodiscard]] std::stop_token gone() const { return gone_.get_token(); }
    [[nodiscard]] asio::io_context& context() { return core_.context_; }

  private:
    void handleRequest();
    void waitForTheEnd();
    void send(http::response<http::string_body> response);
    void writeNext();
    void wasWritten(const Code& code);
    // Lets go of what may wait, on a thread that may.
    void letGo(std::shared_ptr<void> thing);

    Core& core_;
    Stream stream_;
    boost::beast::flat_buffer buffer_;
    std::optional<http::request_parser<http::string_body>> parser_;
    std::stop_source gone_;
    bool isClosed_ = false;
    bool keepsAlive_ = true;
    bool isWaiting_ = false;  // for the client to go
    std::shared_ptr<void> kept_;

    struct Piece {
        std::string key;
        std::string text;
    };
    enum class Mode : std::uint8_t { answers, events, lastEvents };
    Mode mode_ = Mode::answers;
    std::deque<Piece> pieces_;  // of an event stream; the first is being written
    bool isWriting_ = false;
};

// The handler's way to the session. Every call is carried over to the server's thread.
class HttpServer::Core::Reply final : public ApiReply {
  public:
    explicit Reply(std::shared_ptr<Session> session) : session_(std::move(session)) {}
    ~Reply() override {
        if (!isAnswered_) {
            answer({.status = serverError,
                    .body = errorJson(errorWithPOSIXCode(EIO, "answer the request", {}))});
        }
    }
    Reply(const Reply&) = delete;
    Reply& operator=(const Reply&) = delete;

    void answer(ApiAnswer answer) override {
        isAnswered_ = true;
        post([answer = std::move(answer)](Session& session) mutable {
            session.sendAnswer(std::move(answer));
        });
    }
    void beginEvents() override {
        isAnswered_ = true;
        post([](Session& session) { session.beginEvents(); });
    }
    void event(std::string_view key, std::string_view name, std::string data) override {
        post([key = std::string(key), text = "event: " + std::string(name) + "\ndata: " + data +
                                             "\n\n"](Session& session) mutable {
            session.queueEvent(std::move(key), std::move(text));
        });
    }
    void endEvents() override {
        post([](Session& session) { session.endEvents(); });
    }
    void keepUntilGone(std::shared_ptr<void> thing) override {
        post([thing = std::move(thing)](Session& session) mutable {
            session.keep(std::move(thing));
        });
    }
    [[nodiscard]] std::stop_token gone() const override { return session_->gone(); }

  private:
    template <typename Call>
    void post(Call call) {
        asio::post(session_->context(),
                   [session = session_, call = std::move(call)]() mutable { call(*session); });
    }

    std::shared_ptr<Session> session_;
    std::atomic<bool> isAnswered_ = false;
};

void HttpServer::Core::Session::readRequest() {
    parser_.emplace();
    parser_->body_limit(longestBody);
    parser_->header_limit(longestHeader);
    http::async_read(
        stream_, buffer_, *parser_,
        [self = shared_from_this()](const Code& code, std::size_t /*count*/) {
            if (self->isClosed_) {
                return;
            }
            if (!code) {
                self->handleRequest();
            } else if (code == http::error::body_limit || code == http::error::header_limit) {
                self->keepsAlive_ = false;
                self->sendAnswer({.status = badRequest,
                                  .body = errorJson(errorWithPOSIXCode(
                                      EMSGSIZE, "take a request of that size", {}))});
            } else {
                self->close();
            }
        });
}

void HttpServer::Core::Session::handleRequest() {
    const auto& message = parser_->get();
    keepsAlive_ = message.keep_alive();
    auto request =
        ApiRequest::fromTarget(std::string(message.method_string()), std::string(message.target()));
    auto reply = std::make_shared<Reply>(shared_from_this());
    if (!request) {
        reply->answer(
            {.status = badRequest,
             .body = errorJson(errorWithPOSIXCode(EINVAL, "understand", message.target()))});
        return;
    }
    request->body = std::move(parser_->get().body());
    waitForTheEnd();
    asio::post(core_.workers_, [&handler = core_.handler_, request = std::move(*request),
                                reply = std::move(reply)]() mutable {
        handler(std::move(request), std::move(reply));
    });
}

void HttpServer::Core::Session::waitForTheEnd() {
    if (isWaiting_) {
        return;
    }
    isWaiting_ = true;
    stream_.async_wait(Stream::wait_read, [self = shared_from_this()](const Code& code) {
        self->isWaiting_ = false;
        if (self->isClosed_ || code) {
            return;
        }
        // More bytes are the next request, whose turn comes; while an answer is being made they are
        // left where they are.
        if (peerHasGone(self->stream_.native_handle())) {
            self->close();
        }
    });
}

void HttpServer::Core::Session::close() {
    if (isClosed_) {
        return;
    }
    isClosed_ = true;
    gone_.request_stop();
    Code ignored;
    stream_.close(ignored);
    if (kept_) {
        letGo(std::move(kept_));
    }
    core_.forget(shared_from_this());
}

void HttpServer::Core::Session::letGo(std::shared_ptr<void> thing) {
    asio::post(core_.workers_, [thing = std::move(thing)]() mutable { thing.reset(); });
}

void HttpServer::Core::Session::keep(std::shared_ptr<void> thing) {
    if (isClosed_) {
        letGo(std::move(thing));
    } else {
        kept_ = std::move(thing);
    }
}

void HttpServer::Core::Session::sendAnswer(ApiAnswer answer) {
    if (isClosed_) {
        return;
    }
    http::response<http::string_body> response(static_cast<http::status>(answer.status), 11);
    response.set(http::field::content_type, answer.contentType);
    response.set(http::field::cache_control, "no-store");
    response.keep_alive(keepsAlive_);
    response.body() = std::move(answer.body);
    response.prepare_payload();
    send(std::move(response));
}

void HttpServer::Core::Session::send(http::response<http::string_body> response) {
    auto kept = std::make_shared<http::response<http::string_body>>(std::move(response));
    http::async_write(stream_, *kept,
                      [self = shared_from_this(), kept](const Code& code, std::size_t /*count*/) {
                          if (self->isClosed_) {
                              return;
                          }
                          if (code || !self->keepsAlive_) {
                              self->close();
                          } else {
                              self->readRequest();
                          }
                      });
}

void HttpServer::Core::Session::beginEvents() {
    if (isClosed_) {
        return;
    }
    mode_ = Mode::events;
    // Without a length: the stream ends with the connection.
    queueEvent({},
               "HTTP/1.1 200 OK\r\nContent-Type: text/event-stream\r\nCache-Control: no-store\r\n"
               "Connection: close\r\n\r\n");
}

void HttpServer::Core::Session::queueEvent(std::string key, std::string text) {
    if (isClosed_ || mode_ != Mode::events) {
        return;
    }
    for (std::size_t at = isWriting_ ? 1 : 0; at < pieces_.size(); ++at) {
        if (!key.empty() && pieces_[at].key == key) {
            pieces_[at].text = std::move(text);
            return;
        }
    }
    pieces_.push_back({std::move(key), std::move(text)});
    writeNext();
}

void HttpServer::Core::Session::endEvents() {
    if (isClosed_ || mode_ != Mode::events) {
        return;
    }
    mode_ = Mode::lastEvents;
    writeNext();
}

void HttpServer::Core::Session::writeNext() {
    if (isWriting_) {
        return;
    }
    if (pieces_.empty()) {
        if (mode_ == Mode::lastEvents) {
            close();
        }
        return;
    }
    isWriting_ = true;
    asio::async_write(stream_, asio::buffer(pieces_.front().text),
                      [self = shared_from_this()](const Code& code, std::size_t /*count*/) {
                          self->wasWritten(code);
                      });
}

void HttpServer::Core::Session::wasWritten(const Code& code) {
    if (isClosed_) {
        return;
    }
    isWriting_ = false;
    pieces_.pop_front();
    if (code) {
        close();
    } else {
        writeNext();
    }
}

Expected<void> HttpServer::Core::listenInFolder(const std::string& stateFolder) {
    auto place = SocketPlace::in(stateFolder);
    if (!place) {
        return Unexpected(place.error());
    }
    place_ = std::make_unique<SocketPlace>(std::move(*place));
    const std::string aside = std::string(socketName) + "." + std::to_string(::getpid());
    const std::string asidePath = place_->pathOf(aside);
    ::unlink(asidePath.c_str());
    Code code;
    acceptor_.open(LocalProtocol(), code);
    if (!code) {
        acceptor_.bind(LocalProtocol::endpoint(asidePath), code);
    }
    if (!code && ::chmod(asidePath.c_str(), S_IRUSR | S_IWUSR) != 0) {
        code.assign(errno, boost::system::system_category());
    }
    if (!code) {
        acceptor_.listen(asio::socket_base::max_listen_connections, code);
    }
    socketPath_ = place_->pathOf(socketName);
    if (!code && ::rename(asidePath.c_str(), socketPath_.c_str()) != 0) {
        code.assign(errno, boost::system::system_category());
    }
    if (code) {
        return Unexpected(
            errorWithPOSIXCode(code.value(), "listen at", stateFolder + "/" + socketName));
    }
    asio::post(context_, [this] { acceptNext(); });
    return {};
}

void HttpServer::Core::acceptNext() {
    acceptor_.async_accept([this](const Code& code, LocalProtocol::socket socket) {
        if (code == asio::error::operation_aborted) {
            return;
        }
        if (!code) {
            take(std::move(socket));
            acceptNext();
            return;
        }
        // Out of descriptors or memory: others give some back in time.
        retry_.expires_after(std::chrono::milliseconds(100));
        retry_.async_wait([this](const Code& cancelled) {
            if (!cancelled) {
                acceptNext();
            }
        });
    });
}

void HttpServer::Core::take(LocalProtocol::socket socket) {
    if (!isOurOwnUsers(socket.native_handle())) {
        return;
    }
    const auto session = std::make_shared<Session>(*this, Stream(std::move(socket)));
    sessions_.insert(session);
    session->readRequest();
}

void HttpServer::Core::stop() {
    asio::post(context_, [this] {
        Code ignored;
        acceptor_.close(ignored);
        retry_.cancel();
        if (!socketPath_.empty()) {
            ::unlink(socketPath_.c_str());
        }
        const auto sessions = sessions_;
        for (const auto& session : sessions) {
            session->close();
        }
    });
    // Closed sessions hand what they kept to the workers, so these end after the context's turn.
    asio::post(context_, [this] { work_.reset(); });
    thread_.join();
    workers_.join();
    // What the last handlers had to say, to connections that are closed.
    context_.restart();
    context_.poll();
}

HttpServer::HttpServer(std::unique_ptr<Core> core) : core_(std::move(core)) {}

std::unique_ptr<HttpServer> HttpServer::start(Handler handler) {
    auto core = std::make_unique<Core>(std::move(handler));
    core->start();
    return std::unique_ptr<HttpServer>(new HttpServer(std::move(core)));
}

Expected<void> HttpServer::listenInFolder(const std::string& stateFolder) {
    return core_->listenInFolder(stateFolder);
}

HttpServer::~HttpServer() {
    core_->stop();
}

}  // namespace marrowdale::host
