#include "host/daemon/HostManager.h"

#include <utility>

namespace marrowdale::host {

HostManager::HostManager(const std::string& rootPath)
    : documentStorageURL_(URL::fileURL(rootPath)),
      handlers_("marrowdale.host.signals"),
      deletions_("marrowdale.host.index") {}

void HostManager::signalEnumeratorForContainerItemIdentifier(
    std::string_view containerItemIdentifier,
    std::function<void(const std::optional<Error>&)> completionHandler) {
    signals_.signal(containerItemIdentifier);
    if (completionHandler) {
        // Never on the caller's thread, which may hold what the handler wants.
        handlers_.async([handler = std::move(completionHandler)] { handler(std::nullopt); });
    }
}

void HostManager::deleteIndexedItemsInDomains(
    std::vector<std::string> domainIdentifiers,
    std::function<void(const std::optional<Error>&)> completionHandler) {
    deletions_.async([this, domains = std::move(domainIdentifiers),
                      handler = std::move(completionHandler)]() mutable {
        if (cleaner_) {
            cleaner_(std::move(domains));
        }
        if (handler) {
            handler(std::nullopt);
        }
    });
}

void HostManager::setIndexCleaner(IndexCleaner cleaner) {
    deletions_.sync([&] { cleaner_ = std::move(cleaner); });
}

void HostManager::finishHandlers() const {
    handlers_.sync([] {});
    deletions_.sync([] {});
}

}  // namespace marrowdale::host
