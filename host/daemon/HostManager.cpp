#include "host/daemon/HostManager.h"

#include <utility>

namespace marrowdale::host {

HostManager::HostManager(const std::string& rootPath)
    : documentStorageURL_(URL::fileURL(rootPath)), handlers_("marrowdale.host.signals") {}

void HostManager::signalEnumeratorForContainerItemIdentifier(
    std::string_view containerItemIdentifier,
    std::function<void(const std::optional<Error>&)> completionHandler) {
    {
        const std::lock_guard lock(mutex_);
        signalled_.emplace(containerItemIdentifier);
    }
    if (completionHandler) {
        // Never on the caller's thread, which may hold what the handler wants.
        handlers_.async([handler = std::move(completionHandler)] { handler(std::nullopt); });
    }
}

std::vector<std::string> HostManager::takeSignalledContainers() {
    const std::lock_guard lock(mutex_);
    std::vector<std::string> containers(signalled_.begin(), signalled_.end());
    signalled_.clear();
    return containers;
}

void HostManager::finishHandlers() const {
    handlers_.sync([] {});
}

}  // namespace marrowdale::host
