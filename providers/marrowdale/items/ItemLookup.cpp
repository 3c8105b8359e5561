#include "providers/marrowdale/items/ItemLookup.h"

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/ItemForIdentifier.h"
#include "providers/marrowdale/items/ItemLook.h"
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

struct Identified {
    std::optional<std::string> identifier;
    std::shared_ptr<LocalItem> item;  // that has it; null for an app library
};

Identified identifyItemAt(const Platform& platform, const URL& url) {
    if (url.lastPathComponent() == documentsName) {
        return {
            .identifier = MRWFileObjectIdentifier::fromAppLibraryDataContainerURL(platform, url),
            .item = nullptr};
    }
    // What a listing handed out was looked at already.
    auto item = LocalItem::initWithURL(platform, url.prefetched() ? url : lookedAt(platform, url));
    if (!item) {
        return {};
    }
    platform.log.debug([&] { return "found " + item->itemIdentifier; });
    return {.identifier = item->itemIdentifier, .item = std::move(item)};
}

}  // namespace

Expected<URL> urlOfItem(const Platform& platform, std::string_view itemIdentifier) {
    const auto item = itemForIdentifierString(platform, itemIdentifier);
    if (!item || isAnother(*item, itemIdentifier)) {
        return Unexpected(errorForNonExistentItem(itemIdentifier));
    }
    platform.log.debug([&] { return "found " + std::string(itemIdentifier); });
    return item->fileURL.withoutCachedValues();
}

Expected<URL> fetchURLOfItem(const Platform& platform, std::string_view itemIdentifier) {
    const LogSection section(platform.log,
                             [&] { return "fetching URL for " + quoted(itemIdentifier); });
    return urlOfItem(platform, itemIdentifier);
}

std::optional<std::string> identifierOfItemAt(const Platform& platform, const URL& url) {
    return identifyItemAt(platform, url).identifier;
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
    auto [identifier, item] = identifyItemAt(platform, url);
    if (!identifier) {
        platform.log.error("identifier lookup failed for URL " + quoted(url.absoluteString()));
        return Unexpected(
            errorWithProviderCode(ProviderErrorCode::invalidItemURL, url.absoluteString()));
    }
    if (identifier->starts_with('#') || *identifier == VantrelTemporaryLocalFolderItemIdentifier) {
        return lookUpItem(platform, *identifier);
    }
    // From the same look it would be the same once more.
    if (!item->fileURL.prefetched()) {
        item = LocalItem::initWithURL(platform, url);
    }
    if (!item) {
        platform.log.error("can't create item for URL " + quoted(url.absoluteString()));
        return Unexpected(
            errorWithProviderCode(ProviderErrorCode::itemNotFound, url.absoluteString()));
    }
    return item;
}

}  // namespace marrowdale
