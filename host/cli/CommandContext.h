#pragma once

#include <memory>

#include "host/cli/Failure.h"
#include "host/cli/ItemArgument.h"
#include "host/cli/ItemTable.h"
#include "host/cli/Output.h"
#include "host/client/RemoteRequests.h"
#include "host/daemon/Environment.h"
#include "host/daemon/HostService.h"
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
    HostRequests& requests;
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
    // The root, where the command line or the environment names one.
    [[nodiscard]] Started<std::optional<std::string>> namedRootPath() const;
    // Requests to the service that has the state folder or, where none runs, to a provider that is
    // started in this process. The same ones each time; good as long as the context.
    [[nodiscard]] std::expected<HostRequests*, Failure> requests();
    // The same for somebody who stays: the provider in this process then records what happens and
    // is the service of others.
    [[nodiscard]] std::expected<HostRequests*, Failure> liveRequests();
    // A service in this process, which answers nobody until it listens. Refused where one runs.
    [[nodiscard]] std::expected<std::unique_ptr<HostService>, Failure> prepareService() const;
    // The service that has the state folder; null where none runs. Good as long as the context.
    [[nodiscard]] std::expected<RemoteRequests*, Failure> runningService();

    // Looks an item of the command line up, by the requests above.
    [[nodiscard]] std::expected<ResolvedItem, Failure> resolve(const ItemArgument& item);
    [[nodiscard]] std::expected<ResolvedItem, Failure> resolvePath(std::string_view path);

    // Why an item that was named can't be found.
    [[nodiscard]] static Failure lookUpFailure(const Error& error);

  private:
    [[nodiscard]] std::expected<WorldOptions, Failure> worldOptions() const;
    // Whether a service answers; then requests go to it.
    [[nodiscard]] bool connectTo(const std::string& state);
    template <typename LookUp>
    std::expected<ResolvedItem, Failure> resolveWith(const LookUp& lookUp);

    const Environment& environment_;
    const GlobalOptions& options_;
    Output& output_;
    bool isOnTerminal_;
    // The requests that there are already; null before the first.
    [[nodiscard]] HostRequests* knownRequests() const;
    // Those of a running service, else what `open` answers, which is given options that let it end
    // when a service appears.
    template <typename Open>
    std::expected<HostRequests*, Failure> requestsOr(const Open& open);

    std::unique_ptr<RemoteRequests> remote_;
    std::unique_ptr<World> world_;
    std::unique_ptr<HostService> service_;
};

}  // namespace marrowdale::host
