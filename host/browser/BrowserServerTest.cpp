#include <arpa/inet.h>
#include <cerrno>
#include <fstream>
#include <netinet/in.h>
#include <string>
#include <sys/socket.h>
#include <thread>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/browser/BrowserServer.h"
#include "host/browser/HttpResponse.h"
#include "host/browser/RequestGuard.h"
#include "platform/foundation/Mutex.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {
namespace {

using namespace std::string_literals;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;

constexpr std::chrono::seconds patience{30};

// Content of zeros without an end, or of a length.
class Zeros final : public ContentSource {
  public:
    explicit Zeros(std::uint64_t length) : left_(length) {}
    Expected<std::size_t> read(std::span<char> buffer) override {
        const std::size_t count = std::min<std::uint64_t>(buffer.size(), left_);
        std::ranges::fill(buffer.first(count), '0');
        left_ -= count;
        return count;
    }

  private:
    std::uint64_t left_;
};

// Content that can't be read to its end.
class Broken final : public ContentSource {
  public:
    Expected<std::size_t> read(std::span<char> buffer) override {
        if (std::exchange(hasBegun_, true)) {
            return Unexpected(errorWithPOSIXCode(EIO));
        }
        buffer[0] = '0';
        return std::size_t{1};
    }

  private:
    bool hasBegun_ = false;
};

// Answers what the path says, and counts uploads that ended and that did not.
class TestSite final : public BrowserSite {
  public:
    void serveAt(std::uint16_t port) { guard_.emplace(port); }

    std::optional<BrowserResponse> refusal(const HttpHead& head) override {
        const auto refused = guard_->refusal(head);
        return refused ? std::optional(refusalOf(refused->status, refused->reason)) : std::nullopt;
    }
    BrowserResponse fault(unsigned status, std::string_view reason) override {
        return refusalOf(status, reason);
    }
    void handle(const BrowserRequest& request,
                const std::shared_ptr<BrowserReply>& reply) override {
        const std::string& what = request.request.path.back();
        BrowserResponse response;
        if (what == "events") {
            reply->endWith(ending_.get_token());
            reply->beginEvents();
            reply->event("", "ready", "{}");
            return;
        }
        if (what == "nothing") {
            return;
        }
        if (what == "zeros" || what == "short") {
            response.length = 1'000'000;
            response.source = std::make_unique<Zeros>(what == "short" ? 1000 : 1'000'000);
        } else if (what == "chunks") {
            response.source = std::make_unique<Zeros>(100'000);
        } else if (what == "broken") {
            response.source = std::make_unique<Broken>();
        } else {
            response.body = what + "|" + request.request.body;
        }
        reply->respond(std::move(response));
    }
    std::variant<std::unique_ptr<ContentSink>, BrowserResponse> upload(
        const BrowserRequest& request) override {
        if (request.request.path.back() == "refused") {
            return refusalOf(409, "taken");
        }
        return std::make_unique<Sink>(*this);
    }

    // Waits until that many uploads have ended before their time.
    [[nodiscard]] bool waitForUnfinished(int wanted) {
        const auto deadline = std::chrono::steady_clock::now() + patience;
        MutexLock lock(mutex_);
        while (unfinished_ < wanted && changed_.waitUntil(lock, deadline)) {
        }
        return unfinished_ >= wanted;
    }
    void end() { ending_.request_stop(); }

  private:
    class Sink final : public ContentSink {
      public:
        explicit Sink(TestSite& site) : site_(site) {}
        ~Sink() override {
            if (!isFinished_) {
                const MutexLock lock(site_.mutex_);
                ++site_.unfinished_;
                site_.changed_.notifyAll();
            }
        }
        Sink(const Sink&) = delete;
        Sink& operator=(const Sink&) = delete;
        Expected<void> write(std::span<const char> bytes) override {
            size_ += bytes.size();
            return size_ > 10'000'000 ? Unexpected(errorWithPOSIXCode(ENOSPC)) : Expected<void>();
        }
        BrowserResponse finish(const std::stop_token& /*gone*/) override {
            isFinished_ = true;
            BrowserResponse response;
            response.body = "took " + std::to_string(size_);
            return response;
        }
        BrowserResponse failed(const Error& error) override { return responseOf(error); }

      private:
        TestSite& site_;
        std::uint64_t size_ = 0;
        bool isFinished_ = false;
    };

    std::optional<RequestGuard> guard_;
    std::stop_source ending_;
    Mutex mutex_;
    Condition changed_;
    int unfinished_ MARROWDALE_GUARDED_BY(mutex_) = 0;
};

// A client that sends and reads bytes.
class Client {
  public:
    explicit Client(std::uint16_t port)
        : socket_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(port);
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        const timeval time{patience.count(), 0};
        ::setsockopt(socket_.get(), SOL_SOCKET, SO_RCVTIMEO, &time, sizeof time);
        isConnected_ = ::connect(socket_.get(), reinterpret_cast<const sockaddr*>(&address),
                                 sizeof address) == 0;
    }
    [[nodiscard]] bool isConnected() const { return isConnected_; }
    // False when the other side takes no more.
    bool say(std::string_view text) const {
        while (!text.empty()) {
            const ssize_t count = ::send(socket_.get(), text.data(), text.size(), MSG_NOSIGNAL);
            if (count <= 0) {
                return false;
            }
            text.remove_prefix(static_cast<std::size_t>(count));
        }
        return true;
    }
    // Reads until that has come, or the end; answers what came since the last call.
    std::string hear(std::string_view wanted) {
        std::string text;
        std::array<char, 65536> buffer{};
        while (wanted.empty() || !text.contains(wanted)) {
            const ssize_t count = ::recv(socket_.get(), buffer.data(), buffer.size(), 0);
            if (count <= 0) {
                isAtEnd_ = count == 0 || errno == ECONNRESET;
                break;
            }
            text.append(buffer.data(), static_cast<std::size_t>(count));
        }
        return text;
    }
    std::string hearAll() { return hear(""); }
    // Whether the other side has ended the connection; false when it was silent for too long.
    [[nodiscard]] bool isAtEnd() const { return isAtEnd_; }

