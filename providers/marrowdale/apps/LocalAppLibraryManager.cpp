#include "providers/marrowdale/apps/LocalAppLibraryManager.h"

#include <array>
#include <cstdio>
#include <utility>

#include "platform/foundation/Semaphore.h"
#include "providers/marrowdale/items/MRWAppLibraryManager.h"

namespace marrowdale {

namespace {

using Source = LocalAppLibraryCacheSource;

constexpr std::string_view backgroundLabel = "marrowdale.app-library.background";

struct BackgroundQueue {
    SerialQueue queue{backgroundLabel};
};

// The token and the list of the main cache, read together. The list is left out where the caller
// has it already.
struct MainCache {
    std::uint64_t versionToken = 0;
    BundleRecords records;
};

MainCache mainCacheSince(const Platform& platform, std::uint64_t known) {
    LocalAppLibraryCache& cache = LocalAppLibraryCache::of(platform, Source::main);
    MainCache main;
    cache.queue().sync([&] {
        if (cache.versionToken() == 0 || cache.versionToken() != known) {
            main.records = cache.load();
        }
        main.versionToken = cache.versionToken();
    });
    return main;
}

std::string joined(const std::vector<std::string>& texts) {
    std::string list;
    for (const std::string& text : texts) {
        list.append(list.empty() ? "" : ", ").append(text);
    }
    return "[" + list + "]";
}

}  // namespace

LocalAppLibraryManager::LocalAppLibraryManager(const Platform& platform, Source source)
    : LocalAppLibraryManager(platform, source, Role::own) {}

LocalAppLibraryManager::LocalAppLibraryManager(const Platform& platform, Source source, Role role)
    : platform_(platform),
      cacheSource_(source),
      role_(role),
      queue_("marrowdale.app-library-manager") {
    LocalAppLibraryCache& cache = LocalAppLibraryCache::of(platform, source);
    const LogSection section(platform.log,
                             [&] { return "loading bundle proxies from " + cache.shortPath(); });
    BundleRecords records;
    std::uint64_t token = 0;
    cache.queue().sync([&] {
        records = cache.load();
        token = cache.versionToken();
    });
    replace(contentOf(records, "can't create app library from bundle proxy "), token);
}

LocalAppLibraryManager& LocalAppLibraryManager::shared(const Platform& platform) {
    return platform.shared.get<LocalAppLibraryManager>("marrowdale.app-library-manager", [&] {
        return std::shared_ptr<LocalAppLibraryManager>(
            new LocalAppLibraryManager(platform, Source::workingSet, Role::shared));
    });
}

const SerialQueue& LocalAppLibraryManager::backgroundQueue(const Platform& platform) {
    return platform.shared.get<BackgroundQueue>(backgroundLabel).queue;
}

std::mutex& LocalAppLibraryManager::upgradeGate(const Platform& platform) {
    return platform.shared.get<std::mutex>("marrowdale.app-library.upgrade-gate");
}

LocalAppLibraryManager::Changed LocalAppLibraryManager::upgradeFromMainCache(
    FileProviderChangeObserver* observer, Searchable searchable) {
    const LogSection section(platform_.log, [] { return "upgrading content from main cache"; });
    const std::uint64_t mine = versionToken();
    const MainCache main = mainCacheSince(platform_, mine);
    if (mine == main.versionToken) {
        return Changed::no;
    }
    if (mine > main.versionToken) {
        platform_.log.error("version token shouldn't be greater than the main's cache version (" +
                            std::to_string(mine) + " vs " + std::to_string(main.versionToken) +
                            "); " + description());
    }
    Content upgraded = contentOf(main.records, "can't create app library for ");
    std::vector<std::string> deleted;
    for (const auto& [identifier, item] : content().appLibrariesByItemIDs) {
        if (!upgraded.appLibrariesByItemIDs.contains(identifier)) {
            deleted.push_back(identifier);
        }
    }
    if (observer && !upgraded.appLibrariesByItemIDs.empty()) {
        std::vector<FileProviderItemPtr> items;
        for (const auto& [identifier, item] : upgraded.appLibrariesByItemIDs) {
            items.push_back(item);
        }
        observer->didUpdateItems(std::move(items));
    }
    if (observer && !deleted.empty()) {
        observer->didDeleteItemsWithIdentifiers(deleted);
    }
    if (searchable == Searchable::yes && !deleted.empty()) {
        removeFromIndex(deleted);
    }
    replace(std::move(upgraded), main.versionToken);
    platform_.log.debug([&] { return "upgraded manager " + description(); });
    return Changed::yes;
}

void LocalAppLibraryManager::removeFromIndex(const std::vector<std::string>& domains) const {
    platform_.log.debug(
        [] { return "asking provider manager to delete index from deleted domains"; });
    // What the handler needs outlives this call only as long as the handler does.
    struct Answer {
        Semaphore came;
        std::optional<Error> error;
    };
    const auto answer = std::make_shared<Answer>();
    platform_.manager.deleteIndexedItemsInDomains(domains,
                                                  [answer](const std::optional<Error>& error) {
                                                      answer->error = error;
                                                      answer->came.signal();
                                                  });
    answer->came.wait();
    if (answer->error) {
        platform_.log.error("can't delete searchable items from " + joined(domains) + "; " +
                            answer->error->description());
        return;
    }
    platform_.log.debug(
        [&] { return "items from domains " + joined(domains) + " removed from index"; });
}

LocalAppLibraryManager::Content LocalAppLibraryManager::contentOf(
    const BundleRecords& records, std::string_view complaint) const {
    Content content;
    for (const auto& record : records) {
        auto item = LocalAppLibraryItem::initFrom(platform_, *record);
        if (!item) {
            platform_.log.debug(
                [&] { return std::string(complaint) + marrowdale::description(*record); });
            continue;
        }
        // Without what was learnt of it now.
        const URL root = URL::fileURL(item->fileURL.path());
        content.bundleProxiesByRootURLs.insert_or_assign(root.path(), AppLibrary{root, record});
        content.appLibrariesByItemIDs.insert_or_assign(item->itemIdentifier, std::move(item));
    }
    return content;
}

LocalAppLibraryManager::Content LocalAppLibraryManager::content() const {
    Content copy;
    queue_.sync([&] { copy = content_; });
    return copy;
}

void LocalAppLibraryManager::replace(Content content, std::uint64_t versionToken) {
    queue_.sync([&] {
        std::swap(content_, content);
        versionToken_ = versionToken;
        if (role_ == Role::shared) {
            AppLibraries known;
            for (const auto& [path, library] : content_.bundleProxiesByRootURLs) {
                known.push_back(library);
            }
            MRWAppLibraryManager::setKnownLibraries(platform_, std::move(known));
        }
    });
}

std::uint64_t LocalAppLibraryManager::versionToken() const {
    std::uint64_t token = 0;
    queue_.sync([&] { token = versionToken_; });
    return token;
}

std::vector<FileProviderItemPtr> LocalAppLibraryManager::items() const {
    std::vector<FileProviderItemPtr> items;
    for (auto& [identifier, item] : content().appLibrariesByItemIDs) {
        items.push_back(std::move(item));
    }
    return items;
}

AppLibraries LocalAppLibraryManager::libraries() const {
    AppLibraries libraries;
    for (auto& [path, library] : content().bundleProxiesByRootURLs) {
        libraries.push_back(library);
    }
    return libraries;
}

std::vector<URL> LocalAppLibraryManager::rootURLs() const {
    std::vector<URL> urls;
    for (const AppLibrary& library : libraries()) {
        urls.push_back(library.rootURL);
    }
    return urls;
}

BundleRecords LocalAppLibraryManager::records() const {
    BundleRecords records;
    for (AppLibrary& library : libraries()) {
        records.push_back(std::move(library.record));
    }
    return records;
}

std::string LocalAppLibraryManager::description() const {
    std::array<char, 2 * sizeof(void*) + 3> address{};
    std::snprintf(address.data(), address.size(), "%p", static_cast<const void*>(this));
    std::vector<std::string> texts;
    for (const auto& item : items()) {
        texts.push_back(item->description());
    }
    return "<LocalAppLibraryManager:" + std::string(address.data()) +
           (role_ == Role::shared ? " SHARED" : "") +
           " versionToken:" + std::to_string(versionToken()) +
           " cache-source:" + std::string(marrowdale::description(cacheSource_)) +
           " app-libraries:" + joined(texts) + ">";
}

}  // namespace marrowdale
