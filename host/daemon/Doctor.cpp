#include "host/daemon/Doctor.h"

#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <ranges>
#include <sys/xattr.h>
#include <system_error>
#include <unistd.h>

#include <fmt/format.h>

#include "host/daemon/Mounts.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

namespace {

Finding rootFinding(const std::string& rootPath) {
    return {"root", FindingStatus::ok, "the storage root is " + rootPath, {}};
}

Finding trashFinding(const std::string& rootPath) {
    if (hasTrash(rootPath)) {
        return {"trash", FindingStatus::ok, "trashed items go to .Trash in the storage root", {}};
    }
    return {"trash", FindingStatus::note,
            "the trash is switched off: the storage root is not named \"Documents\"",
            "Serve a folder named \"Documents\" to have a trash."};
}

Finding fileSystemFinding(const std::string& rootPath) {
    const auto mount = mountOf(rootPath);
    if (!mount) {
        return {"file-system",
                FindingStatus::note,
                "the file system of the storage root is unknown",
                {}};
    }
    Finding finding{"file-system",
                    FindingStatus::ok,
                    fmt::format("the storage root is on {} ({}, mounted at {})", mount->type,
                                mount->source, mount->point),
                    {}};
    if (mount->isReadOnly) {
        finding.status = FindingStatus::note;
        finding.message += ", read-only";
        finding.advice = "Items can be listed but not changed.";
    }
    return finding;
}

// The folder itself or the lowest one above it that exists.
std::string existingFolder(const std::string& folder) {
    std::filesystem::path path(folder);
    std::error_code error;
    while (path.has_relative_path() && !std::filesystem::exists(path, error)) {
        path = path.parent_path();
    }
    const auto canonical = std::filesystem::canonical(path, error);
    return error ? path.string() : canonical.string();
}

// Asks for an attribute that nobody sets: the error says whether there could be one.
Finding attributesFinding(const std::string& rootPath) {
    const native::UniqueFD root(::open(rootPath.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    const ssize_t size = ::fgetxattr(root.get(), "user.marrowdale.probe", nullptr, 0);
    const int code = size >= 0 ? 0 : errno;
    if (code == 0 || code == ENODATA) {
        return {"extended-attributes",
                FindingStatus::ok,
                "tags, ranks and dates of use can be kept with the files",
                {}};
    }
    if (code == EOPNOTSUPP) {
        return {"extended-attributes", FindingStatus::problem,
                "the file system keeps no extended attributes of users: no tags, ranks or dates of "
                "use",
                "Keep the documents on ext4, xfs or btrfs, or on tmpfs of Linux 6.6 or later."};
    }
    return {
        "extended-attributes",
        FindingStatus::note,
        "whether extended attributes are kept is unknown: " + std::generic_category().message(code),
        {}};
}

std::vector<std::string> dataFolders(const Environment& environment) {
    std::vector<std::string> folders;
    if (const auto own = environment.variable("XDG_DATA_HOME")) {
        folders.push_back(*own);
    } else if (const auto home = environment.variable("HOME")) {
        folders.push_back(*home + "/.local/share");
    }
    const std::string shared =
        environment.variable("XDG_DATA_DIRS").value_or("/usr/local/share:/usr/share");
    for (const auto folder : std::views::split(shared, ':')) {
        folders.emplace_back(folder.begin(), folder.end());
    }
    return folders;
}

Finding typesFinding(const Environment& environment) {
    for (const std::string& folder : dataFolders(environment)) {
        const std::string file = folder + "/mime/globs2";
        if (::access(file.c_str(), R_OK) == 0) {
            return {"types", FindingStatus::ok, "types of files come from " + file, {}};
        }
    }
    return {"types", FindingStatus::problem,
            "no table of file types: every file is application/octet-stream",
            "Install the package shared-mime-info."};
}

}  // namespace

std::vector<Finding> rootFindings(const std::string& rootPath) {
    return {rootFinding(rootPath), trashFinding(rootPath), fileSystemFinding(rootPath),
            attributesFinding(rootPath)};
}

Finding stateFinding(const std::string& stateFolder, const std::string& rootPath) {
    const std::string folder = existingFolder(stateFolder);
    const auto mount = mountOf(folder);
    const std::string message = fmt::format("the state is in {} ({})", stateFolder,
                                            mount ? mount->type : "unknown file system");
    if (::faccessat(AT_FDCWD, folder.c_str(), W_OK | X_OK, AT_EACCESS) != 0) {
        return {"state", FindingStatus::problem, message + ", which can't be written",
                "Make it writable, or name another folder with --state."};
    }
    if (mount && (mount->type == "tmpfs" || mount->type == "ramfs")) {
        return {"state", FindingStatus::note, message + ", which is lost when the machine stops",
                "Name a folder on a disk with --state, or identifiers last until then only."};
    }
    if (!rootPath.empty() && (folder + "/").starts_with(rootPath + "/")) {
        return {"state", FindingStatus::note, message + ", below the storage root",
                "Move it out of the storage root with --state."};
    }
    return {"state", FindingStatus::ok, message, {}};
}

std::vector<Finding> machineFindings(const Environment& environment) {
    return {typesFinding(environment)};
}

}  // namespace marrowdale::host
