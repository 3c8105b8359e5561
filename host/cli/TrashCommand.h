#pragma once

#include <string>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `trash ITEM`.
class TrashCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "trash"; }
    [[nodiscard]] std::string_view summary() const override { return "Move an item to the trash"; }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string item_;
};

}  // namespace marrowdale::host
