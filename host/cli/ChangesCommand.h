#pragma once

#include <string>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `changes ITEM --since TOKEN [--all]`: one request for changes, or as many as it takes.
class ChangesCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "changes"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Show what changed in a folder since an anchor";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::string item_;
    std::string since_;
    bool all_ = false;
};

}  // namespace marrowdale::host
