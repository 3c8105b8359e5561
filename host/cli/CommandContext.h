#pragma once

#include <memory>

#include "host/cli/Failure.h"
#include "host/cli/ItemArgument.h"
#include "host/cli/ItemTable.h"
#include "host/cli/Output.h"
#include "host/daemon/Environment.h"
#include "host/daemon/Settings.h"
#include "host/daemon/World.h"

namespace marrowdale::host {

// What the options before a command say.
struct GlobalOptions {
    SettingsOptions places;
    bool json = false;
    bool verbose = false;
};

// An item's identifier, and where to ask about it.
struct ResolvedItem {
    const ItemRequests& requests;
    std::string identifier;
};

// What a command works with. The world is made when a command first asks for it, so that a wrong
// command line is refused before anything is opened. One thread.
class CommandContext {
  public:
    CommandContext(const Environment& environment, const GlobalOptions& options, Output& output);

    [[nodiscard]] const Environment& environment() const { return environment_; }
    [[nodiscard]] Output& output() const { return output_; }
    [[nodiscard]] bool json() const { return options_.json; }
    // Whether people read standard output on a terminal.
    [[nodiscard]] bool isOnTerminal() const { return isOnTerminal_; }
    // Colour for people on a terminal that knows it, unless NO_COLOR forbids it.
    [[nodiscard]] ItemTable::Colour colour() const;

    [[nodiscard]] Started<std::string> rootPath() const;
    [[nodiscard]] Started<std::string> stateFolder() const;
    // The same one each time; good as long as the context.
    [[nodiscard]] std::expected<World*, Failure> world();

    // Looks an item of the command line up, in the world that is opened for it if need be.
    [[nodiscard]] std::expected<ResolvedItem, Failure> resolve(const ItemArgument& item);
    [[nodiscard]] std::expected<ResolvedItem, Failure> resolvePath(std::string_view path);

  private:
    template <typename LookUp>
    std::expected<ResolvedItem, Failure> resolveWith(const LookUp& lookUp);

    const Environment& environment_;
    const GlobalOptions& options_;
    Output& output_;
    bool isOnTerminal_;
    std::unique_ptr<World> world_;
};

}  // namespace marrowdale::host
