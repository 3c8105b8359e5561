#include "providers/marrowdale/LocalRootEnumerator.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <iterator>
#include <utility>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/apps/LocalAppLibraryCache.h"

namespace marrowdale {

namespace {

using Changed = LocalAppLibraryManager::Changed;
using Searchable = LocalAppLibraryManager::Searchable;
using Source = LocalAppLibraryCacheSource;

std::string address(const void* object) {
    std::array<char, 2 * sizeof(void*) + 3> text{};
    std::snprintf(text.data(), text.size(), "%p", object);
    return text.data();
}

// With the gate, so that the libraries it finds are known to identifiers too.
std::unique_ptr<LocalAppLibraryManager> makeManager(const Platform& platform,
                                                    std::string_view container) {
    const std::lock_guard gate(LocalAppLibraryManager::upgradeGate(platform));
    (void)LocalAppLibraryManager::shared(platform);
    return std::make_unique<LocalAppLibraryManager>(
        platform,
        container == VantrelWorkingSetContainerItemIdentifier ? Source::workingSet : Source::main);
}

}  // namespace

LocalRootEnumerator::LocalRootEnumerator(const Platform& platform, std::string container)
    : platform_(platform),
      container_(std::move(container)),
      enumQueue_("marrowdale.root-enumerator.queue"),
      appLibraryManager_(makeManager(platform, container_)),
      localFileEnumerator_(makeLocalFileEnumerator()) {}

LocalRootEnumerator::~LocalRootEnumerator() {
    LocalRootEnumerator::invalidate();
    // Whoever drops it wants to hear nothing more, whether or not it was started.
    std::vector<std::shared_ptr<LocalFileEnumerator>> silenced;
    {
        const std::lock_guard lock(mutex_);
        std::swap(silenced, replaced_);
        silenced.push_back(localFileEnumerator_);
    }
    for (const auto& enumerator : silenced) {
        enumerator->invalidate();
    }
}

void LocalRootEnumerator::enumerateItemsForObserver(FileProviderEnumerationObserver& observer,
                                                    const Data& page) noexcept {
    const LogSection section(platform_.log,
                             [&] { return "enumerate root items for " + address(&observer); });
    if (page == VantrelInitialPageSortedByDate() || page == VantrelInitialPageSortedByName()) {
        auto items = appLibraryManager_->items();
        const std::size_t count = items.size();
        observer.didEnumerateItems(std::move(items));
        platform_.log.debug(
            [&] { return "discovered " + std::to_string(count) + " app-libraries"; });
    }
    localFileEnumerator()->enumerateItemsForObserver(observer, page);
}

void LocalRootEnumerator::enumerateChangesForObserver(
    std::shared_ptr<FileProviderChangeObserver> observer, const Data& anchor) noexcept {
    const LogSection section(
        platform_.log, [&] { return "enumerate root changes for " + address(observer.get()); });
    auto decoded = FSChangeToken::decode(anchor);
    if (!decoded) {
        platform_.log.error("can't create change token from anchor data, resetting");
        observer->finishEnumeratingWithError(errorSyncAnchorExpired());
        return;
    }
    FSChangeToken token = *decoded;
    platform_.log.debug(
        [&] { return "notifying app library changes since " + token.description(); });
    auto decision = Decision::ended;
    enumQueue_.sync([&] { decision = decideForRoot(token, *observer); });
    if (decision == Decision::goOn) {
        localFileEnumerator()->enumerateChangesForObserver(std::move(observer), token.encode());
    }
}

LocalRootEnumerator::Decision LocalRootEnumerator::decideForRoot(
    FSChangeToken& token, FileProviderChangeObserver& observer) {
    const std::uint64_t changeTokenVersion = token.appLibraryVersionToken;
    if (mainCacheVersion() < changeTokenVersion) {
        platform_.log.debug([&] {
            return "app-library version is in advance, need to restart from scratch " +
                   versions(changeTokenVersion);
        });
        observer.finishEnumeratingWithError(errorSyncAnchorExpired());
        return Decision::ended;
    }
    if (isWorkingSet()) {
        return decideForWorkingSet(token, observer);
    }
    if (changeTokenVersion == 0) {
        platform_.log.debug(
            [] { return "change token version is zero, let's send all the app-libraries known"; });
        token.appLibraryVersionToken = appLibraryManager_->versionToken();
        sendAllItems(observer);
        return Decision::goOn;
    }
    if (changeTokenVersion != appLibraryManager_->versionToken()) {
        platform_.log.error("change token version matches nothing, need to restart from scratch " +
                            versions(changeTokenVersion));
        observer.finishEnumeratingWithError(errorSyncAnchorExpired());
        return Decision::ended;
    }
    platform_.log.debug([] { return "change token version matches local version"; });
    if (upgrade(&observer, Searchable::no) == Changed::yes) {
        updateMonitoring();
        token.appLibraryVersionToken = appLibraryManager_->versionToken();
    }
    return Decision::goOn;
}

LocalRootEnumerator::Decision LocalRootEnumerator::decideForWorkingSet(
    FSChangeToken& token, FileProviderChangeObserver& observer) {
    const std::uint64_t changeTokenVersion = token.appLibraryVersionToken;
    if (changeTokenVersion == 0) {
        platform_.log.debug(
            [] { return "change token version is zero, let's send all the app-libraries known"; });
        if (upgrade(nullptr, Searchable::yes) == Changed::yes) {
            updateMonitoring();
            saveWorkingSetCache();
        }
        sendAllItems(observer);
        token.appLibraryVersionToken = appLibraryManager_->versionToken();
        return Decision::goOn;
    }
    if (changeTokenVersion != appLibraryManager_->versionToken()) {
        platform_.log.error("change token version matches nothing, need to restart from scratch " +
                            workingSetVersions(changeTokenVersion));
        observer.finishEnumeratingWithError(errorSyncAnchorExpired());
        return Decision::ended;
    }
    platform_.log.debug([] { return "change token version matches local version"; });
    if (upgrade(&observer, Searchable::yes) == Changed::yes) {
        updateMonitoring();
        token.appLibraryVersionToken = appLibraryManager_->versionToken();
        saveWorkingSetCache();
    }
    return Decision::goOn;
}

Changed LocalRootEnumerator::upgrade(FileProviderChangeObserver* observer, Searchable searchable) {
    const std::lock_guard gate(LocalAppLibraryManager::upgradeGate(platform_));
    return appLibraryManager_->upgradeFromMainCache(observer, searchable);
}

void LocalRootEnumerator::sendAllItems(FileProviderChangeObserver& observer) const {
    observer.didUpdateItems(appLibraryManager_->items());
}

void LocalRootEnumerator::updateMonitoring() {
    auto updated = makeLocalFileEnumerator();
    std::vector<std::shared_ptr<LocalFileEnumerator>> done;
    {
        const std::lock_guard lock(mutex_);
        if (isRunning_) {
            localFileEnumerator_->stop();
        }
        replaced_.push_back(std::exchange(localFileEnumerator_, std::move(updated)));
        const auto busy = std::partition(replaced_.begin(), replaced_.end(), [](const auto& each) {
            return each->numberOfEnumerators() > 0;
        });
        std::move(busy, replaced_.end(), std::back_inserter(done));
        replaced_.erase(busy, replaced_.end());
        platform_.log.debug([&] {
            std::string list;
            for (const URL& url : localFileEnumerator_->urls()) {
                list.append(list.empty() ? "" : ", ").append(url.path());
            }
            return "updated root enumerator to monitor [" + list + "]";
        });
        if (isRunning_) {
            localFileEnumerator_->start();
        }
    }
}

void LocalRootEnumerator::saveWorkingSetCache() const {
    LocalAppLibraryCache& cache = LocalAppLibraryCache::of(platform_, Source::workingSet);
    const BundleRecords records = appLibraryManager_->records();
    const std::uint64_t token = appLibraryManager_->versionToken();
    Expected<std::uint64_t> saved = 0;
    cache.queue().sync([&] {
        // Another one may have been brought further, and saved that, since this one was upgraded.
        const std::uint64_t there = cache.versionToken();
        if (there <= token || there > mainCacheVersion()) {
            saved = cache.save(records, token, LocalAppLibraryCache::Bump::no);
        }
    });
    if (!saved) {
        platform_.log.error("can't save working-set cache to disk; " + saved.error().description());
    }
}

void LocalRootEnumerator::currentSyncAnchorWithCompletionHandler(
    const std::function<void(const std::optional<Data>&)>& completionHandler) noexcept {
    // First: an anchor whose version is older than its event is expired, and none is lost.
    const std::uint64_t version = appLibraryManager_->versionToken();
    auto token = localFileEnumerator()->currentChangeToken();
    if (!token) {
        completionHandler(std::nullopt);
        return;
    }
    token->appLibraryVersionToken = version;
    completionHandler(token->encode());
}

void LocalRootEnumerator::start() noexcept {
    const std::lock_guard lock(mutex_);
    if (!isRunning_) {
        isRunning_ = true;
        localFileEnumerator_->start();
    }
}

void LocalRootEnumerator::stop() noexcept {
    const std::lock_guard lock(mutex_);
    if (isRunning_) {
        isRunning_ = false;
        localFileEnumerator_->stop();
    }
}

void LocalRootEnumerator::invalidate() noexcept {
    stop();
}

std::shared_ptr<LocalFileEnumerator> LocalRootEnumerator::localFileEnumerator() const {
    const std::lock_guard lock(mutex_);
    return localFileEnumerator_;
}

std::shared_ptr<LocalFileEnumerator> LocalRootEnumerator::makeLocalFileEnumerator() const {
    return std::make_shared<LocalFileEnumerator>(platform_, container_, monitoredFolders());
}

std::vector<URL> LocalRootEnumerator::monitoredFolders() const {
    std::vector<URL> folders{platform_.manager.documentStorageURL()};
    std::ranges::move(appLibraryManager_->rootURLs(), std::back_inserter(folders));
    return folders;
}

std::uint64_t LocalRootEnumerator::mainCacheVersion() const {
    LocalAppLibraryCache& cache = LocalAppLibraryCache::of(platform_, Source::main);
    std::uint64_t token = 0;
    cache.queue().sync([&] { token = cache.versionToken(); });
    return token;
}

bool LocalRootEnumerator::isWorkingSet() const {
    return container_ == VantrelWorkingSetContainerItemIdentifier;
}

std::string LocalRootEnumerator::versions(std::uint64_t changeTokenVersion) const {
    return "[changeTokenVersion: " + std::to_string(changeTokenVersion) +
           ", localVersion: " + std::to_string(appLibraryManager_->versionToken()) +
           ", mainCacheVersion: " + std::to_string(mainCacheVersion()) + "]";
}

std::string LocalRootEnumerator::workingSetVersions(std::uint64_t changeTokenVersion) const {
    const std::uint64_t workingSetVersion =
        LocalAppLibraryManager::shared(platform_).versionToken();
    return "[changeTokenVersion: " + std::to_string(changeTokenVersion) +
           ", localVersion: " + std::to_string(appLibraryManager_->versionToken()) +
           ", workingSetVersion: " + std::to_string(workingSetVersion) +
           ", mainCacheVersion: " + std::to_string(mainCacheVersion()) + "]";
}

}  // namespace marrowdale