  private:
    native::UniqueFD socket_;
    bool isConnected_ = false;
    bool isAtEnd_ = false;
};

class BrowserServerTest : public ::testing::Test {
  protected:
    void start(BrowserLimits limits = {}) {
        auto server = BrowserServer::start(0, limits);
        ASSERT_TRUE(server.has_value());
        server_ = std::move(*server);
        site_.serveAt(server_->port());
        server_->serve(site_);
    }
    [[nodiscard]] std::string host() const {
        return "127.0.0.1:" + std::to_string(server_->port());
    }
    [[nodiscard]] std::string get(const std::string& path, const std::string& more = "") const {
        return "GET " + path + " HTTP/1.1\r\nHost: " + host() + "\r\n" + more + "\r\n";
    }
    [[nodiscard]] std::string sending(const std::string& method, const std::string& path,
                                      std::size_t length, const std::string& more = "") const {
        return method + " " + path + " HTTP/1.1\r\nHost: " + host() + "\r\nOrigin: http://" +
               host() + "\r\nContent-Type: application/" +
               (method == "PUT" ? "octet-stream" : "json") +
               "\r\nContent-Length: " + std::to_string(length) + "\r\n" + more + "\r\n";
    }
    // All that comes back on a connection of its own.
    [[nodiscard]] std::string answerTo(const std::string& bytes) const {
        Client client(server_->port());
        client.say(bytes);
        std::string answer = client.hearAll();
        EXPECT_TRUE(client.isAtEnd()) << answer;
        return answer;
    }

