#include "providers/marrowdale/items/MRWAppLibraryManager.h"

#include <string>
#include <utility>

namespace marrowdale {

namespace {

// Copies are handed out, for the libraries may change at any time.
class KnownLibraries {
  public:
    [[nodiscard]] std::shared_ptr<const AppLibraries> get() const {
        const std::lock_guard lock(mutex_);
        return libraries_;
    }
    void set(AppLibraries libraries) {
        auto kept = std::make_shared<const AppLibraries>(std::move(libraries));
        const std::lock_guard lock(mutex_);
        std::swap(libraries_, kept);
    }

  private:
    mutable std::mutex mutex_;
    std::shared_ptr<const AppLibraries> libraries_ =
        std::make_shared<const AppLibraries>();  // guarded by mutex_
};

KnownLibraries& knownLibraries(const Platform& platform) {
    return platform.shared.get<KnownLibraries>("marrowdale.known-app-libraries");
}

}  // namespace

std::vector<URL> MRWAppLibraryManager::rootURLsForAppLibraries(const Platform& platform) {
    std::vector<URL> urls;
    for (const AppLibrary& library : *knownLibraries(platform).get()) {
        urls.push_back(library.rootURL);
    }
    return urls;
}

std::shared_ptr<const BundleRecord> MRWAppLibraryManager::recordOfLibraryHolding(
    const Platform& platform, const URL& url) {
    std::shared_ptr<const BundleRecord> found;
    std::size_t longest = 0;
    for (const AppLibrary& library : *knownLibraries(platform).get()) {
        const std::size_t length = library.rootURL.path().size();
        if (length > longest && relationship(library.rootURL, url) != URLRelationship::other) {
            found = library.record;
            longest = length;
        }
    }
    return found;
}

void MRWAppLibraryManager::setKnownLibraries(const Platform& platform, AppLibraries libraries) {
    knownLibraries(platform).set(std::move(libraries));
}

}  // namespace marrowdale
