#include "host/daemon/ServedLibraries.h"

#include <string_view>
#include <utility>

namespace marrowdale::host {

namespace {

std::vector<std::string> identifiersOf(const std::vector<std::string>& paths) {
    std::vector<std::string> identifiers;
    for (auto& folder : ServedLibraries::foldersAt(paths)) {
        identifiers.push_back(std::move(folder.key));
    }
    return identifiers;
}

}  // namespace

std::vector<native::LibraryFolder> ServedLibraries::foldersAt(
    const std::vector<std::string>& paths) {
    std::vector<native::LibraryFolder> folders;
    for (const std::string& path : paths) {
        const std::string_view container = std::string_view(path).substr(0, path.rfind('/'));
        folders.push_back({std::string(container.substr(container.rfind('/') + 1)), path});
    }
    return folders;
}

std::vector<std::string> ServedLibraries::rootsWith(const std::vector<std::string>& paths) const {
    std::vector<std::string> roots{rootPath_};
    roots.insert(roots.end(), paths.begin(), paths.end());
    return roots;
}

std::vector<std::string> ServedLibraries::roots() const {
    const MutexLock lock(mutex_);
    return rootsWith(paths_);
}

void ServedLibraries::attach(native::Store& store, native::ServedTrees& trees,
                             const std::vector<std::string>& paths, Log& log,
                             LibraryChanges* changes) {
    const MutexLock lock(mutex_);
    store_ = &store;
    trees_ = &trees;
    log_ = &log;
    changes_ = changes;
    if (changes_ != nullptr) {
        changes_->begin(identifiersOf(paths), store.lastEventOfEarlierRuns());
    }
    if (paths_ != paths) {
        apply();
    }
}

void ServedLibraries::set(const std::vector<std::string>& paths) {
    const MutexLock lock(mutex_);
    paths_ = paths;
    if (store_ != nullptr) {
        apply();
    }
}

// Noted first, then served: what the store tells of is looked at.
void ServedLibraries::apply() {
    if (changes_ != nullptr) {
        changes_->note(identifiersOf(paths_), store_->lastEventID());
    }
    trees_->setRoots(rootsWith(paths_));
    if (auto done = store_->setLibraries(foldersAt(paths_)); !done) {
        log_->error("the documents of applications can't be recorded: " +
                    done.error().description());
    }
}

}  // namespace marrowdale::host
