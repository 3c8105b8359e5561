#include "platform/linux/files/ServedTrees.h"

#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <utility>

#include "platform/linux/files/DirectoryReader.h"

namespace marrowdale::native {

namespace {

std::string withoutTrailingSlashes(std::string path) {
    while (path.ends_with('/')) {
        path.pop_back();
    }
    return path;
}

// `folder` is without a slash at its end, so empty for the file system's root.
bool contains(std::string_view folder, std::string_view path) {
    return path.starts_with(folder) && (path.size() == folder.size() || path[folder.size()] == '/');
}

Error notServed(const std::string& path) {
    return errorWithPOSIXCode(ENOENT, "look in the served folders for", path);
}

// A link or a mount on the way: what lies behind it is no part of the tree.
Error asNotServed(Error error, const std::string& path) {
    return error.code == ELOOP || error.code == EXDEV ? notServed(path) : std::move(error);
}

UniqueFD parentOf(int folder) {
    return UniqueFD(::openat(folder, "..", O_PATH | O_DIRECTORY | O_CLOEXEC));
}

}  // namespace

ServedTrees::ServedTrees(const std::vector<std::string>& rootFolders,
                         const std::vector<std::string>& privateFolders) {
    for (const std::string& path : privateFolders) {
        if (Folder folder = open(path); folder.held) {
            private_.push_back(std::move(folder));
        }
    }
    for (const std::string& path : rootFolders) {
        roots_.push_back(openRoot(path));
    }
}

std::shared_ptr<const ServedTrees::Folder> ServedTrees::openRoot(const std::string& path) const {
    auto root = std::make_shared<Folder>(open(path));
    root->path = withoutTrailingSlashes(path);
    root->holdsPrivateFolders = std::ranges::any_of(
        private_, [&](const Folder& folder) { return liesBelow(folder, *root); });
    return root;
}

void ServedTrees::setRoots(const std::vector<std::string>& rootFolders) {
    std::vector<std::shared_ptr<const Folder>> roots;
    for (const std::string& path : rootFolders) {
        auto known = rootOf(path);
        const auto stands = statEntry(AT_FDCWD, path.c_str());
        const bool isSame = known != nullptr && known->path == withoutTrailingSlashes(path) &&
                            stands && known->isAt(*stands);
        roots.push_back(isSame ? std::move(known) : openRoot(path));
    }
    const std::lock_guard lock(mutex_);
    roots_ = std::move(roots);
}

bool ServedTrees::Folder::isAt(const EntryStatus& status) const {
    return held && status.fileID == fileID && status.device == device;
}

ServedTrees::Folder ServedTrees::open(const std::string& path) {
    Folder folder;
    folder.path = path;
    folder.held.reset(::open(path.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    const auto status = folder.held ? statEntry(folder.held.get(), "")
                                    : Unexpected(errorWithPOSIXCode(ENOENT, "open", path));
    if (!status) {
        folder.held.reset();
        return folder;
    }
    folder.device = status->device;
    folder.fileID = status->fileID;
    return folder;
}

// Up to the top; where that can't be reached it counts as lying below, which only costs time.
bool ServedTrees::liesBelow(const Folder& inner, const Folder& outer) {
    if (!outer.held) {
        return false;
    }
    UniqueFD at = parentOf(inner.held.get());
    std::optional<EntryStatus> before;
    while (at) {
        const auto status = statEntry(at.get(), "");
        if (!status || outer.isAt(*status)) {
            return true;
        }
        if (before && before->fileID == status->fileID && before->device == status->device) {
            return false;
        }
        before = *status;
        at = parentOf(at.get());
    }
    return true;
}

std::shared_ptr<const ServedTrees::Folder> ServedTrees::rootOf(std::string_view path) const {
    const std::lock_guard lock(mutex_);
    std::shared_ptr<const Folder> innermost;
    for (const auto& root : roots_) {
        if (contains(root->path, path) &&
            (innermost == nullptr || root->path.size() > innermost->path.size())) {
            innermost = root;
        }
    }
    return innermost;
}

Expected<std::optional<ServedTrees::Location>> ServedTrees::locate(std::string_view path) const {
    auto root = rootOf(path);
    if (root == nullptr) {
        return std::optional<Location>();
    }
    const auto stands = statEntry(AT_FDCWD, root->path.empty() ? "/" : root->path.c_str());
    if (!stands) {
        return Unexpected(stands.error());
    }
    if (!root->isAt(*stands)) {
        return Unexpected(notServed(root->path));
    }
    return std::optional(locationIn(std::move(root), path));
}

Expected<std::optional<ServedTrees::Location>> ServedTrees::locate(std::string_view path,
                                                                   const Location& beside) const {
    auto root = rootOf(path);
    return root != nullptr && root == beside.keptOpen
               ? std::optional(locationIn(std::move(root), path))
               : locate(path);
}

ServedTrees::Location ServedTrees::locationIn(std::shared_ptr<const Folder> root,
                                              std::string_view path) {
    Location location;
    location.root = root->held.get();
    location.device = root->device;
    location.mayMeetPrivateFolders = root->holdsPrivateFolders;
    if (path.size() > root->path.size()) {
        location.relativePath = path.substr(root->path.size() + 1);
    }
    location.keptOpen = std::move(root);
    return location;
}

Expected<UniqueFD> ServedTrees::holdFolder(const Location& location,
                                           const std::string& relativePath) const {
    auto folder = location.mayMeetPrivateFolders ? holdInSteps(location.root, relativePath)
                                                 : holdFolderBeneath(location.root, relativePath);
    if (!folder) {
        return Unexpected(asNotServed(folder.error(), relativePath));
    }
    return folder;
}

// Each folder on the way is looked at itself, for a private one may have been renamed.
Expected<UniqueFD> ServedTrees::holdInSteps(int root, const std::string& relativePath) const {
    auto folder = holdFolderBeneath(root, {});
    for (std::size_t begin = 0; folder && begin < relativePath.size();) {
        const std::size_t end = std::min(relativePath.find('/', begin), relativePath.size());
        folder = holdFolderBeneath(folder->get(), relativePath.substr(begin, end - begin));
        const auto status = folder ? statEntry(folder->get(), "") : Unexpected(folder.error());
        if (!status) {
            return Unexpected(status.error());
        }
        if (isPrivate(*status)) {
            return Unexpected(notServed(relativePath));
        }
        begin = end + 1;
    }
    return folder;
}

bool ServedTrees::isPrivate(const EntryStatus& status) const {
    return status.isDirectory() &&
           std::ranges::any_of(private_, [&](const Folder& folder) { return folder.isAt(status); });
}

bool ServedTrees::includes(DeviceID device, const EntryStatus& found) const {
    return found.device == device && !found.isMountPoint && !isPrivate(found);
}

bool ServedTrees::holds(std::string_view path) const {
    const auto root = rootOf(path);
    return root != nullptr && path.size() > root->path.size();
}

}  // namespace marrowdale::native
