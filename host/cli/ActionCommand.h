#pragma once

#include <expected>

#include "host/cli/Command.h"
#include "host/cli/CommandContext.h"
#include "host/requests/ItemAction.h"

namespace marrowdale::host {

// A command that has one action done and prints the item that comes of it. What takes long shows
// how far it is on a terminal; an interrupt cancels it, and leaves no trace of what was not done.
class ActionCommand : public Command {
  public:
    [[nodiscard]] Outcome run(CommandContext& context) final;

  protected:
    // What the command line asks for; fails for one that can't be meant.
    [[nodiscard]] virtual std::expected<ItemAction, Failure> action(CommandContext& context) = 0;

    // The identifier of an item of the command line.
    [[nodiscard]] static std::expected<std::string, Failure> identifier(CommandContext& context,
                                                                        const std::string& item);
    // A name as it is on disk: bytes that are no UTF-8 may be typed as machine output shows them.
    [[nodiscard]] static std::string nameOnDisk(const std::string& name);
};

}  // namespace marrowdale::host
