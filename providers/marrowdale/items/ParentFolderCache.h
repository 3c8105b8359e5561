#pragma once

#include <optional>
#include <string>

#include "platform/Platform.h"

namespace marrowdale {

// What is the same for all children of a folder, worked out once while the items of a page are
// built. Lives no longer than a page, so that nothing in it grows old. One thread at a time.
class ParentFolderCache {
  public:
    explicit ParentFolderCache(const Platform& platform) : platform_(platform) {}

    struct Facts {
        URL folder;
        // The folder's own identifier, once it was asked for.
        std::optional<std::string> identifier;
        // Every child lies below the storage root or an app library's folder, and none of them is
        // the top of such a tree itself. Where this is false, each child must be looked at.
        bool holdsOrdinaryItems = false;
        // Filled in together with `knowsBundleIdentifier`.
        std::optional<std::string> bundleIdentifier;
        bool knowsBundleIdentifier = false;
    };
    // Good until the next call.
    [[nodiscard]] Facts& factsFor(const URL& folder);

  private:
    const Platform& platform_;
    std::optional<Facts> facts_;  // of the folder asked for last
};

// The bundle identifier of the application whose library holds the URL; see
// MRWAppLibraryManager::recordOfLibraryHolding. None when no library holds it.
[[nodiscard]] std::optional<std::string> bundleIdentifierOfLibraryWithURL(const Platform& platform,
                                                                          const URL& url);

}  // namespace marrowdale
