#pragma once

#include "host/cli/Command.h"

namespace marrowdale::host {

// `refresh`: looks at the applications of the system again; prints nothing.
class RefreshCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "refresh"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Look now for applications that came or went";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;
};

}  // namespace marrowdale::host
