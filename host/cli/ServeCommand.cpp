#include "host/cli/ServeCommand.h"

#include <charconv>

#include <CLI/App.hpp>

#include "host/daemon/ServiceNotification.h"
#include "host/daemon/StopSignals.h"
#include "host/requests/HarmlessText.h"
#include "host/requests/JsonWriter.h"

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
    arguments
        .add_option("--keep-trash", keptTrash_,
                    "How long what was trashed is kept (default: 30 days)")
        ->type_name("DAYS|forever");
}

Outcome ServeCommand::run(CommandContext& context) {
    if (keptTrash_ != forever && !daysIn(keptTrash_)) {
        return std::unexpected(
            Failure::commandLine("--keep-trash wants a number of days, or forever"));
    }
    StopSignals signals;
    auto service = context.startService();
    if (!service) {
        return std::unexpected(service.error());
    }
    const auto browser = startBrowser(**service);
    if (!browser) {
        return std::unexpected(browser.error());
    }
    const auto trashKeeper = startTrashKeeper(**service);
    signals.begin();
    tellThatItIsReady(context, **service, browser->get());
    notifyServiceManager(context.environment(), "READY=1");
    signals.wait();
    notifyServiceManager(context.environment(), "STOPPING=1");
    return {};
}

std::expected<ServeCommand::Browser, Failure> ServeCommand::startBrowser(
    HostService& service) const {
    if (withoutBrowser_) {
        return nullptr;
    }
    auto browser = BrowserService::start(service, port_);
    if (!browser) {
        return std::unexpected(Failure::start(StartFailure::from(std::move(browser.error()))));
    }
    return std::move(*browser);
}

std::unique_ptr<TrashKeeper> ServeCommand::startTrashKeeper(HostService& service) const {
    if (keptTrash_ == forever) {
        return nullptr;
    }
    TrashKeeper::Options options;
    options.age = std::chrono::days(daysIn(keptTrash_).value_or(0));
    options.failed = [&service](const Error& error) {
        service.log().error("can't remove what was trashed long ago; " + error.description());
    };
    return std::make_unique<TrashKeeper>(service.requests(), std::move(options));
}

void ServeCommand::tellThatItIsReady(const CommandContext& context, const HostService& service,
                                     BrowserService* browser) {
    const std::string& root = service.settings().rootPath;
    if (context.json()) {
        JsonWriter writer;
        writer.beginObject().key("serving").string(root);
        if (browser != nullptr) {
            writer.key("browser").string(browser->newAddress());
        }
        writer.endObject();
        context.output().writeLine(writer.take());
    } else {
        context.output().writeLine("serving " + harmlessName(root));
        if (browser != nullptr) {
            context.output().writeLine("open " + browser->newAddress());
        }
    }
    context.output().flush();
}

}  // namespace marrowdale::host
