#pragma once

#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "platform/foundation/SerialQueue.h"
#include "platform/hostframework/FileProviderManager.h"

namespace marrowdale::host {

// The host as the extension sees it: says where the storage root is, and takes its signals.
// Signals of one container are one until somebody takes them. Any thread.
class HostManager final : public FileProviderManager {
  public:
    // `rootPath`: absolute, without links.
    explicit HostManager(const std::string& rootPath);

    [[nodiscard]] const URL& documentStorageURL() const override { return documentStorageURL_; }
    void signalEnumeratorForContainerItemIdentifier(
        std::string_view containerItemIdentifier,
        std::function<void(const std::optional<Error>&)> completionHandler) override;

    // The containers signalled since the last call, each once, in the order of their names.
    [[nodiscard]] std::vector<std::string> takeSignalledContainers();

    // Returns when every completion handler handed over so far was called. To be called before
    // what the handlers refer to goes.
    void finishHandlers() const;

  private:
    URL documentStorageURL_;
    std::mutex mutex_;
    std::set<std::string, std::less<>> signalled_;  // guarded by mutex_
    SerialQueue handlers_;
};

}  // namespace marrowdale::host
