#include "host/browser/BrowserServer.h"

#include <algorithm>
#include <boost/asio/co_spawn.hpp>
#include <boost/asio/detached.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <cerrno>
#include <sys/resource.h>
#include <thread>

#include "host/browser/BrowserConnection.h"

namespace marrowdale::host {

namespace {

using Tcp = asio::ip::tcp;

// Others in this process need descriptors, too.
std::size_t connectionsWithin(std::size_t wanted) {
    rlimit limit{};
    if (::getrlimit(RLIMIT_NOFILE, &limit) != 0 || limit.rlim_cur == RLIM_INFINITY) {
        return wanted;
    }
    return std::clamp<std::size_t>(limit.rlim_cur / 2, 1, wanted);
}

}  // namespace

class BrowserServer::Core final : public BrowserConnection::Owner {
  public:
    explicit Core(BrowserLimits limits) : limits_(limits) {
        limits_.connections = connectionsWithin(limits_.connections);
    }
    ~Core() override = default;
    Core(const Core&) = delete;
    Core& operator=(const Core&) = delete;

    [[nodiscard]] Expected<void> listen(std::uint16_t port);
    [[nodiscard]] std::uint16_t port() const { return port_; }
    void serve(BrowserSite& site);
    void stop();

    void ended(const std::shared_ptr<BrowserConnection>& connection) override {
        connections_.erase(std::ranges::find(connections_, connection), connections_.end());
    }

  private:
    Awaitable<void> accept(BrowserSite& site);
    void take(Tcp::socket socket, BrowserSite& site);
    void makeRoom();

    BrowserLimits limits_;
    std::uint16_t port_ = 0;
    asio::io_context context_{1};
    asio::executor_work_guard<asio::io_context::executor_type> work_{context_.get_executor()};
    ConnectionThreads threads_;
    Tcp::acceptor acceptor_{context_};
    std::vector<std::shared_ptr<BrowserConnection>> connections_;  // in the order they came
    std::thread thread_;
};

Expected<void> BrowserServer::Core::listen(std::uint16_t port) {
    Code code;
    const Tcp::endpoint endpoint(asio::ip::address_v4::loopback(), port);
    acceptor_.open(endpoint.protocol(), code);
    if (!code) {
        acceptor_.set_option(Tcp::acceptor::reuse_address(true), code);
    }
    if (!code) {
        acceptor_.bind(endpoint, code);
    }
    if (!code) {
        acceptor_.listen(asio::socket_base::max_listen_connections, code);
    }
    if (!code) {
        port_ = acceptor_.local_endpoint(code).port();
    }
    if (code) {
        return Unexpected(
            errorWithPOSIXCode(code.value(), "listen at", "127.0.0.1:" + std::to_string(port)));
    }
    return {};
}

void BrowserServer::Core::serve(BrowserSite& site) {
    asio::co_spawn(context_, accept(site), asio::detached);
    thread_ = std::thread([this] { context_.run(); });
}

Awaitable<void> BrowserServer::Core::accept(BrowserSite& site) {
    asio::steady_timer pause(context_);
    while (acceptor_.is_open()) {
        auto [code, socket] = co_await acceptor_.async_accept(asQuietly);
        if (!code) {
            take(std::move(socket), site);
        } else if (code != asio::error::operation_aborted) {
            // Out of descriptors or memory: others give some back in time.
            pause.expires_after(std::chrono::milliseconds(100));
            std::ignore = co_await pause.async_wait(asQuietly);
        }
    }
}

void BrowserServer::Core::take(Tcp::socket socket, BrowserSite& site) {
    makeRoom();
    Code ignored;
    socket.set_option(Tcp::no_delay(true), ignored);
    const auto connection =
        std::make_shared<BrowserConnection>(*this, site, threads_, limits_, std::move(socket));
    connections_.push_back(connection);
    connection->start();
}

void BrowserServer::Core::makeRoom() {
    if (connections_.size() < limits_.connections) {
        return;
    }
    const auto idle = std::ranges::find_if(connections_, &BrowserConnection::isIdle);
    const auto chosen = *(idle == connections_.end() ? connections_.begin() : idle);
    chosen->close();
}

void BrowserServer::Core::stop() {
    if (!thread_.joinable()) {
        return;
    }
    asio::post(context_, [this] {
        Code ignored;
        acceptor_.close(ignored);
        const auto connections = connections_;
        for (const auto& connection : connections) {
            connection->close();
        }
        work_.reset();
    });
    // Coroutines end on the context's thread, and what they wait for on the others.
    thread_.join();
    threads_.join();
    // What the last calls had to say, to connections that are closed.
    context_.restart();
    context_.poll();
}

BrowserServer::BrowserServer(std::unique_ptr<Core> core) : core_(std::move(core)) {}

Expected<std::unique_ptr<BrowserServer>> BrowserServer::start(std::uint16_t port,
                                                              BrowserLimits limits) {
    auto core = std::make_unique<Core>(limits);
    if (auto listening = core->listen(port); !listening) {
        return Unexpected(listening.error());
    }
    return std::unique_ptr<BrowserServer>(new BrowserServer(std::move(core)));
}

BrowserServer::~BrowserServer() {
    core_->stop();
}

std::uint16_t BrowserServer::port() const {
    return core_->port();
}

void BrowserServer::serve(BrowserSite& site) {
    core_->serve(site);
}

}  // namespace marrowdale::host
