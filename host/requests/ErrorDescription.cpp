#include "host/requests/ErrorDescription.h"

#include "host/requests/HostRequests.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/ProviderError.h"

namespace marrowdale::host {

namespace {

// Somebody who names a file without a folder meant a path.
std::string_view hint(std::string_view item) {
    const bool isOfAKnownForm = item.empty() || item.starts_with('/') || item.starts_with("./") ||
                                item.starts_with("../") || item.starts_with('#') ||
                                item.starts_with("did=") || item.starts_with("fid=");
    return isOfAKnownForm ? "" : " (a path begins with \"/\", \"./\" or \"../\")";
}

void describeFileProviderError(const Error& error, ErrorDescription& description) {
    switch (static_cast<FileProviderErrorCode>(error.code)) {
        case FileProviderErrorCode::noSuchItem:
            description.name = "noSuchItem";
            description.message = "no such item: " + error.subject;
            description.message += hint(error.subject);
            description.details.emplace_back("itemIdentifier", error.subject);
            return;
        case FileProviderErrorCode::syncAnchorExpired:
            description.name = "syncAnchorExpired";
            description.message = "the page or anchor has expired; start again without it";
            return;
        case FileProviderErrorCode::filenameCollision:
            description.name = "filenameCollision";
            description.message = "an item of that name exists: " + error.subject;
            if (const auto* info = dynamic_cast<const CollidingItemInfo*>(error.userInfo.get())) {
                description.item = info->item;
            }
            return;
        case FileProviderErrorCode::invalidParameter:
            description.name = "invalidParameter";
            description.message = error.operation == listedItemParameter
                                      ? "not a folder: " + error.subject
                                      : "not a valid " + error.operation + ": " + error.subject;
            description.details.emplace_back("parameter", error.operation);
            description.details.emplace_back("value", error.subject);
            return;
    }
}

void describeProviderError(const Error& error, ErrorDescription& description) {
    switch (static_cast<ProviderErrorCode>(error.code)) {
        case ProviderErrorCode::unableToGetDeviceUUID:
            description.name = "unableToGetDeviceUUID";
            description.message = "no history is kept for the volume of " + error.subject;
            return;
        case ProviderErrorCode::invalidItemIdentifier:
            description.message = "not an item identifier: " + error.subject;
            return;
        case ProviderErrorCode::invalidItemURL:
            description.message = "not an item's place: " + error.subject;
            return;
        case ProviderErrorCode::itemNotFound:
            description.message = "no item there: " + error.subject;
            return;
    }
}

bool isMissingPermission(const Error& error) {
    return error.domain == ErrorDomain::file &&
           error.code == static_cast<int>(FileErrorCode::writeNoPermission);
}

}  // namespace

ErrorDescription described(const Error& error) {
    ErrorDescription description{.domain = std::string(error.domainName()),
                                 .code = error.code,
                                 .name = "other",
                                 .message = error.description(),
                                 .details = {}};
    if (error.domain == ErrorDomain::fileProvider) {
        describeFileProviderError(error, description);
    } else if (error.domain == ErrorDomain::posix) {
        description.name = "posix";
    } else if (error.domain == ErrorDomain::provider) {
        describeProviderError(error, description);
    } else if (isMissingPermission(error)) {
        description.name = "writeNoPermission";
    }
    return description;
}

}  // namespace marrowdale::host
