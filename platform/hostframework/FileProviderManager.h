#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

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

    // Takes the items of these domains out of the host's search index. Returns at once; the
    // handler, which may be empty, is called once when it is done, on a queue of the host's that
    // waits for no provider: a provider may wait for the handler.
    virtual void deleteIndexedItemsInDomains(
        std::vector<std::string> domainIdentifiers,
        std::function<void(const std::optional<Error>&)> completionHandler) = 0;
};

}  // namespace marrowdale
