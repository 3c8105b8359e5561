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

    // There is no search index, so there is nothing to take out of it.
    void deleteIndexedItemsInDomains(
        std::vector<std::string> domainIdentifiers,
        std::function<void(const std::optional<Error>&)> completionHandler) override;

    // Where signals arrive.
    [[nodiscard]] SignalHub& signals() { return signals_; }

    // Returns when every completion handler handed over so far was called. To be called before
    // what the handlers refer to goes.
    void finishHandlers() const;

  private:
    URL documentStorageURL_;
    SignalHub signals_;
    SerialQueue handlers_;
    SerialQueue deletions_;  // waits for nobody, for a provider may wait for it
};

}  // namespace marrowdale::host
