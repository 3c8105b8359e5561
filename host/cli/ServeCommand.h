#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "host/browser/BrowserService.h"
#include "host/cli/Command.h"
#include "host/daemon/TrashKeeper.h"

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
    // Null where none is wanted.
    using Browser = std::unique_ptr<BrowserService>;
    [[nodiscard]] std::expected<Browser, Failure> startBrowser(HostService& service) const;
    [[nodiscard]] std::unique_ptr<TrashKeeper> startTrashKeeper(HostService& service) const;
    static void tellThatItIsReady(const CommandContext& context, const HostService& service,
                                  BrowserService* browser);

    std::optional<std::uint16_t> port_;
    bool withoutBrowser_ = false;
    std::string keptTrash_;  // days, or "forever"
};

}  // namespace marrowdale::host
