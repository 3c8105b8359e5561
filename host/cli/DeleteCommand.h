#pragma once

#include <string>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `delete ITEM`.
class DeleteCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "delete"; }
    [[nodiscard]] std::string_view summary() const override { return "Delete an item for good"; }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string item_;
};

}  // namespace marrowdale::host
