#pragma once

#include "host/cli/ValueCommand.h"

namespace marrowdale::host {

// `used ITEM DATE` / `used ITEM --clear`.
class UsedCommand final : public ValueCommand {
  public:
    UsedCommand()
        : ValueCommand(ItemAction::Kind::used,
                       {.value = "DATE",
                        .valueHelp = "RFC 3339, such as 2026-01-31T23:59:59Z",
                        .clearHelp = "Take the date away"}) {}
    [[nodiscard]] std::string_view name() const override { return "used"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Set or clear an item's last-used date";
    }

  protected:
    [[nodiscard]] bool take(const std::string& text, ItemAction& action) const override {
        action.date = Date::fromRFC3339(text);
        return action.date.has_value();
    }
    [[nodiscard]] std::string_view complaint() const override { return "no date of RFC 3339"; }
};

}  // namespace marrowdale::host
