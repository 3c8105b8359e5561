#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "host/browser/Secrets.h"
#include "host/daemon/ApiMessages.h"

namespace marrowdale::host {

// What a signed address leads to.
struct SignedPlace {
    enum class View : std::uint8_t {
        content,   // shown by the web browser itself, where its type can do no harm
        download,  // to be kept as a file
    };
    View view = View::download;
    std::string item;  // its identifier
    std::uint64_t session = 0;

    friend bool operator==(const SignedPlace&, const SignedPlace&) = default;
};

// Addresses for what a web browser asks for by itself (images, frames, downloads), without the
// session's token: each is good for one item, one view, one session and a short time, and for
// nothing when this process has ended. Any thread.
class SignedAddresses {
  public:
    static constexpr std::chrono::minutes lifetime{15};
    using Clock = std::chrono::steady_clock;

    explicit SignedAddresses(std::function<Clock::time_point()> now = [] { return Clock::now(); })
        : now_(std::move(now)) {}

    // Begins with "/files/". A name at its end is for people alone: viewers show what an address
    // ends with.
    [[nodiscard]] std::string addressOf(const SignedPlace& place, std::string_view name = {}) const;
    // None for an address that is not ours, was changed, or is too old.
    [[nodiscard]] std::optional<SignedPlace> placeAt(const ApiRequest& request) const;

  private:
    [[nodiscard]] std::string signature(const SignedPlace& place, std::string_view expiry) const;

    const std::function<Clock::time_point()> now_;
    const std::string key_ = newSecret();
};

}  // namespace marrowdale::host
