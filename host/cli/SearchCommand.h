#pragma once

#include <string>
#include <vector>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `search TEXT…`: the items whose name or a tag of theirs contains every text.
class SearchCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "search"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Find items by parts of their names and tags";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::vector<std::string> texts_;
};

}  // namespace marrowdale::host
