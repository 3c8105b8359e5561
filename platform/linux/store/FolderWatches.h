#pragma once

#include <cstdint>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "platform/foundation/Identifiers.h"
#include "platform/linux/events/Watcher.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/store/Mutex.h"

namespace marrowdale::native {

// Which folders of a tree are watched, and which could not be: those must be listed again whenever
// somebody wants to know. Any thread.
class FolderWatches {
  public:
    // `watcher` may be null: then nothing is watched, and nothing is missed that anybody counts on.
    explicit FolderWatches(Watcher* watcher) : watcher_(watcher) {}

    [[nodiscard]] bool isWatching() const { return watcher_ != nullptr; }
    // Watches the folder that is open, before its entries are read.
    void watchFolder(int folder, FileID number, bool isRoot) MARROWDALE_EXCLUDES(mutex_);
    // A folder that can't be opened, so not watched either: nobody tells when it can be.
    void noteUnwatched(FileID number, const std::string& reason) MARROWDALE_EXCLUDES(mutex_);
    // A file that has several names may be changed through one that nobody watches.
    void watchFile(int folder, const char* name, const EntryStatus& status)
        MARROWDALE_EXCLUDES(mutex_);
    void unwatch(FileID number) MARROWDALE_EXCLUDES(mutex_);

    // The folders that could not be watched, and why the last of them could not.
    [[nodiscard]] std::vector<FileID> unwatched() const MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] bool isComplete() const MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] std::string problem() const MARROWDALE_EXCLUDES(mutex_);

  private:
    Watcher* const watcher_;
    mutable Mutex mutex_;
    std::set<FileID> unwatched_ MARROWDALE_GUARDED_BY(mutex_);
    std::string problem_ MARROWDALE_GUARDED_BY(mutex_);
};

}  // namespace marrowdale::native
