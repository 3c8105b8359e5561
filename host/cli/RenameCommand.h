#pragma once

#include <string>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `rename ITEM NAME`.
class RenameCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "rename"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Rename an item in its place";
    }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string item_;
    std::string name_;
};

}  // namespace marrowdale::host