    TestSite site_;
    std::unique_ptr<BrowserServer> server_;
};

TEST_F(BrowserServerTest, aConnectionCarriesOneRequestAfterAnother) {
    start();
    Client client(server_->port());
    client.say(get("/one") + sending("POST", "/two", 4) + "body" +
               get("/three", "Connection: close\r\n"));
    const std::string answer = client.hearAll();
    EXPECT_TRUE(client.isAtEnd());
    EXPECT_THAT(answer, StartsWith("HTTP/1.1 200 OK\r\n"));
    EXPECT_THAT(answer, HasSubstr("one|"));
    EXPECT_THAT(answer, HasSubstr("two|body"));
    EXPECT_THAT(answer, HasSubstr("three|"));
}

TEST_F(BrowserServerTest, everyAnswerSaysThatNothingInItMayRunOrBeKept) {
    start();
    const std::string answer = answerTo(get("/x", "Connection: close\r\n"));
    for (const char* field :
         {"Cache-Control: no-store", "Content-Security-Policy: default-src 'none'",
          "X-Content-Type-Options: nosniff", "Cross-Origin-Resource-Policy: same-origin",
          "Referrer-Policy: no-referrer", "X-Frame-Options: DENY"}) {
        EXPECT_THAT(answer, HasSubstr(field));
    }
    EXPECT_THAT(answer, Not(HasSubstr("Access-Control")));
}

TEST_F(BrowserServerTest, whatCouldBeReadInTwoWaysIsRefused) {
    start();
    const std::string field = "Host: " + host() + "\r\n";
    const std::vector<std::pair<std::string, int>> requests{
        {"GET / HTTP/1.1\r\n\r\n", 400},
        {"GET / HTTP/1.1\r\n" + field + field + "\r\n", 400},
        {"GET / HTTP/1.1\r\nHost: evil.example\r\n\r\n", 421},
        {"GET / HTTP/1.0\r\n" + field + "\r\n", 505},
        {"GET / HTTP/1.1\n" + field + "\r\n", 400},
        {"GET / HTTP/1.1\r\n" + field + "A: b\n\r\n\r\n", 400},
        {"GET / HTTP/1.1\r\n" + field + "A: b\r\n c\r\n\r\n", 400},
        {"GET / HTTP/1.1\r\n" + field + "A: b\0c\r\n\r\n"s, 400},
        {sending("POST", "/", 1, "Content-Length: 1\r\n") + "a", 400},
        {sending("POST", "/", 1, "Content-Length: 2\r\n") + "a", 400},
        {sending("POST", "/", 1, "Transfer-Encoding: chunked\r\n") + "0\r\n\r\n", 501},
        {sending("POST", "/", 2'000'000), 413},
        {get("/%00"), 400},
        {get("/a%00b"), 400},
        {get("/%2e%2e/etc"), 400},
        {get("/../etc"), 400},
        {get("/./etc"), 400},
        {get("/a%2Fb"), 400},
        {get("/a%2fb"), 400},
        {get("/%ZZ"), 400},
        {get("/%"), 400},
        {get("//"), 200},
        {get("http://evil.example/"), 400},
        {"OPTIONS / HTTP/1.1\r\n" + field + "\r\n", 405},
        {"GET /" + std::string(20'000, 'a') + " HTTP/1.1\r\n" + field + "\r\n", 431},
        {"\r\n\r\n", 400},
        {"\x16\x03\x01\x02\r\n\r\n", 400}};
    for (const auto& [bytes, status] : requests) {
        if (status != 200) {
            EXPECT_THAT(answerTo(bytes), StartsWith("HTTP/1.1 " + std::to_string(status) + " "))
                << bytes.substr(0, 100);
        }
    }
    EXPECT_THAT(answerTo(get("/still", "Connection: close\r\n")), HasSubstr("still|"));
}

TEST_F(BrowserServerTest, aRefusedRequestIsTheLastOfItsConnection) {
    start();
    // What follows could be read as a request of its own.
    const std::string answer = answerTo("GET / HTTP/1.1\r\nHost: evil\r\n\r\n" + get("/second"));
    EXPECT_THAT(answer, Not(HasSubstr("second")));
}

TEST_F(BrowserServerTest, endlessHeadsAndSlowSendersAreCutOff) {
    start({.headTime = std::chrono::milliseconds(50), .idleTime = std::chrono::milliseconds(50)});
    Client silent(server_->port());
    Client slow(server_->port());
    slow.say("GET / HTTP/1.1\r\nHost:");
    Client half(server_->port());
    half.say(sending("POST", "/", 100) + "half");
    for (Client* client : {&silent, &slow, &half}) {
        EXPECT_EQ(client->hearAll(), "");
        EXPECT_TRUE(client->isAtEnd());
    }
    Client endless(server_->port());
    endless.say("GET / HTTP/1.1\r\n");
    for (int i = 0; i < 100'000 && endless.say("A: aaaaaaaaaaaaaaaaaaaaaaaa\r\n"); ++i) {
    }
    std::ignore = endless.hearAll();
    EXPECT_TRUE(endless.isAtEnd());
}

TEST_F(BrowserServerTest, contentOfAnyLengthIsSent) {
    start();
    const std::string answer = answerTo(get("/zeros", "Connection: close\r\n"));
    EXPECT_THAT(answer, HasSubstr("Content-Length: 1000000\r\n"));
    EXPECT_EQ(answer.substr(answer.find("\r\n\r\n") + 4), std::string(1'000'000, '0'));
}

TEST_F(BrowserServerTest, contentThatIsShorterThanWasSaidEndsTheConnection) {
    start();
    const std::string answer = answerTo(get("/short"));
    EXPECT_EQ(answer.substr(answer.find("\r\n\r\n") + 4), std::string(1000, '0'));
}

TEST_F(BrowserServerTest, contentOfAnUnknownLengthIsSentInChunksOnAConnectionThatGoesOn) {
    start();
    Client client(server_->port());
    client.say(get("/chunks"));
    const std::string answer = client.hear("\r\n0\r\n\r\n");
    EXPECT_THAT(answer, HasSubstr("Transfer-Encoding: chunked\r\n"));
    EXPECT_THAT(answer, Not(HasSubstr("Content-Length")));
    const std::string wanted = "10000\r\n" + std::string(0x10000, '0') + "\r\n86a0\r\n" +
                               std::string(100'000 - 0x10000, '0') + "\r\n0\r\n\r\n";
    EXPECT_EQ(answer.substr(answer.find("\r\n\r\n") + 4), wanted);
    client.say(get("/again"));
    EXPECT_THAT(client.hear("again|"), StartsWith("HTTP/1.1 200 OK\r\n"));
}

TEST_F(BrowserServerTest, contentThatFailsHasNoLastChunk) {
    start();
    const std::string answer = answerTo(get("/broken"));
    EXPECT_EQ(answer.substr(answer.find("\r\n\r\n") + 4), "1\r\n0\r\n");
}

TEST_F(BrowserServerTest, anUploadGoesToItsSinkPieceByPiece) {
    start();
    Client client(server_->port());
    const std::string content(3'000'000, 'x');
    client.say(sending("PUT", "/upload", content.size()) + content);
    EXPECT_THAT(client.hear("took"), HasSubstr("took 3000000"));
    client.say(get("/next"));
    EXPECT_THAT(client.hear("next|"), HasSubstr("next|"));
    client.say(sending("PUT", "/upload", 0));
    EXPECT_THAT(client.hear("took"), HasSubstr("took 0"));
    client.say(sending("PUT", "/upload", 2, "Expect: 100-continue\r\n"));
    EXPECT_THAT(client.hear("\r\n\r\n"), StartsWith("HTTP/1.1 100 Continue"));
    client.say("ab");
    EXPECT_THAT(client.hear("took"), HasSubstr("took 2"));
}

TEST_F(BrowserServerTest, anUploadThatIsRefusedOrFailsIsAnsweredThoughAllWasSent) {
    start();
    const std::string content(20'000'000, 'x');
    EXPECT_THAT(answerTo(sending("PUT", "/refused", content.size()) + content),
                StartsWith("HTTP/1.1 409 "));
    EXPECT_THAT(answerTo(sending("PUT", "/upload", content.size()) + content), HasSubstr("posix"));
    EXPECT_TRUE(site_.waitForUnfinished(1));
}

TEST_F(BrowserServerTest, anUploadWhoseClientGoesEndsUnfinished) {
    start();
    {
        Client client(server_->port());
        client.say(sending("PUT", "/upload", 1000) + "some");
    }
    EXPECT_TRUE(site_.waitForUnfinished(1));
}

TEST_F(BrowserServerTest, aReplyThatIsDroppedIsAnsweredAsAFailure) {
    start();
    EXPECT_THAT(answerTo(get("/nothing", "Connection: close\r\n")), StartsWith("HTTP/1.1 500 "));
}

TEST_F(BrowserServerTest, eventsFlowUntilTheirSessionEnds) {
    start();
    Client client(server_->port());
    client.say(get("/events"));
    EXPECT_THAT(client.hear("{}\n\n"), HasSubstr("event: ready\ndata: {}\n\n"));
    site_.end();
    EXPECT_EQ(client.hearAll(), "");
    EXPECT_TRUE(client.isAtEnd());
}

TEST_F(BrowserServerTest, theIdleMakeRoomWhenThereAreTooMany) {
    start({.connections = 8});
    Client stream(server_->port());
    stream.say(get("/events"));
    EXPECT_THAT(stream.hear("{}\n\n"), HasSubstr("ready"));
    std::vector<std::unique_ptr<Client>> idle;
    for (int i = 0; i < 20; ++i) {
        idle.push_back(std::make_unique<Client>(server_->port()));
        EXPECT_TRUE(idle.back()->isConnected());
    }
    Client client(server_->port());
    client.say(get("/room"));
    EXPECT_THAT(client.hear("room|"), HasSubstr("room|"));
    EXPECT_EQ(idle.front()->hearAll(), "");
    EXPECT_TRUE(idle.front()->isAtEnd());
}

// Kibibytes of memory that this process holds.
std::size_t residentSize() {
    std::ifstream status("/proc/self/status");
    for (std::string word; status >> word;) {
        if (word == "VmRSS:") {
            std::size_t size = 0;
            status >> size;
            return size;
        }
    }
    return 0;
}

TEST_F(BrowserServerTest, hundredsOfStreamsCostLittle) {
    start();
    std::vector<std::unique_ptr<Client>> streams;
    const std::size_t before = residentSize();
    for (int i = 0; i < 400; ++i) {
        streams.push_back(std::make_unique<Client>(server_->port()));
        streams.back()->say(get("/events"));
        ASSERT_THAT(streams.back()->hear("{}\n\n"), HasSubstr("ready"));
    }
    constexpr std::size_t most = std::size_t{64} << 10U;
    EXPECT_LT(residentSize() - std::min(before, residentSize()), most);
    EXPECT_THAT(answerTo(get("/others", "Connection: close\r\n")), HasSubstr("others|"));
}

TEST_F(BrowserServerTest, aTakenPortIsAnError) {
    start();
    const auto other = BrowserServer::start(server_->port());
    ASSERT_FALSE(other.has_value());
    EXPECT_EQ(other.error(), errorWithPOSIXCode(EADDRINUSE));
}

TEST_F(BrowserServerTest, itEndsWhateverItsClientsDo) {
    start();
    Client silent(server_->port());
    Client stream(server_->port());
    stream.say(get("/events"));
    EXPECT_THAT(stream.hear("{}\n\n"), HasSubstr("ready"));
    Client reader(server_->port());
    reader.say(get("/zeros"));
    Client sender(server_->port());
    sender.say(sending("PUT", "/upload", 1000) + "some");
    server_.reset();
    EXPECT_EQ(stream.hearAll(), "");
    EXPECT_TRUE(stream.isAtEnd());
}

}  // namespace
}  // namespace marrowdale::host
