#pragma once

#include <boost/asio/as_tuple.hpp>
#include <boost/asio/awaitable.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/thread_pool.hpp>
#include <boost/asio/use_awaitable.hpp>
#include <chrono>
#include <deque>
#include <functional>
#include <memory>
#include <optional>
#include <stop_token>
#include <string>
#include <string_view>

#include "host/browser/BrowserServer.h"
#include "host/browser/BrowserSite.h"

namespace marrowdale::host {

// What the listener's files share. For these alone.
namespace asio = boost::asio;
using Code = boost::system::error_code;
template <typename T>
using Awaitable = asio::awaitable<T>;
// Coroutines get error codes in place of exceptions.
inline constexpr auto asQuietly = asio::as_tuple(asio::use_awaitable);

// The threads that may wait. Requests to the provider, and reading and writing content, have some
// each: whoever sends much does not keep those waiting who ask.
class ConnectionThreads {
  public:
    [[nodiscard]] asio::thread_pool& requests() { return requests_; }
    [[nodiscard]] asio::thread_pool& content() { return content_; }
    void join() {
        requests_.join();
        content_.join();
    }

  private:
    static constexpr std::size_t requestThreads = 8;
    static constexpr std::size_t contentThreads = 4;
    asio::thread_pool requests_{requestThreads};
    asio::thread_pool content_{contentThreads};
};

// One connection: reads a request, has the site answer it, sends the answer, and begins anew. All
// of it runs on the listener's one thread.
class BrowserConnection : public std::enable_shared_from_this<BrowserConnection> {
  public:
    class Owner {
      public:
        virtual ~Owner() = default;
        virtual void ended(const std::shared_ptr<BrowserConnection>& connection) = 0;
    };

    // All of it outlives the connection.
    BrowserConnection(Owner& owner, BrowserSite& site, ConnectionThreads& threads,
                      const BrowserLimits& limits, asio::ip::tcp::socket socket);

    void start();
    void close();
    // Whether no request has begun.
    [[nodiscard]] bool isIdle() const { return isIdle_; }

  private:
    class Reply;
    using Clock = std::chrono::steady_clock;

    // What these are given lives in the frames of those who wait for them: GCC 12 copies
    // temporaries of an awaited call byte by byte, so that none may own anything.
    Awaitable<void> serve();
    // False when the connection can't go on.
    Awaitable<bool> serveOne();
    // A whole head, taken from the input; none when the connection has ended, or was answered.
    Awaitable<std::optional<HttpHead>> readHead();
    Awaitable<bool> readMore();
    Awaitable<bool> readBody(BrowserRequest& request);
    Awaitable<bool> handle(BrowserRequest& request);
    Awaitable<bool> takeUpload(BrowserRequest& request);
    Awaitable<std::optional<BrowserResponse>> fill(ContentSink& sink, std::uint64_t length);

    Awaitable<bool> send(BrowserResponse& response);
    // An answer before all of the request was read: the rest is read and dropped for a while, so
    // that the answer is not lost with the connection.
    Awaitable<void> sendLast(BrowserResponse& response);
    Awaitable<void> sendFault(unsigned status, std::string_view reason);
    Awaitable<bool> sendSource(ContentSource& source, std::optional<std::uint64_t> length);
    Awaitable<bool> sendEvents();
    Awaitable<bool> write(std::string_view text);

    // Does the work on one of the threads and goes on here with its result. It captures references.
    template <typename Work>
    Awaitable<std::invoke_result_t<Work>> on(asio::thread_pool& threads, Work work);

    void expectWithin(std::chrono::milliseconds time);
    Awaitable<void> watchTime();
    void watchForTheEnd();

    Owner& owner_;
    BrowserSite& site_;
    ConnectionThreads& threads_;
    const BrowserLimits& limits_;
    asio::ip::tcp::socket socket_;
    asio::steady_timer deadline_;
    std::string input_;  // what has come and was not looked at
    bool isIdle_ = true;
    bool isClosed_ = false;
    bool isWatching_ = false;  // for the client to go
    bool keepsAlive_ = true;
    std::stop_source gone_;

    // What the reply has been told, until it is sent.
    struct Answers {
        std::optional<BrowserResponse> response;
        struct Event {
            std::string key;
            std::string text;
        };
        bool isStream = false;
        bool isEnded = false;
        std::deque<Event> events;
        std::shared_ptr<void> kept;
        std::unique_ptr<std::stop_callback<std::function<void()>>> ending;
    };
    Answers answers_;
    asio::steady_timer answered_;  // cancelled whenever there is news above
};

}  // namespace marrowdale::host
