#include "platform/linux/store/FolderWatches.h"

#include <fcntl.h>

#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

void FolderWatches::watchFolder(int folder, FileID number, bool isRoot) {
    if (watcher_ == nullptr) {
        return;
    }
    const auto watched =
        isRoot ? watcher_->watchRoot(folder, number) : watcher_->watchFolder(folder, number);
    const MutexLock lock(mutex_);
    if (watched) {
        unwatched_.erase(number);
    } else {
        unwatched_.insert(number);
        problem_ = watched.error().description();
    }
}

void FolderWatches::noteUnwatched(FileID number, const std::string& reason) {
    if (watcher_ == nullptr) {
        return;
    }
    const MutexLock lock(mutex_);
    unwatched_.insert(number);
    problem_ = reason;
}

void FolderWatches::watchFile(int folder, const char* name, const EntryStatus& status) {
    if (watcher_ == nullptr || !status.isRegular() || status.linkCount <= 1) {
        return;
    }
    // What can't be read can't be watched; the next reconcile sees what happened to it.
    const UniqueFD file(::openat(folder, name, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    if (file) {
        (void)watcher_->watchFile(file.get(), status.fileID);
    }
}

void FolderWatches::unwatch(FileID number) {
    if (watcher_ == nullptr) {
        return;
    }
    watcher_->unwatch(number);
    const MutexLock lock(mutex_);
    unwatched_.erase(number);
}

std::vector<FileID> FolderWatches::unwatched() const {
    const MutexLock lock(mutex_);
    return {unwatched_.begin(), unwatched_.end()};
}

bool FolderWatches::isComplete() const {
    const MutexLock lock(mutex_);
    return unwatched_.empty();
}

std::string FolderWatches::problem() const {
    const MutexLock lock(mutex_);
    return problem_;
}

}  // namespace marrowdale::native
