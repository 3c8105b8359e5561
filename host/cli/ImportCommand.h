#pragma once

#include <string>

#include "host/cli/ActionCommand.h"

namespace marrowdale::host {

// `import PATH --into ITEM`.
class ImportCommand final : public ActionCommand {
  public:
    [[nodiscard]] std::string_view name() const override { return "import"; }
    [[nodiscard]] std::string_view summary() const override {
        return "Bring a copy of a document in";
    }
    void declareArguments(CLI::App& arguments) override;

  protected:
    [[nodiscard]] std::expected<ItemAction, Failure> action(CommandContext& context) override;

  private:
    std::string path_;
    std::string into_;
};

}  // namespace marrowdale::host
