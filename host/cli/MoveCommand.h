#pragma once

#include <optional>
#include <string>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `move ITEM --to ITEM [--name NAME]`.
class MoveCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "move"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Move an item to another folder, and rename it if you like";
    }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string item_;
    std::string to_;
    std::optional<std::string> name_;
};

}  // namespace marrowdale::host
