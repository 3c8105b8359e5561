#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include "host/cli/CommandContext.h"

namespace marrowdale::host {

// What a service is like that runs in this process until it is told to end.
struct Serving {
    enum class Browser : std::uint8_t {
        announced,  // the document browser, and its address is told
        quiet,      // the document browser, whose address has to be asked for
        none,
    };
    Browser browser = Browser::announced;
    // Where the document browser listens; 0: any free port. None: the usual one, or any.
    std::optional<std::uint16_t> port = std::nullopt;
    // How long what was trashed is kept; none: forever.
    std::optional<std::chrono::days> trashAge = std::nullopt;
    // Called with the address when it was told.
    std::function<void(const std::string& address)> told = nullptr;

    // Serves, and tells that it is ready; returns when a signal asks for the end.
    [[nodiscard]] Outcome run(const CommandContext& context) const;
};

}  // namespace marrowdale::host
