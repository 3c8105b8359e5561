#include "host/cli/CommandLine.h"

#include <algorithm>
#include <iterator>
#include <unistd.h>

#include "host/cli/AnchorCommand.h"
#include "host/cli/AppCommand.h"
#include "host/cli/AppsCommand.h"
#include "host/cli/BrowseCommand.h"
#include "host/cli/ChangesCommand.h"
#include "host/cli/DeleteCommand.h"
#include "host/cli/DoctorCommand.h"
#include "host/cli/FavoriteCommand.h"
#include "host/cli/HelpFormatter.h"
#include "host/cli/IdCommand.h"
#include "host/cli/ImportCommand.h"
#include "host/cli/InfoCommand.h"
#include "host/cli/LsCommand.h"
#include "host/cli/MkdirCommand.h"
#include "host/cli/MoveCommand.h"
#include "host/cli/PageCommand.h"
#include "host/cli/PathCommand.h"
#include "host/cli/PurgeCommand.h"
#include "host/cli/RefreshCommand.h"
#include "host/cli/RenameCommand.h"
#include "host/cli/SearchCommand.h"
#include "host/cli/ServeCommand.h"
#include "host/cli/TagCommand.h"
#include "host/cli/ThumbnailCommand.h"
#include "host/cli/TrashCommand.h"
#include "host/cli/UntrashCommand.h"
#include "host/cli/UsedCommand.h"
#include "host/cli/WatchCommand.h"

namespace marrowdale::host {

namespace {

constexpr const char* description =
    "Serves your documents with identifiers that last, in pages, to people and programs.";

constexpr const char* footer =
    R"(ITEM is a path that begins with "/", "./" or "../", one of the words root, working-set and
all-directories, or an identifier such as did=12.

Exit codes: 0 done, 1 the provider answered an error, 2 the command line is wrong,
3 the provider could not start.)";

std::vector<std::unique_ptr<Command>> allCommands() {
    std::vector<std::unique_ptr<Command>> commands;
    commands.push_back(std::make_unique<LsCommand>());
    commands.push_back(std::make_unique<InfoCommand>());
    commands.push_back(std::make_unique<IdCommand>());
    commands.push_back(std::make_unique<PathCommand>());
    commands.push_back(std::make_unique<PageCommand>());
    commands.push_back(std::make_unique<SearchCommand>());
    commands.push_back(std::make_unique<AnchorCommand>());
    commands.push_back(std::make_unique<ChangesCommand>());
    commands.push_back(std::make_unique<WatchCommand>());
    commands.push_back(std::make_unique<ImportCommand>());
    commands.push_back(std::make_unique<MkdirCommand>());
    commands.push_back(std::make_unique<RenameCommand>());
    commands.push_back(std::make_unique<MoveCommand>());
    commands.push_back(std::make_unique<TrashCommand>());
    commands.push_back(std::make_unique<UntrashCommand>());
    commands.push_back(std::make_unique<DeleteCommand>());
    commands.push_back(std::make_unique<TagCommand>());
    commands.push_back(std::make_unique<FavoriteCommand>());
    commands.push_back(std::make_unique<UsedCommand>());
    commands.push_back(std::make_unique<PurgeCommand>());
    commands.push_back(std::make_unique<AppsCommand>());
    commands.push_back(std::make_unique<AppCommand>());
    commands.push_back(std::make_unique<RefreshCommand>());
    commands.push_back(std::make_unique<ThumbnailCommand>());
    commands.push_back(std::make_unique<ServeCommand>());
    commands.push_back(std::make_unique<BrowseCommand>());
    commands.push_back(std::make_unique<DoctorCommand>());
    return commands;
}

void declareGlobalOptions(CLI::App& program, GlobalOptions& options) {
    program
        .add_option("--root", options.places.root,
                    "The folder to serve (default: $MARROWDALE_ROOT, else ~/Documents)")
        ->type_name("DIR")
        ->take_last();
    program
        .add_option("--state", options.places.state,
                    "Where identifiers are kept (default: $MARROWDALE_STATE, else\n"
                    "$XDG_STATE_HOME/marrowdale, else ~/.local/state/marrowdale)")
        ->type_name("DIR")
        ->take_last();
    program.add_flag("--json", options.json,
                     "One JSON value a line; an error is one JSON object on standard error");
    program.add_flag("--verbose", options.verbose,
                     "Log lines, down to debug level, on standard error");
    program.set_version_flag("--version", "marrowdale " MARROWDALE_VERSION,
                             "Print the version and end");
    program.set_help_flag("-h,--help", "Print this and end");
}

void declareCommands(CLI::App& program, const std::vector<std::unique_ptr<Command>>& commands) {
    for (const auto& command : commands) {
        CLI::App* const arguments =
            program.add_subcommand(std::string(command->name()), std::string(command->summary()));
        arguments->group("Commands");
        // The program's options are taken after the command, too.
        arguments->fallthrough();
        command->declareArguments(*arguments);
    }
}

// Whether errors are to be told as JSON, for a command line that could not be read to its end.
bool asksForJson(std::span<const char* const> arguments) {
    const auto end = std::ranges::find(arguments, std::string_view("--"));
    return std::find(arguments.begin(), end, std::string_view("--json")) != end;
}

std::optional<Failure> emptyPlace(const SettingsOptions& places) {
    for (const auto& [option, place] :
         {std::pair("--root", &places.root), std::pair("--state", &places.state)}) {
        if (*place && (*place)->empty()) {
            return Failure::commandLine(std::string(option) + " wants a folder");
        }
    }
    return std::nullopt;
}

std::string unexpected(const std::string& argument, bool hasCommand) {
    if (argument == "--" && !hasCommand) {
        return "the command comes before \"--\"";
    }
    if (argument.starts_with('-')) {
        return "no such option: " + argument;
    }
    return (hasCommand ? "one argument too many: " : "no such command: ") + argument;
}

// What is wrong, for people.
std::string complaint(const CLI::App& program, const CLI::ParseError& error) {
    const bool hasCommand = !program.get_subcommands().empty();
    const std::vector<std::string> unknown = program.remaining(true);
    std::string text = error.what();
    if (dynamic_cast<const CLI::ArgumentMismatch*>(&error) != nullptr) {
        // It begins with the option's name and a colon.
        text = text.substr(0, text.find(':')) + " wants a value";
    } else if (!unknown.empty()) {
        text = unexpected(unknown.front(), hasCommand);
    } else if (!hasCommand) {
        text = "which command?";
    }
    return text + " (see marrowdale --help)";
}

void tell(const Failure& failure, bool asJson) {
    const std::string text = (asJson ? failure.json() : failure.line()) + "\n";
    // Nobody is left to be told when this fails.
    [[maybe_unused]] const ssize_t written = ::write(STDERR_FILENO, text.data(), text.size());
}

}  // namespace

