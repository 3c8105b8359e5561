#include "host/cli/CommandContext.h"

#include <sys/stat.h>
#include <unistd.h>

#include "host/daemon/ExtensionModule.h"
#include "host/daemon/JournalSink.h"
#include "host/daemon/StandardErrorSink.h"

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

std::expected<World*, Failure> CommandContext::world() {
    if (world_) {
        return world_.get();
    }
    auto places = settingsFor(options_.places, environment_);
    if (!places) {
        return std::unexpected(Failure::start(places.error()));
    }
    WorldOptions options{.settings = std::move(*places),
                         .logSink = logSink(environment_, options_),
                         .logThreshold = options_.verbose ? LogLevel::debug : LogLevel::error,
                         .modulePath = ExtensionModule::standardPath()};
    // Programs that read errors as JSON are told nothing else.
    if (!options_.json || ::isatty(STDERR_FILENO) == 1) {
        options.tellWaiting = [](const std::string& line) {
            StandardErrorSink().write(LogLevel::info, "marrowdale: " + line);
        };
    }
    auto opened = World::open(options);
    if (!opened) {
        return std::unexpected(Failure::start(opened.error()));
    }
    world_ = std::move(*opened);
    return world_.get();
}

template <typename LookUp>
std::expected<ResolvedItem, Failure> CommandContext::resolveWith(const LookUp& lookUp) {
    const auto opened = world();
    if (!opened) {
        return std::unexpected(opened.error());
    }
    const ItemRequests& requests = (*opened)->requests();
    auto identifier = lookUp(requests, PathContext{environment_, (*opened)->settings().rootPath});
    if (!identifier) {
        // Only paths are looked up, so a path is what is missing.
        return std::unexpected(Failure::nothingAt(identifier.error().subject));
    }
    return ResolvedItem{requests, std::move(*identifier)};
}

std::expected<ResolvedItem, Failure> CommandContext::resolve(const ItemArgument& item) {
    return resolveWith([&](const ItemRequests& requests, const PathContext& paths) {
        return item.identifier(requests, paths);
    });
}

std::expected<ResolvedItem, Failure> CommandContext::resolvePath(std::string_view path) {
    return resolveWith([&](const ItemRequests& requests, const PathContext& paths) {
        return identifierOfPath(path, requests, paths);
    });
}

}  // namespace marrowdale::host
