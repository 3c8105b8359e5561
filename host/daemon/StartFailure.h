#pragma once

#include <expected>
#include <string>
#include <string_view>

#include "platform/foundation/Error.h"

namespace marrowdale::host {

// Why the provider could not be started.
struct StartFailure {
    // The system's error behind it; none where the refusal is our own (code 0).
    Error error;
    // One line for people: what is wrong and, where that helps, what to do about it.
    std::string message;

    // A refusal of our own.
    [[nodiscard]] static StartFailure refusal(std::string message) {
        return {{}, std::move(message)};
    }
    // A failed system call: the message tells `what` failed and why.
    [[nodiscard]] static StartFailure system(int code, std::string_view what) {
        const Error error = errorWithPOSIXCode(code);
        return {error, std::string(what) + ": " + error.description()};
    }
    [[nodiscard]] static StartFailure from(Error error) {
        std::string message = error.description();
        return {std::move(error), std::move(message)};
    }
};

// A value, or why the provider could not be started.
template <typename T>
using Started = std::expected<T, StartFailure>;

}  // namespace marrowdale::host
