#pragma once

#include <string>
#include <vector>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `tag ITEM [TAG…]`.
class TagCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "tag"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Set the tags of an item; none clears them";
    }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string item_;
    std::vector<std::string> tags_;
};

}  // namespace marrowdale::host
