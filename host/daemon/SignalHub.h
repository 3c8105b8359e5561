#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <thread>

#include "host/requests/HostRequests.h"
#include "platform/foundation/Mutex.h"

namespace marrowdale::host {

// Hands signals for containers to everybody who subscribed, on a thread of its own. The first
// signal of a container is handed over at once; those that follow within the pause become one, at
// its end. So every signal is followed by a call, and a storm makes a few calls a second. Any
// thread.
class SignalHub {
  public:
    explicit SignalHub(std::chrono::milliseconds pause = std::chrono::milliseconds(250));
    // No taker is called afterwards; subscriptions must be gone.
    ~SignalHub();
    SignalHub(const SignalHub&) = delete;
    SignalHub& operator=(const SignalHub&) = delete;

    void signal(std::string_view container);

    // Ends the subscription when it goes: its taker is not called any more then, nor is a call in
    // progress. Not to be dropped by the taker itself.
    class Subscription {
      public:
        Subscription(SignalHub& hub, std::uint64_t number) : hub_(hub), number_(number) {}
        ~Subscription() { hub_.remove(number_); }
        Subscription(const Subscription&) = delete;
        Subscription& operator=(const Subscription&) = delete;

      private:
        SignalHub& hub_;
        std::uint64_t number_;
    };
    // Takers are called one at a time and must not wait for long.
    [[nodiscard]] std::unique_ptr<Subscription> subscribe(SignalTaker taker);

  private:
    using Clock = std::chrono::steady_clock;

    void remove(std::uint64_t number);
    void run();
    // The container that is due, taken from the pending ones; waits for one. Empty at the end.
    [[nodiscard]] std::string nextDue();
    [[nodiscard]] std::string takeDue() MARROWDALE_REQUIRES(mutex_);
    void deliver(const std::string& container);

    const std::chrono::milliseconds pause_;
    Mutex mutex_;
    Condition changed_;
    bool isEnding_ MARROWDALE_GUARDED_BY(mutex_) = false;
    std::map<std::string, Clock::time_point, std::less<>> pending_ MARROWDALE_GUARDED_BY(mutex_);
    // When the next call for a container may be made.
    std::map<std::string, Clock::time_point, std::less<>> notBefore_ MARROWDALE_GUARDED_BY(mutex_);
    Mutex takersMutex_;
    std::map<std::uint64_t, SignalTaker> takers_ MARROWDALE_GUARDED_BY(takersMutex_);
    std::uint64_t lastNumber_ MARROWDALE_GUARDED_BY(takersMutex_) = 0;
    std::thread thread_;  // after everything it uses
};

}  // namespace marrowdale::host
