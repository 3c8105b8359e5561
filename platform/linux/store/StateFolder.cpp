#include "platform/linux/store/StateFolder.h"

#include <algorithm>
#include <string_view>
#include <sys/stat.h>

#include "platform/linux/store/DiskFile.h"

namespace marrowdale::native {

namespace {

bool exists(const std::string& path) {
    struct stat found{};
    return ::lstat(path.c_str(), &found) == 0;
}

std::uint64_t sizeOfFilesIn(const std::string& folder) {
    std::uint64_t bytes = 0;
    const std::string prefix = folder + "/";
    const auto names = namesIn(folder);
    for (const std::string& name : names ? *names : std::vector<std::string>()) {
        struct stat found{};
        if (::lstat((prefix + name).c_str(), &found) == 0 && S_ISREG(found.st_mode)) {
            bytes += static_cast<std::uint64_t>(found.st_size);
        }
    }
    return bytes;
}

}  // namespace

Expected<std::vector<StoreFolder>> StateFolder::storeFolders() const {
    const auto names = namesIn(path_);
    if (!names) {
        return Unexpected(names.error());
    }
    std::vector<StoreFolder> folders;
    for (const std::string& name : *names) {
        if (const auto key = StoreFolder::keyIn(name, StoreFolder::Part::store)) {
            folders.emplace_back(path_, *key);
        }
    }
    return folders;
}

Expected<StoreFolder> StateFolder::storeOf(const RootBinding& root) const {
    StoreFolder usual(path_, root.key());
    if (usual.hasStore()) {
        return usual;
    }
    // A kernel that tells more of a folder than the one before gives it another key.
    const auto folders = storeFolders();
    if (!folders) {
        return Unexpected(folders.error());
    }
    for (const StoreFolder& folder : *folders) {
        const auto identity = StoreIdentity::read(folder.identity());
        if (identity && identity->root.isSameFolderAs(root)) {
            return folder;
        }
    }
    return usual;
}

std::string StateFolder::reasonToMake(const StoreFolder& folder, const RootBinding& root) const {
    if (exists(folder.damaged())) {
        return "the store was missing";
    }
    const auto stores = this->stores();
    const bool replaced = std::ranges::any_of(
        stores, [&](const StoredRoot& store) { return store.rootPath == root.path; });
    return replaced ? "the root folder was made anew" : "";
}

Expected<void> StateFolder::sweep() const {
    const auto names = namesIn(path_);
    if (!names) {
        return Unexpected(names.error());
    }
    for (const std::string& name : *names) {
        if (StoreFolder::keyIn(name, StoreFolder::Part::unfinished)) {
            if (auto removed = removeTree(path_ + "/" + name); !removed) {
                return removed;
            }
        }
    }
    return {};
}

std::vector<StoredRoot> StateFolder::stores() const {
    std::vector<StoredRoot> stores;
    const auto folders = storeFolders();
    for (const StoreFolder& folder : folders ? *folders : std::vector<StoreFolder>()) {
        const auto identity = StoreIdentity::read(folder.identity());
        stores.push_back({folder.store(), identity ? identity->root.path : std::string(),
                          sizeOfFilesIn(folder.store())});
    }
    return stores;
}

}  // namespace marrowdale::native
