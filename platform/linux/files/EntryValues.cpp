#include "platform/linux/files/EntryValues.h"

#include <algorithm>
#include <sys/stat.h>

namespace marrowdale::native {

namespace {

constexpr std::uint32_t leastFolderLinks = 2;
constexpr std::uint32_t mostFolderLinks = 65537;

std::string_view typeOf(const EntryStatus& status, std::string_view name, bool package,
                        const MimeTypes& types) {
    switch (status.mode & S_IFMT) {
        case S_IFDIR:
            return package ? types.typeForName(name) : MimeTypes::directory;
        case S_IFLNK:
            return MimeTypes::symbolicLink;
        case S_IFIFO:
            return MimeTypes::pipe;
        case S_IFSOCK:
            return MimeTypes::socket;
        case S_IFCHR:
            return MimeTypes::characterDevice;
        case S_IFBLK:
            return MimeTypes::blockDevice;
        default:
            return types.typeForName(name);
    }
}

std::uint32_t folderLinks(const EntryStatus& status, DocumentIndex& documents) {
    // A file system that does not count subfolders says 1.
    const std::uint64_t links = status.linkCount == 1 ? std::uint64_t{leastFolderLinks} +
                                                            documents.subfolderCount(status.fileID)
                                                      : status.linkCount;
    return static_cast<std::uint32_t>(
        std::clamp<std::uint64_t>(links, leastFolderLinks, mostFolderLinks));
}

}  // namespace

PrefetchedValues describeEntry(const EntryStatus& status, std::string_view name,
                               ResourceKeySet keys, const FileSources& sources) {
    PrefetchedValues values;
    values.known = keys;
    values.known.erase(ResourceKey::parentDirectoryURL);
    values.fileID = status.fileID;
    values.isDirectory = status.isDirectory();
    values.isPackage = isPackage(status, name, sources.packages);
    if (keys.contains(ResourceKey::typeIdentifier)) {
        values.typeIdentifier = typeOf(status, name, values.isPackage, sources.types);
    }
    values.contentModificationDate = status.modified;
    values.creationDate = status.birth;
    if (!status.hasBirth) {
        values.absent.insert(ResourceKey::creationDate);
    }
    values.fileSize = status.size;
    if (!status.isRegular() && !status.isSymbolicLink()) {
        values.absent.insert(ResourceKey::fileSize);
    }
    if (!hasDocumentIdentifier(values)) {
        values.absent.insert(ResourceKey::documentIdentifier);
    }
    return values;
}

bool isPackage(const EntryStatus& status, std::string_view name, const PackageTypes& packages) {
    return status.isDirectory() && packages.isPackageName(name);
}

bool hasDocumentIdentifier(const PrefetchedValues& values) {
    return !values.isDirectory || values.isPackage;
}

FileStatus fileStatusOf(const EntryStatus& status, DocumentIndex& documents) {
    return {status.device, status.fileID,
            status.isDirectory() ? folderLinks(status, documents) : status.linkCount,
            status.isDirectory()};
}

}  // namespace marrowdale::native
