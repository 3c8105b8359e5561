#pragma once

#include <string_view>

#include "host/cli/CommandContext.h"
#include "host/cli/Failure.h"

namespace CLI {
class App;
}

namespace marrowdale::host {

// One command of the program: says what its arguments are, then does its work. It lives as long as
// the command line, which stores the arguments in it.
class Command {
  public:
    virtual ~Command() = default;
    [[nodiscard]] virtual std::string_view name() const = 0;
    // One line for `--help`.
    [[nodiscard]] virtual std::string_view summary() const = 0;
    virtual void declareArguments(CLI::App& arguments) = 0;
    // Called once, after the arguments were stored.
    [[nodiscard]] virtual Outcome run(CommandContext& context) = 0;
};

}  // namespace marrowdale::host
