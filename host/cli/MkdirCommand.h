#pragma once

#include <string>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `mkdir NAME --in ITEM`.
class MkdirCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "mkdir"; }
    [[nodiscard]] std::string_view summary() const override { return "Create a folder"; }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string name_;
    std::string in_;
};

}  // namespace marrowdale::host
