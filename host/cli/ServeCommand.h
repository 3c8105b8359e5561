#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "host/cli/Command.h"

namespace marrowdale::host {

// `serve`: the provider with its recorder, for other programs and, in the document browser, for
// people, until it is told to end.
class ServeCommand final : public Command {
  public:
    [[nodiscard]] std::string_view name() const override { return "serve"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Serve documents to other programs, and the document browser, until interrupted";
    }
    void declareArguments(CLI::App& arguments) override;
    [[nodiscard]] Outcome run(CommandContext& context) override;

  private:
    std::optional<std::uint16_t> port_;
    bool withoutBrowser_ = false;
    bool withoutAddress_ = false;
    std::string keptTrash_;  // days, or "forever"
};

}  // namespace marrowdale::host
