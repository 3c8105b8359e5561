#pragma once

#include "platform/foundation/Error.h"

namespace marrowdale {

// Codes of ErrorDomain::provider: this provider's own kinds of failure.
enum class ProviderErrorCode : int {
    invalidItemIdentifier = 1,  // subject: the identifier
    invalidItemURL = 2,         // subject: the URL
    itemNotFound = 3,           // subject: the URL
    unableToGetDeviceUUID = 4,  // subject: the path whose volume was asked for
};

[[nodiscard]] inline Error errorWithProviderCode(ProviderErrorCode code, std::string_view subject) {
    return {ErrorDomain::provider, static_cast<int>(code), {}, std::string(subject)};
}

}  // namespace marrowdale
