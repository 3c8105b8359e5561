#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderEnumeration.h"
#include "providers/marrowdale/apps/LocalAppLibraryCache.h"
#include "providers/marrowdale/items/LocalAppLibraryItem.h"
#include "providers/marrowdale/items/MRWAppLibraryManager.h"

namespace marrowdale {

// The app libraries as of one version of the main cache: their items, and the records they came
// from. One is shared in a world (source `workingSet`); each root enumerator has its own.
//
// Threads: any. Fields change on `queue` in one short block; items are built, observers called and
// the host waited for outside of it. Two upgrades of one manager must not run at the same time.
class LocalAppLibraryManager {
  public:
    // Loads the cache of that source and builds the items of what is in it.
    LocalAppLibraryManager(const Platform& platform, LocalAppLibraryCacheSource source);

    // The one of the world, made at first use. What it knows is what MRWAppLibraryManager answers.
    [[nodiscard]] static LocalAppLibraryManager& shared(const Platform& platform);

    // "marrowdale.app-library.background": where registries are read.
    [[nodiscard]] static const SerialQueue& backgroundQueue(const Platform& platform);
    enum class Changed : bool { no, yes };
    // Reads the registry, and writes the main cache where what qualifies is not what it holds.
    // Whether it was written. On the background queue.
    [[nodiscard]] static Changed refreshAppLibraries(const Platform& platform);
    // Held while the main cache and then the shared manager move on, so that nobody who holds it
    // knows a library which the shared manager does not know yet.
    [[nodiscard]] static std::mutex& upgradeGate(const Platform& platform);

    enum class Searchable : bool { no, yes };
    // Brings this manager up to the main cache, and tells the observer, which may be null: all
    // items as updates, and the identifiers that are gone. With `yes`, what is gone is taken out of
    // the host's search index first, which is waited for. Whether anything changed.
    [[nodiscard]] Changed upgradeFromMainCache(FileProviderChangeObserver* observer,
                                               Searchable searchable);

    // "marrowdale.app-library-manager"; on it the fields change.
    [[nodiscard]] const SerialQueue& queue() const { return queue_; }
    [[nodiscard]] LocalAppLibraryCacheSource cacheSource() const { return cacheSource_; }
    // The version of the main cache that the rest reflects; 0 when nothing is known yet.
    [[nodiscard]] std::uint64_t versionToken() const;
    // In the order of their identifiers.
    [[nodiscard]] std::vector<FileProviderItemPtr> items() const;
    // In the order of their root URLs' paths.
    [[nodiscard]] AppLibraries libraries() const;
    [[nodiscard]] std::vector<URL> rootURLs() const;
    [[nodiscard]] BundleRecords records() const;
    [[nodiscard]] std::string description() const;

  private:
    enum class Role : bool { own, shared };
    LocalAppLibraryManager(const Platform& platform, LocalAppLibraryCacheSource source, Role role);

    struct Content {
        std::map<std::string, std::shared_ptr<LocalAppLibraryItem>> appLibrariesByItemIDs;
        std::map<std::string, AppLibrary> bundleProxiesByRootURLs;  // by the URL's path
    };
    [[nodiscard]] Content contentOf(const BundleRecords& records, std::string_view complaint) const;
    [[nodiscard]] Content content() const;
    void replace(Content content, std::uint64_t versionToken);
    void removeFromIndex(const std::vector<std::string>& domains) const;

    const Platform& platform_;
    const LocalAppLibraryCacheSource cacheSource_;
    const Role role_;
    const SerialQueue queue_;
    std::uint64_t versionToken_ = 0;  // on queue_
    Content content_;                 // on queue_
};

}  // namespace marrowdale
