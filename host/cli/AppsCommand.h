#pragma once

#include "host/cli/Command.h"

namespace marrowdale::host {

// `apps`: the document libraries of applications.
class AppsCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "apps"; }
    [[nodiscard]] std::string_view summary() const override {
        return "List the applications whose documents are served";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;
};

}  // namespace marrowdale::host
