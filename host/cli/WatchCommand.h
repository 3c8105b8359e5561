#pragma once

#include <string>
#include <vector>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `watch [ITEM…]`: a line for every container that is to be read again, until it is interrupted.
// Where no service runs it is the service itself for that time.
class WatchCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "watch"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Say which containers are to be read again, as things change";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::vector<std::string> items_;
};

}  // namespace marrowdale::host
