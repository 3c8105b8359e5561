#pragma once

#include <string>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `anchor ITEM`: from where the changes of a container can be followed, now.
class AnchorCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "anchor"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Show the anchor from which a folder's changes can be followed";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::string item_;
};

}  // namespace marrowdale::host
