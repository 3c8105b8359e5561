#include "providers/marrowdale/items/LocalItem.h"

#include <charconv>
#include <cstdio>
#include <system_error>
#include <utility>

#include "platform/foundation/FatalError.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/AppLibraryOfURL.h"
#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/ItemForIdentifier.h"
#include "providers/marrowdale/items/LocalAppLibraryItem.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"
#include "providers/marrowdale/items/ParentFolderCache.h"
#include "providers/marrowdale/items/PutBack.h"

namespace marrowdale {

namespace {

constexpr std::string_view folderType = "inode/directory";
constexpr std::string_view inboxName = "Inbox";
constexpr std::string_view documentPrefix = "did=";
constexpr std::uint64_t allCapabilities = allowsReading | allowsWriting | allowsReparenting |
                                          allowsRenaming | allowsTrashing | allowsDeleting;
// A folder's own name and its ".".
constexpr std::uint32_t linksOfAnEmptyFolder = 2;

// The rank as an unsigned number, whatever a foreign hand wrote into the attribute: a negative
// whole number wraps, a fraction that has no such value is 0.
std::uint64_t unsignedRank(const Number& rank) {
    if (const auto* fraction = std::get_if<double>(&rank)) {
        constexpr double end = 18446744073709551616.0;  // 2^64
        return *fraction >= 0 && *fraction < end ? static_cast<std::uint64_t>(*fraction) : 0;
    }
    const auto* whole = std::get_if<std::uint64_t>(&rank);
    return whole ? *whole : static_cast<std::uint64_t>(std::get<std::int64_t>(rank));
}

// The facts that hold for every child of the URL's folder; null when there are none to use.
ParentFolderCache::Facts* sharedFacts(const URL& url, ParentFolderCache* parents) {
    if (!parents || !url.prefetched()) {
        return nullptr;  // only what a listing made is sure to be a plain child of its folder
    }
    ParentFolderCache::Facts& facts = parents->factsFor(url.deletingLastPathComponent());
    return facts.holdsOrdinaryItems ? &facts : nullptr;
}

}  // namespace

ResourceKeySet LocalItem::listingKeys() {
    ResourceKeySet keys{ResourceKey::fileID, ResourceKey::documentIdentifier,
                        ResourceKey::isPackage, ResourceKey::isDirectory};
    for (const ResourceKey key : urlKeys) {
        keys.insert(key);
    }
    return keys;
}

const std::vector<std::string>& LocalItem::listingAttributes() {
    static const std::vector<std::string> names{std::string(xattrLastUsedDateName),
                                                std::string(xattrTagDataName),
                                                std::string(xattrFavoriteRankName)};
    return names;
}

std::shared_ptr<LocalItem> LocalItem::initWithURL(const Platform& platform, const URL& url,
                                                  const Options& options,
                                                  ParentFolderCache* parents) {
    auto item = std::make_shared<LocalItem>(url);
    return item->initialise(platform, options, parents) ? item : nullptr;
}

std::shared_ptr<LocalItem> LocalItem::initWithFileIdentifier(const Platform& platform,
                                                             std::string_view identifier) {
    return itemForIdentifierString(platform, identifier);
}

std::shared_ptr<LocalAppLibraryItem> LocalItem::fetchAppLibraryItem(
    const Platform& platform) const {
    if (hx_isContainer()) {
        return nullptr;
    }
    return appLibraryItemHolding(platform, fileURL);
}

bool LocalItem::initialise(const Platform& platform, const Options& options,
                           ParentFolderCache* parents) {
    if (!readIdentity(platform, options, parents) || !readParent(platform, options, parents) ||
        !readNameAndType(platform, options)) {
        return false;
    }
    if (isTopLevelInbox()) {
        platform.log.debug([] { return "can't create an item for the \"Inbox\" directory"; });
        return false;
    }
    readDatesAndSize(platform);
    capabilities = readCapabilities(platform);
    versionIdentifier = resourceData(platform, fileURL, ResourceKey::contentModificationDate);
    readMetadata(platform);
    if (!readStatus(platform)) {
        return false;
    }
    readDocID();
    readBundleIdentifier(platform, options, parents);
    return true;
}

bool LocalItem::readIdentity(const Platform& platform, const Options& options,
                             ParentFolderCache* parents) {
    auto identifier = options.customItemID;
    if (!identifier) {
        identifier = sharedFacts(fileURL, parents) ? itemIdentifierInServedTree(platform, fileURL)
                                                   : marrowdale::itemIdentifier(platform, fileURL);
    }
    if (!identifier) {
        platform.log.debug([] { return "can't create an item without an ID"; });
        return false;
    }
    itemIdentifier = std::move(*identifier);
    return true;
}

bool LocalItem::readParent(const Platform& platform, const Options& options,
                           ParentFolderCache* parents) {
    if (isRoot()) {
        parentItemIdentifier = itemIdentifier;
        return true;
    }
    auto* facts = options.customParentItemID ? nullptr : sharedFacts(fileURL, parents);
    auto parent = options.customParentItemID;
    if (facts) {
        parent = facts->identifier;
    }
    if (!parent) {
        parent = marrowdale::itemIdentifier(platform, fileURL.deletingLastPathComponent());
        if (facts) {
            facts->identifier = parent;
        }
    }
    if (!parent) {
        platform.log.error(
            "can't create an item without a parent ID (itemIdentifier: " + itemIdentifier + ")");
        return false;
    }
    parentItemIdentifier = std::move(*parent);
    isTrashed = isTrashedPath(fileURL.path());
    return true;
}

bool LocalItem::readNameAndType(const Platform& platform, const Options& options) {
    auto name = options.customFilename;
    if (!name) {
        name = resourceString(platform, fileURL, ResourceKey::name);
    }
    if (!name) {
        platform.log.error(
            "can't create an item without a filename (itemIdentifier: " + itemIdentifier +
            ", parentItemIdentifier: " + parentItemIdentifier + ")");
        return false;
    }
    filename = std::move(*name);
    auto type = resourceString(platform, fileURL, ResourceKey::typeIdentifier);
    if (!type) {
        platform.log.error(
            "can't create an item without a type identifier (itemIdentifier: " + itemIdentifier +
            ", parentItemIdentifier: " + parentItemIdentifier + ", filename: " + filename + ")");
        return false;
    }
    typeIdentifier = std::move(*type);
    return true;
}

bool LocalItem::isTopLevelInbox() const {
    return filename == inboxName && isFolder() &&
           (parentItemIdentifier == VantrelRootContainerItemIdentifier ||
            parentItemIdentifier.starts_with('#'));
}

void LocalItem::readDatesAndSize(const Platform& platform) {
    const auto size = resourceNumber(platform, fileURL, ResourceKey::fileSize);
    documentSize = size ? unsignedValue(*size) : std::nullopt;
    creationDate = resourceDate(platform, fileURL, ResourceKey::creationDate);
    contentModificationDate = resourceDate(platform, fileURL, ResourceKey::contentModificationDate);
}

std::uint64_t LocalItem::readCapabilities(const Platform& platform) const {
    if (isRoot() || !resourceBoolean(platform, fileURL, ResourceKey::isWritable).value_or(false)) {
        return allowsReading;
    }
    return isAppLibrary() ? allowsReading | allowsWriting : allCapabilities;
}

void LocalItem::readMetadata(const Platform& platform) {
    ItemMetadata metadata = readItemMetadata(
        platform, fileURL, isAppLibrary() ? LastUsedDate::leftOut : LastUsedDate::read);
    lastUsedDate = metadata.lastUsedDate;
    tagData = std::move(metadata.tagData);
    favoriteRank = metadata.favoriteRank;
}

bool LocalItem::readStatus(const Platform& platform) {
    const PrefetchedValues* values = fileURL.prefetched();
    const auto status = values && values->hasStatus ? Expected<FileStatus>(values->status)
                                                    : platform.fileSystem.status(fileURL);
    if (!status) {
        platform.log.error("can't find fileID for item \"" + fileURL.path() + "\"; " +
                           status.error().description());
        return false;
    }
    fileID = raw(status->fileID);
    if (isFolder() && status->isDirectory) {
        if (status->linkCount < linksOfAnEmptyFolder) {
            fatalError("a folder with fewer than two links: " + fileURL.path());
        }
        childItemCount = static_cast<std::uint16_t>(status->linkCount - linksOfAnEmptyFolder);
    }
    return true;
}

void LocalItem::readDocID() {
    if (!itemIdentifier.starts_with(documentPrefix)) {
        return;
    }
    std::uint64_t number = 0;
    const char* const end = itemIdentifier.data() + itemIdentifier.size();
    const auto read = std::from_chars(itemIdentifier.data() + documentPrefix.size(), end, number);
    if (read.ec == std::errc()) {
        docID = number;
    }
}

void LocalItem::readBundleIdentifier(const Platform& platform, const Options& options,
                                     ParentFolderCache* parents) {
    if (!options.hasLumenoDomainIdentifier) {
        return;
    }
    auto* facts = options.bundleIdentifier ? nullptr : sharedFacts(fileURL, parents);
    auto bundle = options.bundleIdentifier;
    if (facts && facts->knowsBundleIdentifier) {
        bundle = facts->bundleIdentifier;
    } else if (!bundle) {
        bundle = bundleIdentifierOfLibraryWithURL(platform, fileURL);
    }
    if (facts) {
        facts->bundleIdentifier = bundle;
        facts->knowsBundleIdentifier = true;
    }
    hx_lumenoDomainIdentifier = bundle;
    hx_appContainerBundleIdentifier = std::move(bundle);
}

std::optional<URL> LocalItem::putBackURL(const Platform& platform) {
    if (!putBackURL_) {
        putBackURL_ = readPutBackURL(platform, fileURL);
    }
    return *putBackURL_;
}

bool LocalItem::isRoot() const {
    return itemIdentifier == VantrelRootContainerItemIdentifier;
}

bool LocalItem::isFolder() const {
    return typeIdentifier == folderType;
}

std::string LocalItem::description() const {
    std::array<char, 2 * sizeof(void*) + 3> address{};
    std::snprintf(address.data(), address.size(), "%p", static_cast<const void*>(this));
    std::string text = "<" + std::string(className()) + ":" + address.data() + " " +
                       itemIdentifier + " name:\"" + filename + "\"";
    text += parentItemIdentifier == VantrelRootContainerItemIdentifier
                ? " parent:root"
                : " parent:" + parentItemIdentifier;
    text += " type:" + typeIdentifier;
    if (isTrashed) {
        text += " trashed";
    }
    if (favoriteRank) {
        text += " favorite:" + std::to_string(unsignedRank(*favoriteRank));
    }
    return text + ">";
}

bool isTrashedPath(std::string_view path) {
    constexpr std::string_view trash = "/Documents/.Trash";
    for (auto at = path.find(trash); at != std::string_view::npos; at = path.find(trash, at + 1)) {
        const auto end = at + trash.size();
        if (end == path.size() || path[end] == '/') {
            return true;
        }
    }
    return false;
}

}  // namespace marrowdale
