#pragma once

#include <optional>
#include <string>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `untrash ITEM [--to ITEM]`.
class UntrashCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "untrash"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Put a trashed item back where it was, or elsewhere";
    }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string item_;
    std::optional<std::string> to_;
};

}  // namespace marrowdale::host
