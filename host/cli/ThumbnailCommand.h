#pragma once

#include <string>
#include <vector>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `thumbnail ITEM… [--out DIR]`: writes the pictures of items, where they have one.
class ThumbnailCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "thumbnail"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Write the icons of applications as PNG files";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::vector<std::string> items_;
    std::string folder_ = ".";
};

}  // namespace marrowdale::host
