#include "providers/marrowdale/apps/AppRefresh.h"

#include <chrono>
#include <mutex>
#include <string>
#include <utility>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/apps/LocalAppLibraryManager.h"

namespace marrowdale {

namespace {

constexpr std::chrono::milliseconds minimumInterval{500};

}  // namespace

AppRefresh::AppRefresh(const Platform& platform)
    : platform_(platform),
      appRefreshQueue_("marrowdale.app-refresh.queue"),
      appRefreshPacer_(RefreshPacer::makePacer("marrowdale.app-refresh.pacer", appRefreshQueue_,
                                               minimumInterval)) {}

std::shared_ptr<AppRefresh> AppRefresh::begin(const Platform& platform) {
    const std::shared_ptr<AppRefresh> refresh(new AppRefresh(platform));
    refresh->appRefreshPacer_->setEventBlock([weak = std::weak_ptr(refresh)] {
        if (const auto self = weak.lock()) {
            self->paceEvent();
        }
    });
    refresh->appRefreshPacer_->resume();
    refresh->appRefreshPacer_->signal();
    return refresh;
}

void AppRefresh::request(std::function<void()> completionHandler) {
    appRefreshQueue_.async([weak = weak_from_this(), handler = std::move(completionHandler)] {
        const auto self = weak.lock();
        if (self && self->appRefreshPacer_) {
            if (handler) {
                self->appRefreshCompletionHandlers_.push_back(handler);
            }
            self->appRefreshPacer_->signal();
        }
    });
}

void AppRefresh::end() {
    const auto stop = [this] { appRefreshPacer_.reset(); };
    if (appRefreshQueue_.isCurrent()) {
        stop();
    } else {
        appRefreshQueue_.sync(stop);
    }
}

void AppRefresh::paceEvent() {
    const LogSection section(platform_.log, [] { return "pacer event"; });
    refreshAndSignal();
}

void AppRefresh::refreshAndSignal() {
    using Changed = LocalAppLibraryManager::Changed;
    auto appsChanged = Changed::no;
    auto managerUpgraded = Changed::no;
    {
        const std::lock_guard gate(LocalAppLibraryManager::upgradeGate(platform_));
        LocalAppLibraryManager::backgroundQueue(platform_).sync(
            [&] { appsChanged = LocalAppLibraryManager::refreshAppLibraries(platform_); });
        platform_.log.debug([] { return "auto-upgrading shared app library manager"; });
        managerUpgraded = LocalAppLibraryManager::shared(platform_).upgradeFromMainCache(
            nullptr, LocalAppLibraryManager::Searchable::no);
    }
    // By number: a handler may lead to another one.
    for (std::size_t i = 0; i < appRefreshCompletionHandlers_.size(); ++i) {
        const auto handler = appRefreshCompletionHandlers_[i];
        handler();
    }
    if (appsChanged == Changed::yes) {
        signal(VantrelRootContainerItemIdentifier);
    }
    if (managerUpgraded == Changed::yes) {
        signal(VantrelWorkingSetContainerItemIdentifier);
    }
}

void AppRefresh::signal(std::string_view container) const {
    platform_.log.info([&] { return "notify changes on " + std::string(container); });
    platform_.manager.signalEnumeratorForContainerItemIdentifier(container, {});
}

}  // namespace marrowdale
