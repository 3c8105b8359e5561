#pragma once

#include <string>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `page ITEM [--page TOKEN|date|name]`: one request for one page, made with a fresh enumerator.
class PageCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "page"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Show one page of a folder, and the token of the next";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::string item_;
    std::string page_ = "name";
};

}  // namespace marrowdale::host
