#include "providers/marrowdale/LocalFileProvider.h"

#include <utility>
#include <vector>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/LocalFileEnumerator.h"
#include "providers/marrowdale/LocalRootEnumerator.h"
#include "providers/marrowdale/apps/AppRefresh.h"
#include "providers/marrowdale/fs/FSRetiredReaders.h"
#include "providers/marrowdale/items/ItemForIdentifier.h"
#include "providers/marrowdale/items/LocalItem.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"
#include "providers/marrowdale/items/MRWFileObjectIdentifier.h"
#include "providers/marrowdale/items/ProviderError.h"

namespace marrowdale {

namespace {

constexpr std::string_view documentsName = "Documents";

std::string quoted(std::string_view text) {
    return "\"" + std::string(text) + "\"";
}

bool gathersSeveralTrees(std::string_view identifier) {
    return identifier == VantrelRootContainerItemIdentifier ||
           identifier == VantrelWorkingSetContainerItemIdentifier ||
           identifier == VantrelAllDirectoriesContainerItemIdentifier;
}

}  // namespace

LocalFileProvider::LocalFileProvider(const Platform& platform)
    : platform_(platform), appRefresh_(AppRefresh::begin(platform)) {
    platform_.log.info([] {
        return "auto notify changes on VantrelWorkingSetContainerItemIdentifier at startup";
    });
    platform_.manager.signalEnumeratorForContainerItemIdentifier(
        VantrelWorkingSetContainerItemIdentifier, {});
}

LocalFileProvider::~LocalFileProvider() {
    appRefresh_->end();
    FSRetiredReaders::of(platform_).waitUntilGone();
}

std::optional<URL> LocalFileProvider::URLForItemWithPersistentIdentifier(
    std::string_view itemIdentifier) noexcept {
    const LogSection section(platform_.log,
                             [&] { return "fetching URL for " + quoted(itemIdentifier); });
    const auto url = _urlForItemWithPersistentIdentifier(itemIdentifier);
    if (!url) {
        platform_.log.error("can't find URL matching identifier " + std::string(itemIdentifier) +
                            "; " + url.error().description());
        return std::nullopt;
    }
    return *url;
}

std::optional<std::string> LocalFileProvider::persistentIdentifierForItemAtURL(
    const URL& url) noexcept {
    const LogSection section(platform_.log, [&] {
        return "fetching item identifier for " + quoted(url.absoluteString());
    });
    return _persistentIdentifierForItemAt(url);
}

Expected<FileProviderItemPtr> LocalFileProvider::itemForIdentifier(
    std::string_view itemIdentifier) noexcept {
    const LogSection section(
        platform_.log, [&] { return "fetching item's properties for " + quoted(itemIdentifier); });
    return lookUpItem(itemIdentifier);
}

Expected<std::unique_ptr<FileProviderEnumerator>>
LocalFileProvider::enumeratorForContainerItemIdentifier(
    std::string_view containerItemIdentifier) noexcept {
    std::string container(containerItemIdentifier);
    const LogSection section(
        platform_.log, [&] { return "enumerator for " + std::string(containerItemIdentifier); });
    if (gathersSeveralTrees(container)) {
        return std::make_unique<LocalRootEnumerator>(platform_, std::move(container));
    }
    const auto url = _urlForItemWithPersistentIdentifier(container);
    if (!url) {
        return Unexpected(url.error());
    }
    return std::make_unique<LocalFileEnumerator>(platform_, std::move(container),
                                                 std::vector<URL>{*url});
}

void LocalFileProvider::providePlaceholderAtURL(const URL& /*url*/,
                                                CompletionHandler completionHandler) noexcept {
    completionHandler(std::nullopt);
}

void LocalFileProvider::startProvidingItemAtURL(const URL& /*url*/,
                                                CompletionHandler completionHandler) noexcept {
    completionHandler(std::nullopt);
}

void LocalFileProvider::stopProvidingItemAtURL(const URL& /*url*/) noexcept {}

void LocalFileProvider::itemChangedAtURL(const URL& /*url*/) noexcept {}

Expected<FileProviderItemPtr> LocalFileProvider::itemForURL(const URL& url) {
    const auto identifier = _persistentIdentifierForItemAt(url);
    if (!identifier) {
        platform_.log.error("identifier lookup failed for URL " + quoted(url.absoluteString()));
        return Unexpected(
            errorWithProviderCode(ProviderErrorCode::invalidItemURL, url.absoluteString()));
    }
    if (identifier->starts_with('#') || *identifier == VantrelTemporaryLocalFolderItemIdentifier) {
        return lookUpItem(*identifier);
    }
    auto item = LocalItem::initWithURL(platform_, url);
    if (!item) {
        platform_.log.error("can't create item for URL " + quoted(url.absoluteString()));
        return Unexpected(
            errorWithProviderCode(ProviderErrorCode::itemNotFound, url.absoluteString()));
    }
    return FileProviderItemPtr(std::move(item));
}

Expected<URL> LocalFileProvider::_urlForItemWithPersistentIdentifier(
    std::string_view itemIdentifier) {
    const auto item = itemForIdentifierString(platform_, itemIdentifier);
    if (!item) {
        return Unexpected(errorForNonExistentItem(itemIdentifier));
    }
    platform_.log.debug([&] { return "found " + std::string(itemIdentifier); });
    return item->fileURL;
}

std::optional<std::string> LocalFileProvider::_persistentIdentifierForItemAt(const URL& url) {
    if (url.lastPathComponent() == documentsName) {
        return MRWFileObjectIdentifier::fromAppLibraryDataContainerURL(platform_, url);
    }
    const auto item = LocalItem::initWithURL(platform_, url);
    if (!item) {
        return std::nullopt;
    }
    platform_.log.debug([&] { return "found " + item->itemIdentifier; });
    return item->itemIdentifier;
}

Expected<FileProviderItemPtr> LocalFileProvider::lookUpItem(std::string_view itemIdentifier) {
    auto item = itemForIdentifierString(platform_, itemIdentifier);
    if (!item) {
        platform_.log.error("item lookup failed for identifier " + quoted(itemIdentifier));
        return Unexpected(errorForNonExistentItem(itemIdentifier));
    }
    platform_.log.debug([&] { return "found " + item->description(); });
    return FileProviderItemPtr(std::move(item));
}

}  // namespace marrowdale
