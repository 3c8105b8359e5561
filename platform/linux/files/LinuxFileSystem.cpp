#include "platform/linux/files/LinuxFileSystem.h"

#include <array>
#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <utility>

#include "platform/linux/files/EntryValues.h"
#include "platform/linux/files/ItemLooks.h"
#include "platform/linux/files/LinuxDirectoryEnumerator.h"
#include "platform/linux/files/LinuxOpenFile.h"

namespace marrowdale::native {

namespace {

// What one look at a status brings, whatever was asked.
constexpr std::array statusKeys{ResourceKey::typeIdentifier, ResourceKey::fileSize,
                                ResourceKey::creationDate,   ResourceKey::contentModificationDate,
                                ResourceKey::fileID,         ResourceKey::isPackage,
                                ResourceKey::isDirectory};

ResourceKeySet keySet() {
    ResourceKeySet keys;
    for (const ResourceKey key : statusKeys) {
        keys.insert(key);
    }
    return keys;
}

void cacheStatusValues(const URL& url, const PrefetchedValues& values) {
    const URL described =
        URL::listedChild(url.deletingLastPathComponent(), url.lastPathComponent(), values);
    for (const ResourceKey key : statusKeys) {
        if (auto value = described.cachedResourceValue(key)) {
            url.setCachedResourceValue(key, std::move(*value));
        }
    }
    const std::string name(url.lastPathComponent());
    url.setCachedResourceValue(ResourceKey::name, name);
    url.setCachedResourceValue(ResourceKey::localizedName, name);
}

FileType fileTypeOf(const EntryStatus& status) {
    return status.isRegular()        ? FileType::regular
           : status.isDirectory()    ? FileType::directory
           : status.isSymbolicLink() ? FileType::symbolicLink
                                     : FileType::other;
}

Error withPath(Error error, const URL& url) {
    error.subject = url.path();
    return error;
}

Expected<void> makeFolder(const URL& url, const ServedTrees& trees) {
    const auto place = Place::of(url, trees);
    if (!place) {
        return Unexpected(place.error());
    }
    if (::mkdirat(place->directory(), place->name(), 0777) == 0) {
        return {};
    }
    const int code = errno;
    if (code == EEXIST) {
        const auto existing =
            place->isServed() ? place->look() : statTarget(place->directory(), place->name());
        if (existing && existing->isDirectory()) {
            return {};
        }
    }
    return Unexpected(errorWithPOSIXCode(code, "make the folder", url.path()));
}

// A link's own place is checked, not where it leads to.
Expected<EntryStatus> statusWithLinks(const Place& place) {
    if (!place.isServed()) {
        return statTarget(place.directory(), place.name());
    }
    auto status = place.look();
    return status && status->isSymbolicLink() ? statTarget(place.directory(), place.name())
                                              : status;
}

}  // namespace

Expected<std::unique_ptr<OpenFile>> LinuxFileSystem::openForEvents(const URL& url) {
    const auto place = Place::of(url, sources_.trees);
    auto opened = place ? place->open(O_PATH) : Unexpected(place.error());
    if (!opened) {
        return Unexpected(opened.error());
    }
    return std::make_unique<LinuxOpenFile>(std::move(*opened), url);
}

Expected<CommonAttributes> LinuxFileSystem::commonAttributes(const OpenFile& file) {
    const auto status = statEntry(file.descriptor(), "");
    if (!status) {
        return Unexpected(withPath(status.error(), file.url()));
    }
    return CommonAttributes{status->device, fileTypeOf(*status),
                            sources_.documents.knownDocumentID(*status), status->fileID,
                            status->linkCount};
}

Expected<FileStatus> LinuxFileSystem::status(const URL& url) {
    if (const PrefetchedValues* known = url.prefetched(); known != nullptr && known->hasStatus) {
        return known->status;
    }
    const auto place = Place::of(url, sources_.trees);
    const auto status = place ? statusWithLinks(*place) : Unexpected(place.error());
    if (!status) {
        return Unexpected(withPath(status.error(), url));
    }
    return fileStatusOf(*status, sources_.documents);
}

Expected<ResourceValue> LinuxFileSystem::resourceValue(const URL& url, ResourceKey key) {
    if (auto cached = url.cachedResourceValue(key)) {
        return std::move(*cached);
    }
    if (key == ResourceKey::parentDirectoryURL) {
        return ResourceValue(url.deletingLastPathComponent().absoluteString());
    }
    auto value = lookUp(url, key);
    if (!value) {
        return Unexpected(itemError(value.error(), url));
    }
    return value;
}

Expected<ResourceValue> LinuxFileSystem::lookUp(const URL& url, ResourceKey key) {
    const auto place = Place::of(url, sources_.trees);
    const auto status = place ? place->look() : Unexpected(place.error());
    if (!status) {
        return Unexpected(status.error());
    }
    const PrefetchedValues values =
        describeEntry(*status, url.lastPathComponent(), keySet(), sources_);
    cacheStatusValues(url, values);
    if (key == ResourceKey::isReadable || key == ResourceKey::isWritable) {
        cacheAccess(url, *place, *status);
    }
    if (key == ResourceKey::documentIdentifier && hasDocumentIdentifier(values)) {
        if (const auto cached = cacheDocumentIdentifier(url, *place, *status); !cached) {
            return Unexpected(cached.error());
        }
    }
    return url.cachedResourceValue(key).value_or(ResourceValue());
}

Expected<void> LinuxFileSystem::cacheDocumentIdentifier(const URL& url, const Place& place,
                                                        const EntryStatus& status) {
    const URL parent = url.deletingLastPathComponent();
    const auto folder = place.hasParent() ? statEntry(place.directory(), "")
                                          : statTarget(AT_FDCWD, parent.path().c_str());
    if (!folder) {
        return Unexpected(folder.error());
    }
    std::array requests{DocumentIndex::Request{folder->fileID, parent.path(),
                                               url.lastPathComponent(), status, DocumentID{}}};
    if (auto assigned = sources_.documents.assignDocumentIDs(requests); !assigned) {
        return assigned;
    }
    url.setCachedResourceValue(ResourceKey::documentIdentifier,
                               Number(std::uint64_t{raw(requests.front().document)}));
    return {};
}

void LinuxFileSystem::cacheAccess(const URL& url, const Place& place, const EntryStatus& status) {
    bool ask = false;
    if (dependsOnAccessList(status, sources_.credentials)) {
        sources_.calls.inFolder(place.directory(), [&](const AttributeCalls::InFolder& folder) {
            const auto answer = accessLists_.read(folder, place.name());
            ask = answer.found.hasAccessList || !answer.complete;
        });
    }
    const Access access = ask ? askAccess(place.directory(), place.name())
                              : computeAccess(status, sources_.credentials, place.mount());
    url.setCachedResourceValue(ResourceKey::isReadable, access.readable);
    url.setCachedResourceValue(ResourceKey::isWritable, access.writable);
}

std::vector<Expected<URL>> LinuxFileSystem::lookAt(std::span<const URL> urls,
                                                   const LookRequest& request) {
    return ItemLooks(request, sources_).lookAt(urls);
}

Expected<std::string> LinuxFileSystem::pathForFileID(DeviceID device, FileID file) {
    return sources_.documents.pathForFileID(device, file);
}

Expected<std::unique_ptr<DirectoryEnumerator>> LinuxFileSystem::enumerateDirectory(
    const DirectoryEnumerationRequest& request) {
    return LinuxDirectoryEnumerator::open(request, sources_);
}

Expected<void> LinuxFileSystem::createDirectory(const URL& url) {
    if (!url.isFileURL()) {
        return Unexpected(errorWithPOSIXCode(EINVAL, "make the folder", url.absoluteString()));
    }
    // Most often only the last one is missing.
    Expected<void> made = makeFolder(url, sources_.trees);
    if (made || made.error().code != ENOENT) {
        return made;
    }
    const std::string& path = url.path();
    for (std::size_t end = path.find('/', 1); end != std::string::npos;
         end = path.find('/', end + 1)) {
        const URL above = URL::fileURL(path.substr(0, end));
        if (const auto done = makeFolder(above, sources_.trees); !done) {
            return done;
        }
    }
    return makeFolder(url, sources_.trees);
}

}  // namespace marrowdale::native
