#pragma once

#include "host/cli/Command.h"

namespace marrowdale::host {

// `serve`: the provider with its recorder, for other programs, until it is told to end.
class ServeCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "serve"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Serve documents to other programs until interrupted";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;
};

}  // namespace marrowdale::host
