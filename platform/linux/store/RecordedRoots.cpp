#include "platform/linux/store/RecordedRoots.h"

#include <algorithm>
#include <cerrno>
#include <utility>

namespace marrowdale::native {

namespace {

// What follows `folder` in a path that lies there, without a "/" in front.
std::string_view restBelow(std::string_view path, std::string_view folder) {
    path.remove_prefix(folder == "/" ? 0 : folder.size());
    path.remove_prefix(std::min(path.find_first_not_of('/'), path.size()));
    return path;
}

}  // namespace

bool isAtOrBelow(std::string_view path, std::string_view folder) {
    return folder == "/" || (path.starts_with(folder) &&
                             (path.size() == folder.size() || path[folder.size()] == '/'));
}

bool RecordedRoots::Folder::isRecorded() const {
    return isOpen() || (problem && problem->code == ENOENT);
}

RecordedRoots::RecordedRoots(std::string rootPath, UniqueFD root)
    : root_(std::make_shared<Folder>()) {
    root_->path = std::move(rootPath);
    root_->open = std::move(root);
}

void RecordedRoots::noteRoot(const EntryStatus& status) {
    root_->device = status.device;
    root_->file = status.fileID;
}

void RecordedRoots::setLibraries(std::vector<FolderPointer> libraries) {
    const MutexLock lock(mutex_);
    libraries_ = std::move(libraries);
}

std::vector<RecordedRoots::FolderPointer> RecordedRoots::libraries() const {
    const MutexLock lock(mutex_);
    return libraries_;
}

RecordedRoots::FolderPointer RecordedRoots::library(std::string_view key) const {
    const MutexLock lock(mutex_);
    const auto found = std::ranges::find(libraries_, key, &Folder::key);
    return found == libraries_.end() ? nullptr : *found;
}

RecordedRoots::FolderPointer RecordedRoots::folderOf(std::string_view& storedPath) const {
    if (!storedPath.starts_with('/')) {
        return root_;
    }
    const std::size_t end = std::min(storedPath.find('/', 1), storedPath.size());
    const std::string_view key = storedPath.substr(1, end - 1);
    storedPath.remove_prefix(std::min(end + 1, storedPath.size()));
    const auto found = std::ranges::find(libraries_, key, &Folder::key);
    return found == libraries_.end() ? nullptr : *found;
}

std::optional<RecordedRoots::Place> RecordedRoots::place(std::string_view storedPath) const {
    const MutexLock lock(mutex_);
    FolderPointer folder = folderOf(storedPath);
    if (folder == nullptr || !folder->isOpen()) {
        return std::nullopt;
    }
    return Place{std::move(folder), std::string(storedPath)};
}

std::optional<std::string> RecordedRoots::absolutePath(std::string_view storedPath) const {
    const MutexLock lock(mutex_);
    const FolderPointer folder = folderOf(storedPath);
    if (folder == nullptr) {
        return std::nullopt;
    }
    std::string path = folder->path;
    if (!storedPath.empty()) {
        path += path == "/" ? "" : "/";
        path += storedPath;
    }
    return path;
}

std::optional<std::string> RecordedRoots::storedPath(std::string_view absolutePath) const {
    if (isAtOrBelow(absolutePath, root_->path)) {
        return std::string(restBelow(absolutePath, root_->path));
    }
    const MutexLock lock(mutex_);
    for (const FolderPointer& library : libraries_) {
        if (library->isOpen() && isAtOrBelow(absolutePath, library->path)) {
            const std::string_view rest = restBelow(absolutePath, library->path);
            return library->storedPath() + (rest.empty() ? "" : "/") + std::string(rest);
        }
    }
    return std::nullopt;
}

bool RecordedRoots::isParent(FileID folder) const {
    const MutexLock lock(mutex_);
    return std::ranges::any_of(libraries_, [folder](const FolderPointer& library) {
        return library->parent == folder && folder != FileID{};
    });
}

RecordedRoots::FolderPointer RecordedRoots::folderAt(const EntryStatus& status) const {
    if (root_->isAt(status)) {
        return root_;
    }
    const MutexLock lock(mutex_);
    const auto found = std::ranges::find_if(
        libraries_, [&](const FolderPointer& library) { return library->isAt(status); });
    return found == libraries_.end() ? nullptr : *found;
}

}  // namespace marrowdale::native
