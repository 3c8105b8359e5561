#pragma once

#include <string>
#include <string_view>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `NAME ITEM VALUE` / `NAME ITEM --clear`: sets one value of an item, or takes it away.
class ValueCommand : public ActionCommand {
  public:
    void declareArguments(CLI::App& arguments) final;

  protected:
    // What the value is called in the usage ("RANK"), and what is said of it and of `--clear`.
    struct Words {
        const char* value;
        const char* valueHelp;
        const char* clearHelp;
    };
    ValueCommand(ItemAction::Kind kind, const Words& words) : kind_(kind), words_(words) {}

    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) final;
    // Puts the value into the action; false for a text that is none.
    [[nodiscard]] virtual bool take(const std::string& text, ItemAction& action) const = 0;
    // What to call such a text: "no number".
    [[nodiscard]] virtual std::string_view complaint() const = 0;

  private:
    const ItemAction::Kind kind_;
    const Words words_;
    std::string item_;
    std::string value_;
    bool clears_ = false;
};

}  // namespace marrowdale::host
