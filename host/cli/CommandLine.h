#pragma once

#include <memory>
#include <span>
#include <vector>

#include "host/cli/Command.h"
#include "host/cli/CommandContext.h"

namespace marrowdale::host {

// The program: reads the command line, runs the command, tells errors on standard error, and
// answers the exit code. One thread.
class CommandLine {
  public:
    CommandLine(const Environment& environment, Output& output);

    // `arguments`: without the program's name.
    [[nodiscard]] ExitCode run(std::span<const char* const> arguments);

  private:
    [[nodiscard]] Outcome parseAndRun(std::span<const char* const> arguments);
    [[nodiscard]] Outcome finish(Outcome outcome);

    const Environment& environment_;
    Output& output_;
    GlobalOptions options_;
    std::vector<std::unique_ptr<Command>> commands_;
};

}  // namespace marrowdale::host
