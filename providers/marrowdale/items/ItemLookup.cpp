#include "providers/marrowdale/items/ItemLookup.h"

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/ItemForIdentifier.h"
#include "providers/marrowdale/items/MRWFileObjectIdentifier.h"
#include "providers/marrowdale/items/ProviderError.h"

namespace marrowdale {

namespace {

constexpr std::string_view documentsName = "Documents";

std::string quoted(std::string_view text) {
    return "\"" + std::string(text) + "\"";
}

// Whether what was found at the place of the one that was asked for has come there since. A file's
// own number names it too, beside its document's, so only like is compared with like.
bool isAnother(const LocalItem& item, std::string_view itemIdentifier) {
    const std::string_view kind = itemIdentifier.substr(0, itemIdentifier.find('=') + 1);
    return !kind.empty() && item.itemIdentifier.starts_with(kind) &&
           item.itemIdentifier != itemIdentifier;
}

Expected<std::shared_ptr<LocalItem>> lookUpItem(const Platform& platform,
                                                std::string_view itemIdentifier) {
    auto item = itemForIdentifierString(platform, itemIdentifier);
    if (!item) {
        platform.log.error("item lookup failed for identifier " + quoted(itemIdentifier));
        return Unexpected(errorForNonExistentItem(itemIdentifier));
    }
    platform.log.debug([&] { return "found " + item->description(); });
    return item;
}

}  // namespace

Expected<URL> urlOfItem(const Platform& platform, std::string_view itemIdentifier) {
    const auto item = itemForIdentifierString(platform, itemIdentifier);
    if (!item || isAnother(*item, itemIdentifier)) {
        return Unexpected(errorForNonExistentItem(itemIdentifier));
    }
    platform.log.debug([&] { return "found " + std::string(itemIdentifier); });
    return item->fileURL;
}

Expected<URL> fetchURLOfItem(const Platform& platform, std::string_view itemIdentifier) {
    const LogSection section(platform.log,
                             [&] { return "fetching URL for " + quoted(itemIdentifier); });
    return urlOfItem(platform, itemIdentifier);
}

std::optional<std::string> identifierOfItemAt(const Platform& platform, const URL& url) {
    if (url.lastPathComponent() == documentsName) {
        return MRWFileObjectIdentifier::fromAppLibraryDataContainerURL(platform, url);
    }
    const auto item = LocalItem::initWithURL(platform, url);
    if (!item) {
        return std::nullopt;
    }
    platform.log.debug([&] { return "found " + item->itemIdentifier; });
    return item->itemIdentifier;
}

std::optional<std::string> fetchIdentifierOfItemAt(const Platform& platform, const URL& url) {
    const LogSection section(platform.log, [&] {
        return "fetching item identifier for " + quoted(url.absoluteString());
    });
    return identifierOfItemAt(platform, url);
}

Expected<std::shared_ptr<LocalItem>> fetchItem(const Platform& platform,
                                               std::string_view itemIdentifier) {
    const LogSection section(
        platform.log, [&] { return "fetching item's properties for " + quoted(itemIdentifier); });
    return lookUpItem(platform, itemIdentifier);
}

Expected<std::shared_ptr<LocalItem>> itemAtURL(const Platform& platform, const URL& url) {
    const auto identifier = identifierOfItemAt(platform, url);
    if (!identifier) {
        platform.log.error("identifier lookup failed for URL " + quoted(url.absoluteString()));
        return Unexpected(
            errorWithProviderCode(ProviderErrorCode::invalidItemURL, url.absoluteString()));
    }
    if (identifier->starts_with('#') || *identifier == VantrelTemporaryLocalFolderItemIdentifier) {
        return lookUpItem(platform, *identifier);
    }
    auto item = LocalItem::initWithURL(platform, url);
    if (!item) {
        platform.log.error("can't create item for URL " + quoted(url.absoluteString()));
        return Unexpected(
            errorWithProviderCode(ProviderErrorCode::itemNotFound, url.absoluteString()));
    }
    return item;
}

}  // namespace marrowdale
