#include "providers/marrowdale/items/MRFileObjectIdentifier.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <charconv>
#include <chrono>
#include <limits>
#include <memory>
#include <system_error>
#include <thread>
#include <utility>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/MRWAppLibraryManager.h"
#include "providers/marrowdale/items/MRWFileObjectIdentifier.h"

namespace marrowdale {

namespace {

constexpr int resolutionRetries = 5;
constexpr std::chrono::microseconds resolutionRest{1000};

std::string quoted(std::string_view text) {
    return "\"" + std::string(text) + "\"";
}

// Whether the URL lies in a served tree, or is the top of one; `identifier` is then the top's.
struct Place {
    bool isServed = false;
    std::optional<std::string> identifier;
};

Place placeInAppLibraries(const Platform& platform, const URL& url) {
    for (const URL& folder : MRWAppLibraryManager::rootURLsForAppLibraries(platform)) {
        switch (relationship(folder, url)) {
            case URLRelationship::contains:
                return {.isServed = true, .identifier = {}};
            case URLRelationship::same:
                return {.isServed = false,
                        .identifier = MRWFileObjectIdentifier::fromAppLibraryDataContainerURL(
                            platform, folder)};
            case URLRelationship::other:
                break;
        }
    }
    platform.log.debug([&] {
        return "can't compute file object identifier because " + quoted(url.standardized().path()) +
               " is not part of Marrowdale";
    });
    return {};
}

Place placeOf(const Platform& platform, const URL& url) {
    switch (relationship(platform.manager.documentStorageURL(), url)) {
        case URLRelationship::same:
            return {.isServed = false,
                    .identifier = std::string(VantrelRootContainerItemIdentifier)};
        case URLRelationship::contains:
            return {.isServed = true, .identifier = {}};
        case URLRelationship::other:
            break;
    }
    return placeInAppLibraries(platform, url);
}

// How an item's number is read from its URL, and the words for it.
struct NumberKind {
    ResourceKey key;
    std::string_view shortName;
    std::string (*identifier)(std::uint64_t);
};
constexpr NumberKind folderNumber{ResourceKey::fileID, "file ID",
                                  &MRWFileObjectIdentifier::fromFileID};
constexpr NumberKind documentNumber{ResourceKey::documentIdentifier, "doc ID",
                                    &MRWFileObjectIdentifier::fromDocumentID};

bool isNoSuchFile(const Error& error) {
    return error.domain == ErrorDomain::file &&
           error.code == static_cast<int>(FileErrorCode::noSuchFile);
}

enum class Cached { answered, failed, nothing };

// The identifier that follows from the number cached on the URL.
Cached identifierFromResource(const Platform& platform, const URL& url, const NumberKind& kind,
                              std::string& identifier) {
    const auto value = platform.fileSystem.resourceValue(url, kind.key);
    if (!value) {
        const LogLevel level = isNoSuchFile(value.error()) ? LogLevel::debug : LogLevel::error;
        if (platform.log.isEnabled(level)) {
            platform.log.write(level, "can't get resource value for " +
                                          std::string(name(kind.key)) + "; " +
                                          value.error().description());
        }
        return Cached::failed;
    }
    if (const auto* number = std::get_if<Number>(&*value)) {
        identifier = kind.identifier(unsignedValue(*number).value_or(0));
        return Cached::answered;
    }
    if (!std::holds_alternative<std::monostate>(*value)) {
        platform.log.error("unexpected class for " + std::string(kind.shortName) +
                           " (expected: OrbNumber, actual: " + std::string(className(*value)) +
                           ")");
    }
    return Cached::nothing;
}

// What the listing that made the URL learnt, without a detour through general values.
std::optional<std::string> identifierFromListing(const URL& url) {
    const PrefetchedValues* values = url.prefetched();
    if (!values || !values->known.contains(ResourceKey::isDirectory) ||
        !values->known.contains(ResourceKey::isPackage)) {
        return std::nullopt;
    }
    const bool isFolder = values->isDirectory && !values->isPackage;
    const ResourceKey key = isFolder ? ResourceKey::fileID : ResourceKey::documentIdentifier;
    if (!values->known.contains(key) || values->absent.contains(key)) {
        return std::nullopt;
    }
    if (!isFolder && values->documentIdentifier == DocumentID{}) {
        return std::nullopt;
    }
    return isFolder ? MRWFileObjectIdentifier::fromFileID(raw(values->fileID))
                    : MRWFileObjectIdentifier::fromDocumentID(raw(values->documentIdentifier));
}

// Numbers for the boxes that file identifiers are carried in.
struct NumberBoxHandles {
    static constexpr std::uint64_t topBit = std::uint64_t{1} << 63U;
    std::atomic<std::uint64_t> next{topBit};
};

void cacheNumber(const Platform& platform, const URL& url, ResourceKey key, std::uint64_t number,
                 std::string_view keyText) {
    if (!url.setCachedResourceValue(key, Number(number))) {
        platform.log.debug([&] {
            return "can't cache value " + std::to_string(number) + " for key " +
                   std::string(keyText) + "; " + errorWithPOSIXCode(EINVAL).description();
        });
    }
}

// The identifier is made of the box's handle and not of the number in it, so it does not resolve
// back; it is unlike every inode number that resolves, for its top bit is set. The number itself is
// cached, and names the folder from then on.
std::string folderIdentifier(const Platform& platform, const URL& url, FileID fileID) {
    cacheNumber(platform, url, ResourceKey::fileID, raw(fileID), "OrbURLFileResourceIdentifierKey");
    auto& handles = platform.shared.get<NumberBoxHandles>("marrowdale.number-box-handles");
    return MRWFileObjectIdentifier::fromFileID(handles.next++);
}

std::optional<std::string> documentIdentifier(const Platform& platform, const URL& url,
                                              const OpenFile& file, DocumentID documentID) {
    if (documentID == DocumentID{}) {
        const auto allocated = platform.generationStore.getOrAllocateDocumentID(file);
        if (!allocated || *allocated == DocumentID{}) {
            platform.log.error("can't get permanent storage for " + quoted(url.path()));
            return std::nullopt;
        }
        documentID = *allocated;
    }
    cacheNumber(platform, url, ResourceKey::documentIdentifier, raw(documentID),
                name(ResourceKey::documentIdentifier));
    return MRWFileObjectIdentifier::fromDocumentID(raw(documentID));
}

// Looks at the item itself.
std::optional<std::string> identifierFromAttributes(const Platform& platform, const URL& url) {
    const auto package = platform.fileSystem.resourceValue(url, ResourceKey::isPackage);
    if (!package) {
        platform.log.error("can't get resource OrbURLIsPackageKey for " + quoted(url.path()) +
                           "; " + package.error().description());
        return std::nullopt;
    }
    const auto file = platform.fileSystem.openForEvents(url);
    if (!file) {
        platform.log.error("can't open file at " + quoted(url.path()) + "; " +
                           std::to_string(file.error().code));
        return std::nullopt;
    }
    const auto attributes = platform.fileSystem.commonAttributes(**file);
    if (!attributes) {
        platform.log.error("can't get attribute list for " + quoted(url.path()) + "; " +
                           std::to_string(attributes.error().code));
        return std::nullopt;
    }
    const bool* flag = std::get_if<bool>(&*package);
    const bool isPackage = flag && *flag;
    const bool isFileLike = attributes->type == FileType::regular ||
                            (attributes->type == FileType::directory && isPackage);
    return isFileLike ? documentIdentifier(platform, url, **file, attributes->documentID)
                      : folderIdentifier(platform, url, attributes->fileID);
}

// Leading digits, with a sign in front if there is one; 0 for text that is no number, the nearest
// number for one that is too large.
std::int64_t leadingNumber(std::string_view text) {
    if (text.starts_with('+')) {
        text.remove_prefix(1);
        if (text.starts_with('-')) {
            return 0;
        }
    }
    std::int64_t number = 0;
    const auto result = std::from_chars(text.data(), text.data() + text.size(), number);
    if (result.ec == std::errc::result_out_of_range) {
        return text.starts_with('-') ? std::numeric_limits<std::int64_t>::min()
                                     : std::numeric_limits<std::int64_t>::max();
    }
    return number;
}

// Numbers that no document can have are answered here, for cutting them to the width of a document
// identifier would make them another document's.
Expected<FileID> resolve(const Platform& platform, std::int64_t document, DeviceID device) {
    if (document <= 0 || document > std::numeric_limits<std::uint32_t>::max()) {
        return Unexpected(errorWithPOSIXCode(ENOENT));
    }
    auto file = platform.generationStore.resolveDocumentID(
        DocumentID{static_cast<std::uint32_t>(document)}, device);
    if (file && *file == FileID{}) {
        return Unexpected(errorWithPOSIXCode(ENOENT));
    }
    return file;
}

bool isWorthAnotherTry(const Error& error) {
    return error.domain == ErrorDomain::posix &&
           (error.code == EAGAIN || error.code == EBUSY || error.code == ESTALE);
}

std::optional<FileID> resolveDocument(const Platform& platform, std::int64_t document,
                                      DeviceID device) {
    auto file = resolve(platform, document, device);
    for (int retry = 0; retry < resolutionRetries; ++retry) {
        if (file || !isWorthAnotherTry(file.error())) {
            break;
        }
        platform.log.debug([&] {
            return "doc ID resolution failed with errno(" + std::to_string(file.error().code) +
                   "), let's try again after resting";
        });
        std::this_thread::sleep_for(resolutionRest);
        file = resolve(platform, document, device);
    }
    if (file) {
        return *file;
    }
    const std::string text = "can't resolve doc ID " + quoted(std::to_string(document));
    if (isWorthAnotherTry(file.error())) {
        platform.log.debug([&] { return text + " after five attempts"; });
    } else {
        platform.log.error(text + "; " + std::to_string(file.error().code));
    }
    return std::nullopt;
}

// The volume of the storage root; none, after a line in the log, when it can't be told.
std::optional<DeviceID> storageDevice(const Platform& platform) {
    const URL& root = platform.manager.documentStorageURL();
    const auto device = deviceIDWithError(platform, root);
    if (!device || *device == DeviceID{}) {
        platform.log.error("can't get device ID for " + quoted(root.path()) + "; " +
                           std::to_string(device ? 0 : device.error().code));
        return std::nullopt;
    }
    return *device;
}

}  // namespace

Expected<DeviceID> deviceIDWithError(const Platform& platform, const URL& url) {
    const auto file = platform.fileSystem.openForEvents(url);
    if (!file) {
        return Unexpected(errorWithPOSIXCode(file.error().code));
    }
    const auto attributes = platform.fileSystem.commonAttributes(**file);
    if (!attributes) {
        return Unexpected(errorWithPOSIXCode(attributes.error().code));
    }
    return attributes->device;
}

DeviceID deviceID(const Platform& platform, const URL& url) {
    return deviceIDWithError(platform, url).value_or(DeviceID{});
}

std::optional<std::string> itemIdentifier(const Platform& platform, const URL& url) {
    if (!url.isFileURL()) {
        platform.log.error("can't compute file object identifier if not a file URL");
        return std::nullopt;
    }
    Place place = placeOf(platform, url);
    return place.isServed ? itemIdentifierInServedTree(platform, url) : std::move(place.identifier);
}

std::optional<std::string> itemIdentifierInServedTree(const Platform& platform, const URL& url) {
    if (auto identifier = identifierFromListing(url)) {
        return identifier;
    }
    std::string identifier;
    switch (identifierFromResource(
        platform, url, hx_isFolder(platform, url) ? folderNumber : documentNumber, identifier)) {
        case Cached::answered:
            return identifier;
        case Cached::failed:
            return std::nullopt;
        case Cached::nothing:
            break;
    }
    return identifierFromAttributes(platform, url);
}

std::optional<URL> fileURLWithItemIdentifier(const Platform& platform,
                                             std::string_view identifier) {
    if (identifier == VantrelRootContainerItemIdentifier) {
        return platform.manager.documentStorageURL();
    }
    const auto components = std::ranges::count(identifier, '=') + 1;
    if (components != 2) {
        platform.log.error("invalid identifier; identifier should have 2 components, not " +
                           std::to_string(components));
        return std::nullopt;
    }
    const auto split = identifier.find('=');
    const std::string_view kind = identifier.substr(0, split);
    if (kind != "did" && kind != "fid") {
        platform.log.error("invalid host for identifier " + quoted(identifier));
        return std::nullopt;
    }
    const auto device = storageDevice(platform);
    if (!device) {
        return std::nullopt;
    }
    const std::int64_t number = leadingNumber(identifier.substr(split + 1));
    const auto file = kind == "fid" ? std::optional(FileID{static_cast<std::uint64_t>(number)})
                                    : resolveDocument(platform, number, *device);
    return file ? _fileURLWithFileIdentifier(platform, *file, *device) : std::nullopt;
}

std::optional<FileID> fileWithItemIdentifier(const Platform& platform,
                                             std::string_view identifier) {
    const bool isDocument = identifier.starts_with("did=");
    if (!isDocument && !identifier.starts_with("fid=")) {
        return std::nullopt;
    }
    const std::int64_t number = leadingNumber(identifier.substr(identifier.find('=') + 1));
    if (!isDocument) {
        return FileID{static_cast<std::uint64_t>(number)};
    }
    const auto device = storageDevice(platform);
    return device ? resolveDocument(platform, number, *device) : std::nullopt;
}

std::optional<URL> fileURLWithFileIdentifier(const Platform& platform, FileID fileID) {
    const auto device = storageDevice(platform);
    return device ? _fileURLWithFileIdentifier(platform, fileID, *device) : std::nullopt;
}

std::optional<URL> _fileURLWithFileIdentifier(const Platform& platform, FileID fileID,
                                              DeviceID deviceIdentifier) {
    const auto path = platform.fileSystem.pathForFileID(deviceIdentifier, fileID);
    if (!path) {
        platform.log.debug([&] {
            return "can't resolve path matching file ID " +
                   quoted(std::to_string(static_cast<std::int64_t>(raw(fileID)))) + "; " +
                   std::to_string(path.error().code);
        });
        return std::nullopt;
    }
    return URL::fileURL(*path);
}

}  // namespace marrowdale
