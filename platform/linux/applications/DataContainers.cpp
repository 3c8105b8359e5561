#include "platform/linux/applications/DataContainers.h"

#include <cerrno>
#include <cstdlib>
#include <fcntl.h>
#include <memory>
#include <unistd.h>

#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

namespace {

constexpr std::string_view documentsName = "Documents";

std::string withoutLinks(const std::string& path) {
    struct Free {
        // NOLINTNEXTLINE(cppcoreguidelines-no-malloc): realpath allocates with malloc
        void operator()(char* text) const { std::free(text); }
    };
    const std::unique_ptr<char, Free> resolved(::realpath(path.c_str(), nullptr));
    return resolved ? std::string(resolved.get()) : std::string();
}

bool holds(const std::string& outer, const std::string& inner) {
    return inner.starts_with(outer) && (inner.size() == outer.size() || inner[outer.size()] == '/');
}

}  // namespace

DataContainers::DataContainers(const std::string& folder, const std::string& storageRoot)
    : folder_(folder.empty() ? folder : withoutLinks(folder)), storageRoot_(storageRoot) {
    if (const auto status = statEntry(AT_FDCWD, storageRoot.c_str())) {
        device_ = status->device;
    }
}

Expected<UniqueFD> DataContainers::open() const {
    if (folder_.empty()) {
        return Unexpected(errorWithPOSIXCode(ENOENT, "look for the containers in", folder_));
    }
    return holdFolder(folder_);
}

DataContainers::Container DataContainers::containerOf(std::string_view identifier) const {
    return containerIn(open(), identifier);
}

DataContainers::Container DataContainers::containerIn(const Expected<UniqueFD>& folder,
                                                      std::string_view identifier) const {
    if (folder_.empty() || identifier.empty() || identifier.contains('/')) {
        return {};
    }
    const std::string path = folder_ + "/" + std::string(identifier);
    const auto documents = folder ? holdFolderBeneath(folder->get(), std::string(identifier) + "/" +
                                                                         std::string(documentsName))
                                  : Unexpected(folder.error());
    if (!documents) {
        const int code = documents.error().code;
        if (code == EXDEV) {
            return {Refusal::otherVolume, {}, {}};
        }
        return {code == EACCES ? Refusal::unreadable : Refusal::missing, {}, {}};
    }
    const auto status = statEntry(documents->get(), "");
    if (!status) {
        return {};
    }
    if (status->device != device_) {
        return {Refusal::otherVolume, {}, {}};
    }
    if (::faccessat(documents->get(), ".", R_OK | X_OK, AT_EACCESS) != 0) {
        return {Refusal::unreadable, {}, {}};
    }
    const std::string served = path + "/" + std::string(documentsName);
    if (holds(served, storageRoot_) || holds(storageRoot_, served)) {
        return {Refusal::overlapping, {}, {}};
    }
    return {Refusal::none, path, status->fileID};
}

std::optional<std::string> DataContainers::identifierAt(std::string_view path) const {
    if (folder_.empty() || !path.starts_with(folder_ + "/")) {
        return std::nullopt;
    }
    path.remove_prefix(folder_.size() + 1);
    const auto end = path.find('/');
    if (end != std::string_view::npos && path.substr(end + 1) != documentsName) {
        return std::nullopt;
    }
    return std::string(path.substr(0, end));
}

}  // namespace marrowdale::native
