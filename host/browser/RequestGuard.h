#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/browser/HttpHead.h"

namespace marrowdale::host {

// Tells requests of the document browser's own page from those that other pages in the same web
// browser make. A value made once for a port; any thread.
//
// - One Host field, from a fixed list: a name that somebody else's name server has pointed here is
//   not on it.
// - What is said to come from another site, or another origin, is refused, but for the navigation
//   of a whole window to the page itself (a link in a web mail or a terminal in a browser).
// - What changes something comes from our own origin, and with a type of content that a form can't
//   send.
class RequestGuard {
  public:
    explicit RequestGuard(std::uint16_t port);

    struct Refusal {
        unsigned status = 0;
        std::string_view reason;
    };
    // None for a request that may go on.
    [[nodiscard]] std::optional<Refusal> refusal(const HttpHead& head) const;

  private:
    [[nodiscard]] std::optional<Refusal> originRefusal(const HttpHead& head) const;
    [[nodiscard]] static std::optional<Refusal> contentRefusal(const HttpHead& head);

    std::vector<std::string> hosts_;
};

}  // namespace marrowdale::host
