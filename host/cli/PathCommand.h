#pragma once

#include <string>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `path ITEM`: where the item stands now. For people on a terminal the path is made harmless; into
// a pipe it goes byte by byte.
class PathCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "path"; }
    [[nodiscard]] std::string_view summary() const override { return "Show where an item is now"; }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::string item_;
};

}  // namespace marrowdale::host
