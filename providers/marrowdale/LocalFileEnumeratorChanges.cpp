// The changes since an anchor, and live signals.

#include <memory>
#include <utility>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/LocalFileEnumerator.h"
#include "providers/marrowdale/fs/FSChangesEnumerator.h"

namespace marrowdale {

void LocalFileEnumerator::enumerateChangesForObserver(
    std::shared_ptr<FileProviderChangeObserver> observer, const Data& anchor) noexcept {
    if (enumerators_->isClosed()) {
        return;
    }
    const auto token = FSChangeToken::decode(anchor);
    if (!token) {
        platform_.log.error("can't create change token from anchor data, resetting");
        observer->finishEnumeratingWithError(errorSyncAnchorExpired());
        return;
    }
    const LogSection section(platform_.log, [&] {
        return "enumerate changes for " + container_ + " with token " + token->description();
    });
    if (const auto good = checkAnchor(*token); !good) {
        observer->finishEnumeratingWithError(good.error());
        return;
    }
    enumerateChanges(std::move(observer), *token);
}

Expected<void> LocalFileEnumerator::checkAnchor(const FSChangeToken& token) const {
    const auto deviceUUID = currentDeviceUUID();
    return deviceUUID ? checkDevice(token, *deviceUUID) : Unexpected(deviceUUID.error());
}

void LocalFileEnumerator::enumerateChanges(std::shared_ptr<FileProviderChangeObserver> observer,
                                           const FSChangeToken& token) {
    const auto context = std::make_shared<LocalChangesObserverContext>(
        platform_, std::move(observer), enumerators_, shouldUpdateFileIDInVaultry_);
    const auto enumerator = FSChangesEnumerator::make(platform_, token, container_, urls_, context);
    context->setFSChangesEnumerator(enumerator);
    if (enumerators_->insert(enumerator)) {
        enumerator->start();
    }
}

void LocalFileEnumerator::removeEnumerator(const FSChangesEnumerator& enumerator) {
    enumerators_->removeEnumerator(enumerator);
}

void LocalFileEnumerator::currentSyncAnchorWithCompletionHandler(
    const std::function<void(const std::optional<Data>&)>& completionHandler) noexcept {
    const auto token = currentChangeToken();
    completionHandler(token ? std::optional(token->encode()) : std::nullopt);
}

std::optional<FSChangeToken> LocalFileEnumerator::currentChangeToken() const {
    if (!notifier_) {
        return std::nullopt;
    }
    const auto eventID = platform_.fileEvents.currentEventID();
    if (!eventID) {
        platform_.log.error("can't read the current event; " + eventID.error().description());
        return std::nullopt;
    }
    return FSChangeToken{.version = 0,
                         .deviceUUID = notifier_->deviceUUID(),
                         .streamEventID = raw(*eventID),
                         .offset = 0,
                         .appLibraryVersionToken = 0};
}

void LocalFileEnumerator::start() noexcept {
    if (notifier_) {
        notifier_->start();
    }
}

void LocalFileEnumerator::stop() noexcept {
    if (notifier_) {
        notifier_->stop();
    }
    enumerators_->stopAll();
}

void LocalFileEnumerator::invalidate() noexcept {
    if (notifier_) {
        notifier_->stop();
    }
    enumerators_->close();
    letRest({});
}

}  // namespace marrowdale