CommandLine::CommandLine(const Environment& environment, Output& output)
    : environment_(environment), output_(output), commands_(allCommands()) {}

ExitCode CommandLine::run(std::span<const char* const> arguments) {
    const Outcome outcome = finish(parseAndRun(arguments));
    if (!outcome) {
        tell(outcome.error(), options_.json || asksForJson(arguments));
        return outcome.error().exitCode;
    }
    return ExitCode::done;
}

Outcome CommandLine::parseAndRun(std::span<const char* const> arguments) {
    CLI::App program(description, "marrowdale");
    program.footer(footer);
    program.require_subcommand(1);
    program.formatter(std::make_shared<HelpFormatter>());
    declareGlobalOptions(program, options_);
    declareCommands(program, commands_);
    std::vector<std::string> reversed(arguments.rbegin(), arguments.rend());
    try {
        program.parse(std::move(reversed));
    } catch (const CLI::CallForHelp&) {
        const auto chosen = program.get_subcommands();
        output_.write(chosen.empty() ? program.help() : chosen.front()->help("marrowdale"));
        return {};
    } catch (const CLI::CallForVersion& version) {
        output_.writeLine(version.what());
        return {};
    } catch (const CLI::ParseError& error) {
        return std::unexpected(Failure::commandLine(complaint(program, error)));
    }
    if (auto failure = emptyPlace(options_.places)) {
        return std::unexpected(std::move(*failure));
    }
    const std::string name = program.get_subcommands().front()->get_name();
    const auto chosen = std::ranges::find(commands_, name, &Command::name);
    CommandContext context(environment_, options_, output_);
    return (*chosen)->run(context);
}

Outcome CommandLine::finish(Outcome outcome) {
    output_.flush();
    if (outcome && output_.error() != 0) {
        return std::unexpected(Failure::output(output_.error()));
    }
    return outcome;
}

}  // namespace marrowdale::host
