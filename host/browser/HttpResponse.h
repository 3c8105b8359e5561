#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "host/browser/BrowserSite.h"
#include "host/daemon/ApiMessages.h"

namespace marrowdale::host {

// The bytes in front of an answer's content. Where the response does not say otherwise, it is not
// to be kept, framed, sniffed, or read by other origins, and nothing in it may run.
[[nodiscard]] std::string headOf(const BrowserResponse& response,
                                 std::optional<std::uint64_t> length, bool keepsAlive);
[[nodiscard]] std::string headOfEvents();

[[nodiscard]] BrowserResponse responseOf(ApiAnswer answer);
// {"error": {…}} for a refusal of the listener's own, in words.
[[nodiscard]] BrowserResponse refusalOf(unsigned status, std::string_view reason);
[[nodiscard]] BrowserResponse responseOf(const Error& error);

}  // namespace marrowdale::host
