#pragma once

#include <string>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `info ITEM`: one item, every field it has.
class InfoCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "info"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Show everything about one item";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::string item_;
};

}  // namespace marrowdale::host
