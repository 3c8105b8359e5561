#pragma once

#include "host/cli/ValueCommand.h"

namespace marrowdale::host {

// `favorite ITEM RANK` / `favorite ITEM --clear`.
class FavoriteCommand final : public ValueCommand {
  public:
    FavoriteCommand()
        : ValueCommand(
              ItemAction::Kind::favorite,
              {.value = "RANK", .valueHelp = "A number", .clearHelp = "Take the rank away"}) {}
    [[nodiscard]] std::string_view name() const override { return "favorite"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Set or clear an item's favourite rank";
    }

  protected:
    [[nodiscard]] bool take(const std::string& text, ItemAction& action) const override;
    [[nodiscard]] std::string_view complaint() const override { return "no number"; }
};

}  // namespace marrowdale::host
