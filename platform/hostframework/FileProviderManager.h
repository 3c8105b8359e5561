#pragma once

#include <functional>
#include <optional>
#include <string_view>

#include "platform/foundation/Error.h"
#include "platform/foundation/URL.h"

namespace marrowdale {

// The host's side that a provider may call. Any thread.
class FileProviderManager {
  public:
    virtual ~FileProviderManager() = default;

    // The provider's storage root: an absolute path without links, fixed for the process.
    [[nodiscard]] virtual const URL& documentStorageURL() const = 0;

    // Asks the host to read a container again. Returns at once; the handler, which may be empty, is
    // called once, with an error if the host could not take it.
    virtual void signalEnumeratorForContainerItemIdentifier(
        std::string_view containerItemIdentifier,
        std::function<void(const std::optional<Error>&)> completionHandler) = 0;
};

}  // namespace marrowdale
