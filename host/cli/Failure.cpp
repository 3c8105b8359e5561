#include "host/cli/Failure.h"

#include "host/requests/ErrorDescription.h"
#include "host/requests/FeedJson.h"
#include "host/requests/HarmlessText.h"
#include "host/requests/ItemJson.h"
#include "host/requests/JsonWriter.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

constexpr std::string_view hostErrorDomain = "MarrowdaleHostErrorDomain";

// A copy of our own: a failure is told after the extension's module, which made the item, has gone.
FileProviderItemPtr lastingCopy(const FileProviderItemPtr& item) {
    auto copy = item ? itemFromJson(itemJson(*item)) : Expected<FileProviderItemPtr>(nullptr);
    return copy ? std::move(*copy) : nullptr;
}

}  // namespace

Failure Failure::provider(const Error& error) {
    ErrorDescription description = described(error);
    return {.exitCode = ExitCode::providerError,
            .domain = std::move(description.domain),
            .code = description.code,
            .name = std::move(description.name),
            .message = std::move(description.message),
            .details = std::move(description.details),
            .item = lastingCopy(description.item)};
}

Failure Failure::nothingAt(std::string_view path) {
    Failure failure = provider(errorForNonExistentItem(path));
    failure.message = "nothing is served at " + std::string(path);
    failure.details = {{"itemIdentifier", std::string(path)}, {"path", std::string(path)}};
    return failure;
}

Failure Failure::commandLine(std::string message) {
    return {.exitCode = ExitCode::wrongCommandLine,
            .domain = std::string(hostErrorDomain),
            .code = static_cast<int>(ExitCode::wrongCommandLine),
            .name = "other",
            .message = std::move(message),
            .details = {}};
}

Failure Failure::start(const StartFailure& failure) {
    const bool isRefusal = failure.error.code == 0;
    return {.exitCode = ExitCode::couldNotStart,
            .domain =
                isRefusal ? std::string(hostErrorDomain) : std::string(failure.error.domainName()),
            .code = isRefusal ? static_cast<int>(ExitCode::couldNotStart) : failure.error.code,
            .name = isRefusal || failure.error.domain != ErrorDomain::posix ? "other" : "posix",
            .message = failure.message,
            .details = {}};
}

Failure Failure::output(int code) {
    Failure failure = provider(errorWithPOSIXCode(code));
    failure.message = "can't write to standard output: " + failure.message;
    return failure;
}

std::string Failure::json() const {
    JsonWriter writer;
    writer.beginObject().key("error").beginObject();
    writer.key("domain").string(domain).key("code").number(std::int64_t{code});
    writer.key("name").string(name).key("message").string(message);
    for (const auto& [key, value] : details) {
        writer.key(key).string(value);
    }
    if (item) {
        writer.key("item");
        appendItem(writer, *item);
    }
    writer.endObject().endObject();
    return writer.take();
}

std::string Failure::line() const {
    return "marrowdale: " + harmlessLine(message);
}

}  // namespace marrowdale::host
