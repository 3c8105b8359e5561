#pragma once

#include <string>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `used ITEM DATE` / `used ITEM --clear`.
class UsedCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "used"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Set or clear an item's last-used date";
    }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string item_;
    std::string date_;
    bool clears_ = false;
};

}  // namespace marrowdale::host
