#include "host/cli/Failure.h"

#include "host/cli/JsonWriter.h"
#include "host/daemon/HarmlessText.h"
#include "host/daemon/ItemRequests.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/ProviderError.h"

namespace marrowdale::host {

namespace {

constexpr std::string_view hostErrorDomain = "MarrowdaleHostErrorDomain";

// Somebody who names a file without a folder meant a path.
std::string_view hint(std::string_view item) {
    const bool isOfAKnownForm = item.empty() || item.starts_with('/') || item.starts_with("./") ||
                                item.starts_with("../") || item.starts_with('#') ||
                                item.starts_with("did=") || item.starts_with("fid=");
    return isOfAKnownForm ? "" : " (a path begins with \"/\", \"./\" or \"../\")";
}

void describeFileProviderError(const Error& error, Failure& failure) {
    switch (static_cast<FileProviderErrorCode>(error.code)) {
        case FileProviderErrorCode::noSuchItem:
            failure.name = "noSuchItem";
            failure.message = "no such item: " + error.subject;
            failure.message += hint(error.subject);
            failure.details.emplace_back("itemIdentifier", error.subject);
            return;
        case FileProviderErrorCode::syncAnchorExpired:
            failure.name = "syncAnchorExpired";
            failure.message = "the page or anchor has expired; start again without it";
            return;
        case FileProviderErrorCode::filenameCollision:
            failure.name = "filenameCollision";
            failure.message = "an item of that name exists: " + error.subject;
            return;
        case FileProviderErrorCode::invalidParameter:
            failure.name = "invalidParameter";
            failure.message = error.operation == listedItemParameter
                                  ? "not a folder: " + error.subject
                                  : "not a valid " + error.operation + ": " + error.subject;
            failure.details.emplace_back("parameter", error.operation);
            failure.details.emplace_back("value", error.subject);
            return;
    }
}

void describeProviderError(const Error& error, Failure& failure) {
    switch (static_cast<ProviderErrorCode>(error.code)) {
        case ProviderErrorCode::unableToGetDeviceUUID:
            failure.name = "unableToGetDeviceUUID";
            failure.message = "no history is kept for the volume of " + error.subject;
            return;
        case ProviderErrorCode::invalidItemIdentifier:
            failure.message = "not an item identifier: " + error.subject;
            return;
        case ProviderErrorCode::invalidItemURL:
            failure.message = "not an item's place: " + error.subject;
            return;
        case ProviderErrorCode::itemNotFound:
            failure.message = "no item there: " + error.subject;
            return;
    }
}

bool isMissingPermission(const Error& error) {
    return error.domain == ErrorDomain::file &&
           error.code == static_cast<int>(FileErrorCode::writeNoPermission);
}

}  // namespace

Failure Failure::provider(const Error& error) {
    Failure failure{.exitCode = ExitCode::providerError,
                    .domain = std::string(error.domainName()),
                    .code = error.code,
                    .name = "other",
                    .message = error.description(),
                    .details = {}};
    if (error.domain == ErrorDomain::fileProvider) {
        describeFileProviderError(error, failure);
    } else if (error.domain == ErrorDomain::posix) {
        failure.name = "posix";
    } else if (error.domain == ErrorDomain::provider) {
        describeProviderError(error, failure);
    } else if (isMissingPermission(error)) {
        failure.name = "writeNoPermission";
    }
    return failure;
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
    writer.endObject().endObject();
    return writer.take();
}

std::string Failure::line() const {
    return "marrowdale: " + harmlessLine(message);
}

}  // namespace marrowdale::host
