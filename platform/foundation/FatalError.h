#pragma once

#include <string_view>

namespace marrowdale {

// Ends the process (SIGABRT) with "fatal: MESSAGE" on standard error. For mistakes of the program
// itself after which nothing it would go on to do can be trusted; never for what comes from
// outside (files, clients, the system), which is answered with an Error. Any thread.
[[noreturn]] void fatalError(std::string_view message) noexcept;

}  // namespace marrowdale
