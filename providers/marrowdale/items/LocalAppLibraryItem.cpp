#include "providers/marrowdale/items/LocalAppLibraryItem.h"

#include <string>
#include <variant>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/ItemLook.h"
#include "providers/marrowdale/items/MRWFileObjectIdentifier.h"

namespace marrowdale {

namespace {

constexpr std::string_view documentsName = "Documents";
constexpr std::string_view inboxName = "Inbox";
constexpr std::string_view trashName = ".Trash";

// A real folder, which the link count of the folder it is in tells of; a link to one is not.
bool isRealFolder(const Platform& platform, const URL& url) {
    const auto value = platform.fileSystem.resourceValue(url, ResourceKey::isDirectory);
    const bool* isDirectory = value ? std::get_if<bool>(&*value) : nullptr;
    return isDirectory && *isDirectory;
}

}  // namespace

std::shared_ptr<LocalAppLibraryItem> LocalAppLibraryItem::initFrom(const Platform& platform,
                                                                   const BundleRecord& record) {
    const auto container = record.dataContainerURL();
    if (!container) {
        platform.log.error("can't create an app library item without a data container URL");
        return nullptr;
    }
    auto item = std::make_shared<LocalAppLibraryItem>(
        lookedAt(platform, container->appendingPathComponent(documentsName)));
    const Options options{.customItemID = appLibraryIdentifier(record),
                          .customParentItemID = std::string(VantrelRootContainerItemIdentifier),
                          .customFilename = record.localizedName(),
                          .hasLumenoDomainIdentifier = false,
                          .bundleIdentifier = record.bundleIdentifier()};
    if (!item->initialise(platform, options, nullptr)) {
        return nullptr;
    }
    item->leaveOutHiddenFolders(platform);
    return item;
}

void LocalAppLibraryItem::leaveOutHiddenFolders(const Platform& platform) {
    for (const std::string_view name : {inboxName, trashName}) {
        // A folder made after the links were counted is not in the count, which then stays at zero.
        if (childItemCount.value_or(0) > 0 &&
            isRealFolder(platform, fileURL.appendingPathComponent(name))) {
            --*childItemCount;
        }
    }
}

}  // namespace marrowdale
