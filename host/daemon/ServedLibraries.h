#pragma once

#include <string>
#include <vector>

#include "host/daemon/LibraryChanges.h"
#include "platform/foundation/Mutex.h"
#include "platform/linux/files/ServedTrees.h"
#include "platform/linux/store/Store.h"

namespace marrowdale::host {

// Sees to it that the documents folders of applications are recorded and served, beside the storage
// root, before anybody is told of them: stands between the registry that knows them and the store
// and trees that must. Any thread.
class ServedLibraries {
  public:
    // `paths` are documents folders, each named by its application's identifier a folder above.
    [[nodiscard]] static std::vector<native::LibraryFolder> foldersAt(
        const std::vector<std::string>& paths);

    explicit ServedLibraries(std::string rootPath) : rootPath_(std::move(rootPath)) {}

    // From now on `set` tells these, which outlive the calls. They know the folders of `paths`
    // already, but for the changes (may be null), which are told of them; what was set meanwhile is
    // told now.
    void attach(native::Store& store, native::ServedTrees& trees,
                const std::vector<std::string>& paths, Log& log, LibraryChanges* changes = nullptr);
    // These are all of the folders now. Returns when they are recorded and served, or can't be,
    // which the store reports.
    void set(const std::vector<std::string>& paths);

    // The storage root, and the folders of now.
    [[nodiscard]] std::vector<std::string> roots() const;
    // The storage root, and these folders.
    [[nodiscard]] std::vector<std::string> rootsWith(const std::vector<std::string>& paths) const;

  private:
    void apply() MARROWDALE_REQUIRES(mutex_);

    const std::string rootPath_;
    // Held while they are told, so that what is set last is told last.
    mutable Mutex mutex_;
    std::vector<std::string> paths_ MARROWDALE_GUARDED_BY(mutex_);
    native::Store* store_ MARROWDALE_GUARDED_BY(mutex_) = nullptr;
    native::ServedTrees* trees_ MARROWDALE_GUARDED_BY(mutex_) = nullptr;
    LibraryChanges* changes_ MARROWDALE_GUARDED_BY(mutex_) = nullptr;
    Log* log_ MARROWDALE_GUARDED_BY(mutex_) = nullptr;
};

}  // namespace marrowdale::host
