#pragma once

#include "host/cli/Command.h"

namespace marrowdale::host {

// `doctor`: what this machine offers, what that costs, and what to do about it. Where the provider
// can't be started, the findings say what can be said without it, and the command fails as any
// other would.
class DoctorCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "doctor"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Say what this machine offers, what that costs and what could be better";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;
};

}  // namespace marrowdale::host
