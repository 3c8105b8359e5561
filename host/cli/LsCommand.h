#pragma once

#include <string>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `ls [ITEM]`: follows every page and prints each as it comes. When a page expires on the way the
// listing starts over, without what was printed before; after five times it gives up.
class LsCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "ls"; }
    [[nodiscard]] std::string_view summary() const override {
        return "List a folder, every page of it";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::string item_ = "root";
};

}  // namespace marrowdale::host
