#pragma once

#include <string>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `browse`: shows the documents in the person's web browser. A service that runs is asked for an
// address; where none runs, this process serves until it is interrupted. The address is printed in
// any case.
class BrowseCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "browse"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Show documents in a web browser, and serve them where nothing does yet";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    [[nodiscard]] Outcome showThatOf(RemoteRequests& service, const CommandContext& context) const;
    [[nodiscard]] Outcome serve(const CommandContext& context) const;
    void show(const CommandContext& context, const std::string& address) const;

    bool printsOnly_ = false;
};

}  // namespace marrowdale::host
