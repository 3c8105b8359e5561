#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "host/daemon/SignalHub.h"
#include "platform/foundation/SerialQueue.h"
#include "platform/hostframework/FileProviderManager.h"

namespace marrowdale::host {

// The host as the extension sees it: says where the storage root is, and takes its signals. Any
// thread.
class HostManager final : public FileProviderManager {
  public:
    // `rootPath`: absolute, without links.
    explicit HostManager(const std::string& rootPath);

    [[nodiscard]] const URL& documentStorageURL() const override { return documentStorageURL_; }
    void signalEnumeratorForContainerItemIdentifier(
        std::string_view containerItemIdentifier,
        std::function<void(const std::optional<Error>&)> completionHandler) override;

    // The host's search index is its replica; see `setIndexCleaner`. Always answered, and without
    // an error.
    void deleteIndexedItemsInDomains(
        std::vector<std::string> domainIdentifiers,
        std::function<void(const std::optional<Error>&)> completionHandler) override;

    // Takes the items of domains out of the index, on a queue of its own; null (as at first) for
    // nobody, who is not called any more when this returns. Must not wait for an extension.
    using IndexCleaner = std::function<void(std::vector<std::string> domainIdentifiers)>;
    void setIndexCleaner(IndexCleaner cleaner);

    // Where signals arrive.
    [[nodiscard]] SignalHub& signals() { return signals_; }

    // Returns when every completion handler handed over so far was called. To be called before
    // what the handlers refer to goes.
    void finishHandlers() const;

  private:
    URL documentStorageURL_;
    SignalHub signals_;
    SerialQueue handlers_;
    IndexCleaner cleaner_;   // on deletions_
    SerialQueue deletions_;  // waits for nobody, for a provider may wait for it
};

}  // namespace marrowdale::host
