#pragma once

#include <chrono>
#include <cstdint>
#include <deque>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Mutex.h"

namespace marrowdale::host {

// Archives that the page asked for and the web browser has not fetched yet: a download begins with
// an address, which sends no list. Kept in memory for a short time, the oldest of too many not even
// for that. Any thread.
class OrderedArchives {
  public:
    static constexpr std::size_t most = 16;
    static constexpr std::size_t mostItems = 10'000;
    static constexpr std::chrono::minutes lifetime{15};
    using Clock = std::chrono::steady_clock;

    struct Order {
        std::uint64_t session = 0;
        std::string name;  // of the file that is made
        std::vector<std::string> items;
    };

    explicit OrderedArchives(std::function<Clock::time_point()> now = [] { return Clock::now(); })
        : now_(std::move(now)) {}

    // Answers a secret that stands for the order.
    [[nodiscard]] std::string add(Order order);
    [[nodiscard]] std::optional<Order> find(std::string_view secret);

  private:
    struct Entry {
        std::string secret;
        Clock::time_point end;
        Order order;
    };

    const std::function<Clock::time_point()> now_;
    Mutex mutex_;
    std::deque<Entry> entries_ MARROWDALE_GUARDED_BY(mutex_);
};

}  // namespace marrowdale::host
