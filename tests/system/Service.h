#pragma once

#include <chrono>
#include <csignal>
#include <string>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {

// How long anything may take before a test fails.
inline constexpr std::chrono::seconds patience{30};

// `marrowdale serve` in a home, ready when this is made.
class Service {
  public:
    explicit Service(const Home& home, const Arguments& arguments = {"--json", "serve"})
        : process_(home.command(arguments)) {
        ready_ = process_.readOutput(1, patience);
    }
    [[nodiscard]] const std::string& ready() const { return ready_; }
    [[nodiscard]] pid_t number() const { return process_.number(); }
    void kill() { process_.kill(); }
    [[nodiscard]] ChildResult end(int signal = SIGTERM) {
        ::kill(process_.number(), signal);
        return process_.finish();
    }

  private:
    ChildProcess process_;
    std::string ready_;
};

}  // namespace marrowdale::tests
