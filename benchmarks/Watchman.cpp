#include "benchmarks/Watchman.h"

#include <array>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <poll.h>
#include <spawn.h>
#include <stdexcept>
#include <string_view>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <vector>

#include <fmt/format.h>

namespace marrowdale::benchmarks {
namespace {

constexpr int patienceMilliseconds = 120'000;

pid_t start(const std::string& folder) {
    std::vector<std::string> arguments{"watchman",
                                       "--foreground",
                                       "--no-save-state",
                                       "--sockname=" + folder + "/socket",
                                       "--statefile=" + folder + "/state",
                                       "--logfile=" + folder + "/log",
                                       "--pidfile=" + folder + "/pid"};
    std::vector<char*> pointers;
    for (std::string& argument : arguments) {
        pointers.push_back(argument.data());
    }
    pointers.push_back(nullptr);
    pid_t process = 0;
    if (::posix_spawnp(&process, "watchman", nullptr, nullptr, pointers.data(), environ) != 0) {
        throw std::runtime_error("can't start watchman");
    }
    return process;
}

void end(pid_t process) {
    ::kill(process, SIGKILL);
    ::waitpid(process, nullptr, 0);
}

// The text behind `"key":"`, up to the next quotation mark.
std::string textOf(std::string_view answer, std::string_view key) {
    const std::string start = fmt::format("\"{}\":\"", key);
    const auto found = answer.find(start);
    if (found == std::string_view::npos) {
        throw std::runtime_error(
            fmt::format("watchman answers no {}: {}", key, answer.substr(0, 200)));
    }
    const auto rest = answer.substr(found + start.size());
    return std::string(rest.substr(0, rest.find('"')));
}

}  // namespace

Watchman::Watchman() {
    std::string pattern = std::filesystem::temp_directory_path() / "marrowdale-watchman-XXXXXX";
    if (::mkdtemp(pattern.data()) == nullptr) {
        throw std::runtime_error("can't make " + pattern);
    }
    folder_ = pattern;
    process_ = start(folder_);
    for (int tries = 0; !connect(); ++tries) {
        if (tries == 500) {
            end(process_);
            std::filesystem::remove_all(folder_);
            throw std::runtime_error("watchman does not answer");
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
}

Watchman::~Watchman() {
    end(process_);
    std::error_code ignored;  // a left-over in the temporary folder harms nobody
    std::filesystem::remove_all(folder_, ignored);
}

bool Watchman::connect() {
    socket_.reset(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    const std::string path = folder_ + "/socket";
    if (!socket_ || path.size() >= sizeof address.sun_path) {
        throw std::runtime_error("no socket at " + path);
    }
    std::memcpy(address.sun_path, path.data(), path.size());
    return ::connect(socket_.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) ==
           0;
}

std::string Watchman::readLine() {
    std::array<char, std::size_t{64} << 10U> buffer{};
    std::size_t looked = 0;
    while (true) {
        if (const auto end = rest_.find('\n', looked); end != std::string::npos) {
            std::string line = rest_.substr(0, end);
            rest_.erase(0, end + 1);
            return line;
        }
        looked = rest_.size();
        pollfd wait{socket_.get(), POLLIN, 0};
        const ssize_t count = ::poll(&wait, 1, patienceMilliseconds) == 1
                                  ? ::read(socket_.get(), buffer.data(), buffer.size())
                                  : 0;
        if (count <= 0) {
            throw std::runtime_error("watchman answers no more");
        }
        rest_.append(buffer.data(), static_cast<std::size_t>(count));
    }
}

std::string Watchman::ask(const std::string& command) {
    const std::string line = command + "\n";
    if (::write(socket_.get(), line.data(), line.size()) != static_cast<ssize_t>(line.size())) {
        throw std::runtime_error("watchman takes no command");
    }
    std::string answer = readLine();
    while (answer.find("\"subscription\":") != std::string::npos) {
        answer = readLine();
    }
    if (answer.find("\"error\":") != std::string::npos) {
        throw std::runtime_error("watchman: " + answer.substr(0, 200));
    }
    return answer;
}

void Watchman::watch(const std::string& folder) {
    (void)ask(fmt::format(R"(["watch","{}"])", folder));
    (void)clock(folder);
}

void Watchman::forget(const std::string& folder) {
    (void)ask(fmt::format(R"(["watch-del","{}"])", folder));
}

std::string Watchman::clock(const std::string& folder) {
    return textOf(
        ask(fmt::format(R"(["clock","{}",{{"sync_timeout":{}}}])", folder, patienceMilliseconds)),
        "clock");
}

std::size_t Watchman::since(const std::string& folder, const std::string& clock, Fields fields) {
    const std::string_view wanted =
        fields == Fields::names
            ? R"("name")"
            : R"("name","exists","new","size","mode","uid","gid","mtime_ms","ctime_ms","ino","dev","nlink","type","cclock")";
    const std::string answer =
        ask(fmt::format(R"(["query","{}",{{"since":"{}","fields":[{}],"sync_timeout":{}}}])",
                        folder, clock, wanted, patienceMilliseconds));
    if (answer.find("\"is_fresh_instance\":true") != std::string::npos) {
        throw std::runtime_error("watchman lost what changed");
    }
    return answer.size();
}

// The answer to `subscribe` names the subscription too, as what it tells later does.
void Watchman::subscribe(const std::string& folder) {
    const std::string line = fmt::format(
        "[\"subscribe\",\"{0}\",\"benchmark\",{{\"since\":\"{1}\",\"fields\":[\"name\"]"
        "}}]\n",
        folder, clock(folder));
    if (::write(socket_.get(), line.data(), line.size()) != static_cast<ssize_t>(line.size())) {
        throw std::runtime_error("watchman takes no command");
    }
    while (readLine().find("\"subscribe\":") == std::string::npos) {
    }
}

void Watchman::unsubscribe(const std::string& folder) {
    (void)ask(fmt::format(R"(["unsubscribe","{}","benchmark"])", folder));
}

void Watchman::waitForChange(const std::string& name) {
    while (readLine().find(name) == std::string::npos) {
    }
}

double Watchman::memory() const {
    std::ifstream status(fmt::format("/proc/{}/status", process_));
    constexpr std::string_view key = "VmRSS:";
    for (std::string line; std::getline(status, line);) {
        if (line.starts_with(key)) {
            return std::stod(line.substr(key.size())) * 1024;
        }
    }
    throw std::runtime_error("watchman is gone");
}

}  // namespace marrowdale::benchmarks
