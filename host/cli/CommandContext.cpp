#include "host/cli/CommandContext.h"

#include <sys/stat.h>
#include <unistd.h>

#include "host/daemon/ExtensionModule.h"
#include "host/daemon/IconProgram.h"
#include "host/daemon/JournalSink.h"
#include "host/daemon/StandardErrorSink.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

// Whether standard error is the journal's stream, which systemd tells with device and inode number.
bool standardErrorIsTheJournal(const Environment& environment) {
    const auto stream = environment.variable("JOURNAL_STREAM");
    struct stat status{};
    return stream && ::fstat(STDERR_FILENO, &status) == 0 &&
           *stream == std::to_string(status.st_dev) + ":" + std::to_string(status.st_ino);
}

std::shared_ptr<LogSink> logSink(const Environment& environment, const GlobalOptions& options) {
    if (options.json && !options.verbose) {
        return nullptr;
    }
    if (standardErrorIsTheJournal(environment)) {
        if (auto journal = JournalSink::connect()) {
            return journal;
        }
    }
    return std::make_shared<StandardErrorSink>();
}

}  // namespace

CommandContext::CommandContext(const Environment& environment, const GlobalOptions& options,
                               Output& output)
    : environment_(environment),
      options_(options),
      output_(output),
      isOnTerminal_(!options.json && ::isatty(STDOUT_FILENO) == 1) {}

// Only paths are looked up, so a path is what is missing.
Failure CommandContext::lookUpFailure(const Error& error) {
    return error == errorForNonExistentItem({}) ? Failure::nothingAt(error.subject)
                                                : Failure::provider(error);
}

ItemTable::Colour CommandContext::colour() const {
    const bool isWanted = isOnTerminal_ && !environment_.variable("NO_COLOR") &&
                          environment_.variable("TERM").value_or("dumb") != "dumb";
    return isWanted ? ItemTable::Colour::terminal : ItemTable::Colour::none;
}

Started<std::string> CommandContext::rootPath() const {
    return rootPathFor(options_.places, environment_);
}

Started<std::string> CommandContext::stateFolder() const {
    return stateFolderFor(options_.places, environment_);
}

Started<std::optional<std::string>> CommandContext::namedRootPath() const {
    if (!options_.places.root && !environment_.variable("MARROWDALE_ROOT")) {
        return std::nullopt;
    }
    return rootPath();
}

std::expected<WorldOptions, Failure> CommandContext::worldOptions() const {
    auto places = settingsFor(options_.places, environment_);
    if (!places) {
        return std::unexpected(Failure::start(places.error()));
    }
    WorldOptions options{.settings = std::move(*places),
                         .logSink = logSink(environment_, options_),
                         .logThreshold = options_.verbose ? LogLevel::debug : LogLevel::error,
                         .modulePath = ExtensionModule::standardPath(),
                         .iconProgramPath = iconProgramPath(),
                         .variable = [environment = environment_](std::string_view name) {
                             return environment.variable(name);
                         }};
    // Programs that read errors as JSON are told nothing else.
    if (!options_.json || ::isatty(STDERR_FILENO) == 1) {
        options.tellWaiting = [](const std::string& line) {
            StandardErrorSink().write(LogLevel::info, "marrowdale: " + line);
        };
    }
    return options;
}

HostRequests* CommandContext::knownRequests() const {
    if (service_) {
        return &service_->requests();
    }
    if (world_) {
        return &world_->requests();
    }
    return remote_.get();
}

bool CommandContext::connectTo(const std::string& state) {
    auto remote = RemoteRequests::connect(state);
    if (remote) {
        remote_ = std::move(*remote);
    }
    return remote.has_value();
}

template <typename Open>
std::expected<HostRequests*, Failure> CommandContext::requestsOr(const Open& open) {
    if (HostRequests* const known = knownRequests()) {
        return known;
    }
    const auto state = stateFolder();
    if (!state) {
        return std::unexpected(Failure::start(state.error()));
    }
    if (connectTo(*state)) {
        return remote_.get();
    }
    auto options = worldOptions();
    if (!options) {
        return std::unexpected(options.error());
    }
    // The process that has the state folder may be a service that has just been started.
    options->isServed = [this, &state] { return connectTo(*state); };
    const auto opened = open(std::move(*options));
    if (remote_) {
        return remote_.get();
    }
    if (!opened) {
        return std::unexpected(Failure::start(opened.error()));
    }
    return knownRequests();
}

std::expected<HostRequests*, Failure> CommandContext::requests() {
    return requestsOr([this](const WorldOptions& options) -> Started<void> {
        auto world = World::open(options);
        if (!world) {
            return std::unexpected(std::move(world.error()));
        }
        world_ = std::move(*world);
        return {};
    });
}

std::expected<HostRequests*, Failure> CommandContext::liveRequests() {
    return requestsOr([this](WorldOptions options) -> Started<void> {
        auto service = HostService::start(std::move(options));
        if (!service) {
            return std::unexpected(std::move(service.error()));
        }
        service_ = std::move(*service);
        return {};
    });
}

std::expected<std::unique_ptr<HostService>, Failure> CommandContext::prepareService() const {
    auto options = worldOptions();
    if (!options) {
        return std::unexpected(options.error());
    }
    const std::string state = options->settings.stateFolder;
    // A one-shot ends some time, however much it has to copy.
    options->lockWait = std::chrono::hours(24 * 365);
    std::unique_ptr<RemoteRequests> running;
    options->isServed = [&] {
        if (auto remote = RemoteRequests::connect(state)) {
            running = std::move(*remote);
        }
        return running != nullptr;
    };
    if (!options->isServed()) {
        auto service = HostService::prepare(std::move(*options));
        if (service) {
            return std::move(*service);
        }
        if (!running) {
            return std::unexpected(Failure::start(service.error()));
        }
    }
    return std::unexpected(Failure::start(StartFailure::refusal(
        running->serviceProcess() + " serves the state folder " + state + " already")));
}

std::expected<RemoteRequests*, Failure> CommandContext::runningService() {
    const auto state = stateFolder();
    if (!state) {
        return std::unexpected(Failure::start(state.error()));
    }
    return remote_ || connectTo(*state) ? remote_.get() : nullptr;
}

template <typename LookUp>
std::expected<ResolvedItem, Failure> CommandContext::resolveWith(const LookUp& lookUp) {
    const auto opened = requests();
    if (!opened) {
        return std::unexpected(opened.error());
    }
    auto identifier = lookUp(**opened);
    if (!identifier) {
        return std::unexpected(lookUpFailure(identifier.error()));
    }
    return ResolvedItem{**opened, std::move(*identifier)};
}

std::expected<ResolvedItem, Failure> CommandContext::resolve(const ItemArgument& item) {
    return resolveWith(
        [&](ItemRequests& requests) { return item.identifier(requests, environment_); });
}

std::expected<ResolvedItem, Failure> CommandContext::resolvePath(std::string_view path) {
    return resolveWith(
        [&](ItemRequests& requests) { return identifierOfPath(path, requests, environment_); });
}

}  // namespace marrowdale::host
