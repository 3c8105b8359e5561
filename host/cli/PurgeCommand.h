#pragma once

#include <string>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `purge --older-than DATE`.
class PurgeCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "purge"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Remove what was trashed before a date";
    }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string date_;
};

}  // namespace marrowdale::host
