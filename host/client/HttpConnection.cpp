#include "host/client/HttpConnection.h"

#include <array>
#include <boost/asio/buffer.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>
#include <cerrno>
#include <sys/socket.h>

#include "host/client/EventStreamReader.h"
#include "host/requests/SocketPlace.h"

namespace marrowdale::host {

namespace {

namespace asio = boost::asio;
namespace http = boost::beast::http;
using Protocol = asio::local::stream_protocol;
using Code = boost::system::error_code;

constexpr unsigned http11 = 11;

Error errorOf(const Code& code, const std::stop_token& stop) {
    if (stop.stop_requested()) {
        return errorWithPOSIXCode(ECANCELED);
    }
    // Whatever else happened to the stream, the other side did not answer.
    return errorWithPOSIXCode(
        code.category() == boost::system::system_category() ? code.value() : ECONNRESET,
        "talk to the service", {});
}

http::request<http::string_body> message(const HttpRequest& request) {
    http::request<http::string_body> message(http::string_to_verb(request.method), request.target,
                                             http11);
    message.set(http::field::host, "marrowdale");
    if (!request.body.empty()) {
        message.set(http::field::content_type, "application/json");
    }
    message.body() = request.body;
    message.prepare_payload();
    return message;
}

bool isEventStream(const http::response<http::string_body>& head) {
    return head[http::field::content_type].starts_with("text/event-stream");
}

}  // namespace

class HttpConnection::Socket {
  public:
    [[nodiscard]] Expected<void> connect(const std::string& stateFolder) {
        auto place = SocketPlace::in(stateFolder);
        if (!place) {
            return Unexpected(place.error());
        }
        Code code;
        stream_.connect(Protocol::endpoint(place->pathOf(socketName)), code);
        if (code) {
            return Unexpected(
                errorWithPOSIXCode(code.value(), "connect to", stateFolder + "/" + socketName));
        }
        return {};
    }

    // Ends whatever waits on the stream, from any thread.
    void shutDown() { ::shutdown(stream_.native_handle(), SHUT_RDWR); }

    void write(const HttpRequest& request, Code& code) {
        const auto text = message(request);
        http::write(stream_, text, code);
    }

    [[nodiscard]] HttpAnswer readAnswer(http::response_parser<http::string_body>& parser,
                                        Code& code) {
        http::read(stream_, buffer_, parser, code);
        return {parser.get().result_int(), std::move(parser.get().body())};
    }
    void readHead(http::response_parser<http::string_body>& parser, Code& code) {
        parser.body_limit(boost::none);
        http::read_header(stream_, buffer_, parser, code);
    }
    // Everything up to the end of the stream, which comes without a length.
    void readEvents(EventStreamReader& reader, Code& code) {
        takeBuffered(reader);
        std::array<char, 4096> room{};
        while (!code) {
            const std::size_t count = stream_.read_some(asio::buffer(room), code);
            reader.take({room.data(), count});
        }
    }

  private:
    void takeBuffered(EventStreamReader& reader) {
        const auto data = buffer_.data();
        reader.take({static_cast<const char*>(data.data()), data.size()});
        buffer_.consume(data.size());
    }

    asio::io_context context_{1};
    Protocol::socket stream_{context_};
    boost::beast::flat_buffer buffer_;
};

HttpConnection::HttpConnection(std::unique_ptr<Socket> socket) : socket_(std::move(socket)) {}

HttpConnection::~HttpConnection() = default;

Expected<std::unique_ptr<HttpConnection>> HttpConnection::open(const std::string& stateFolder) {
    auto socket = std::make_unique<Socket>();
    if (auto connected = socket->connect(stateFolder); !connected) {
        return Unexpected(connected.error());
    }
    return std::unique_ptr<HttpConnection>(new HttpConnection(std::move(socket)));
}

Expected<HttpAnswer> HttpConnection::send(const HttpRequest& request, std::stop_token stop) {
    const std::stop_callback stopper(stop, [this] { socket_->shutDown(); });
    Code code;
    socket_->write(request, code);
    if (code) {
        return Unexpected(errorOf(code, stop));
    }
    http::response_parser<http::string_body> parser;
    parser.body_limit(boost::none);
    HttpAnswer answer = socket_->readAnswer(parser, code);
    if (code) {
        return Unexpected(errorOf(code, stop));
    }
    return answer;
}

Expected<HttpAnswer> HttpConnection::follow(const HttpRequest& request, const EventTaker& taker,
                                            std::stop_token stop) {
    const std::stop_callback stopper(stop, [this] { socket_->shutDown(); });
    Code code;
    socket_->write(request, code);
    http::response_parser<http::string_body> parser;
    if (!code) {
        socket_->readHead(parser, code);
    }
    if (code) {
        return Unexpected(errorOf(code, stop));
    }
    if (!isEventStream(parser.get())) {
        HttpAnswer answer = socket_->readAnswer(parser, code);
        return code ? Expected<HttpAnswer>(Unexpected(errorOf(code, stop))) : std::move(answer);
    }
    EventStreamReader reader(taker);
    socket_->readEvents(reader, code);
    return HttpAnswer{parser.get().result_int(), {}};
}

}  // namespace marrowdale::host
