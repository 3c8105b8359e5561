#pragma once

#include <string>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `app BUNDLE_IDENTIFIER`: where one application keeps its documents.
class AppCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "app"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Show the document folder of one application";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::string bundleIdentifier_;
};

}  // namespace marrowdale::host
