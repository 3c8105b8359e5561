#pragma once

#include <memory>
#include <mutex>
#include <vector>

#include "platform/Platform.h"

namespace marrowdale {

// One app library: the documents folder that is served, and the application that it belongs to.
struct AppLibrary {
    URL rootURL;
    std::shared_ptr<const BundleRecord> record;
};
// Each folder once.
using AppLibraries = std::vector<AppLibrary>;

// The app libraries that the extension knows: those of the shared working-set manager, which tells
// them here whenever they change. What is below it (identifiers and items) asks here, and so needs
// to know nothing of managers and caches. Any thread.
class MRWAppLibraryManager {
  public:
    // The documents folders of all known libraries, in a lasting order.
    [[nodiscard]] static std::vector<URL> rootURLsForAppLibraries(const Platform& platform);

    // The record of the library that holds the URL: of the documents folders that contain it, or
    // are it, the one with the longest path. Null when no library holds it.
    [[nodiscard]] static std::shared_ptr<const BundleRecord> recordOfLibraryHolding(
        const Platform& platform, const URL& url);

    // For the shared working-set manager.
    static void setKnownLibraries(const Platform& platform, AppLibraries libraries);
};

}  // namespace marrowdale
