#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "platform/Platform.h"
#include "platform/foundation/SerialQueue.h"
#include "platform/hostframework/FileProviderEnumeration.h"
#include "providers/marrowdale/LocalFileEnumerator.h"
#include "providers/marrowdale/apps/LocalAppLibraryManager.h"

namespace marrowdale {

// Lists and follows the containers that gather several trees: the root, the working set and all
// directories. Before what a LocalFileEnumerator over the storage root and all app libraries tells,
// it tells which app libraries there are; an anchor carries the version of that list in its
// `appLibraryVersionToken`.
//
// An enumerator answers from the version of the libraries that it knows: an anchor of another one
// is expired, but for 0, which knows none and is sent all. A request for changes brings it up to
// the newest version, and from then on it lists and follows the libraries of that one.
//
// Any thread, several at once; requests for changes decide about versions one at a time.
class LocalRootEnumerator : public FileProviderEnumerator {
  public:
    LocalRootEnumerator(const Platform& platform, std::string container);
    LocalRootEnumerator(const LocalRootEnumerator&) = delete;
    LocalRootEnumerator& operator=(const LocalRootEnumerator&) = delete;
    // Ends what is under way, whether or not this was started: its observers hear nothing more.
    ~LocalRootEnumerator() override;

    // An initial page begins with one batch of all app libraries.
    void enumerateItemsForObserver(FileProviderEnumerationObserver& observer,
                                   const Data& page) noexcept override;
    // App libraries are told on the caller's thread, before the files.
    void enumerateChangesForObserver(std::shared_ptr<FileProviderChangeObserver> observer,
                                     const Data& anchor) noexcept override;
    void currentSyncAnchorWithCompletionHandler(
        const std::function<void(const std::optional<Data>&)>& completionHandler) noexcept override;
    void start() noexcept override;
    void stop() noexcept override;
    // The same as `stop`; nothing for one that was not started.
    void invalidate() noexcept override;

    [[nodiscard]] const std::string& container() const { return container_; }
    // "marrowdale.root-enumerator.queue"; on it versions are decided about.
    [[nodiscard]] const SerialQueue& enumQueue() const { return enumQueue_; }
    [[nodiscard]] const LocalAppLibraryManager& appLibraryManager() const {
        return *appLibraryManager_;
    }
    // The one of this moment.
    [[nodiscard]] std::shared_ptr<LocalFileEnumerator> localFileEnumerator() const;

  private:
    enum class Decision : bool { ended, goOn };
    [[nodiscard]] Decision decideForRoot(FSChangeToken& token,
                                         FileProviderChangeObserver& observer);
    [[nodiscard]] Decision decideForWorkingSet(FSChangeToken& token,
                                               FileProviderChangeObserver& observer);
    [[nodiscard]] LocalAppLibraryManager::Changed upgrade(
        FileProviderChangeObserver* observer, LocalAppLibraryManager::Searchable searchable);
    void sendAllItems(FileProviderChangeObserver& observer) const;
    void updateMonitoring();
    // Not over what is newer.
    void saveWorkingSetCache() const;
    [[nodiscard]] std::uint64_t mainCacheVersion() const;
    [[nodiscard]] bool isWorkingSet() const;
    // "[changeTokenVersion: …]"
    [[nodiscard]] std::string versions(std::uint64_t changeTokenVersion) const;
    [[nodiscard]] std::string workingSetVersions(std::uint64_t changeTokenVersion) const;
    [[nodiscard]] std::vector<URL> monitoredFolders() const;
    [[nodiscard]] std::shared_ptr<LocalFileEnumerator> makeLocalFileEnumerator() const;

    const Platform& platform_;
    const std::string container_;
    const SerialQueue enumQueue_;
    const std::unique_ptr<LocalAppLibraryManager> appLibraryManager_;
    mutable std::mutex mutex_;
    bool isRunning_ = false;                                    // guarded by mutex_
    std::shared_ptr<LocalFileEnumerator> localFileEnumerator_;  // guarded by mutex_
    // Those that were replaced while they had requests under way.
    std::vector<std::shared_ptr<LocalFileEnumerator>> replaced_;  // guarded by mutex_
};

}  // namespace marrowdale
