#include "host/cli/ServeCommand.h"

#include <charconv>

#include <CLI/App.hpp>

#include "host/browser/BrowserService.h"
#include "host/cli/Serving.h"
#include "host/daemon/TrashKeeper.h"

namespace marrowdale::host {

namespace {

constexpr const char* forever = "forever";
constexpr int mostDays = 1'000'000;

std::optional<int> daysIn(const std::string& text) {
    int days = 0;
    const char* const end = text.data() + text.size();
    const auto parsed = std::from_chars(text.data(), end, days);
    return parsed.ec == std::errc() && parsed.ptr == end && days >= 0 && days <= mostDays
               ? std::optional(days)
               : std::nullopt;
}

}  // namespace

void ServeCommand::declareArguments(CLI::App& arguments) {
    keptTrash_ = std::to_string(TrashKeeper::usualAge.count());
    arguments
        .add_option("--port", port_,
                    "Where the document browser listens on the loopback address; 0: any free\n"
                    "port (default: " +
                        std::to_string(BrowserService::usualPort) + ", or any free one)")
        ->type_name("N");
    arguments.add_flag("--no-browser", withoutBrowser_, "Serve no document browser");
    arguments.add_flag("--no-address", withoutAddress_,
                       "Print no address of the document browser: browse asks for one");
    arguments
        .add_option("--keep-trash", keptTrash_,
                    "How long what was trashed is kept (default: 30 days)")
        ->type_name("DAYS|forever");
}

Outcome ServeCommand::run(CommandContext& context) {
    Serving serving{.port = port_};
    if (withoutBrowser_ || withoutAddress_) {
        serving.browser = withoutBrowser_ ? Serving::Browser::none : Serving::Browser::quiet;
    }
    if (keptTrash_ != forever) {
        const auto days = daysIn(keptTrash_);
        if (!days) {
            return std::unexpected(
                Failure::commandLine("--keep-trash wants a number of days, or forever"));
        }
        serving.trashAge = std::chrono::days(*days);
    }
    return serving.run(context);
}

}  // namespace marrowdale::host
