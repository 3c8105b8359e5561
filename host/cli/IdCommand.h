#pragma once

#include <string>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `id PATH`: the lasting identifier of what stands there.
class IdCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "id"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Show the identifier of the item at a path";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::string path_;
};

}  // namespace marrowdale::host
