#pragma once

#include <string>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `favorite ITEM RANK` / `favorite ITEM --clear`.
class FavoriteCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "favorite"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Set or clear an item's favourite rank";
    }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string item_;
    std::string rank_;
    bool clears_ = false;
};

}  // namespace marrowdale::host
