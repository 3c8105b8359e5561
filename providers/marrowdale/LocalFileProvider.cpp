#include "providers/marrowdale/LocalFileProvider.h"

#include <utility>
#include <vector>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/LocalFileEnumerator.h"
#include "providers/marrowdale/LocalRootEnumerator.h"
#include "providers/marrowdale/apps/AppRefresh.h"
#include "providers/marrowdale/apps/LocalAppLibraryManager.h"
#include "providers/marrowdale/fs/FSRetiredReaders.h"
#include "providers/marrowdale/items/ItemLookup.h"

namespace marrowdale {

namespace {

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
    // Identifiers and items know its libraries from the first look-up on, refreshed or not.
    (void)LocalAppLibraryManager::shared(platform_);
}

LocalFileProvider::~LocalFileProvider() {
    appRefresh_->end();
    FSRetiredReaders::of(platform_).waitUntilGone();
}

std::optional<URL> LocalFileProvider::URLForItemWithPersistentIdentifier(
    std::string_view itemIdentifier) noexcept {
    const LogSection section(platform_.log,
                             [&] { return "fetching URL for " + quoted(itemIdentifier); });
    const auto url = urlOfItem(platform_, itemIdentifier);
    if (!url) {
        platform_.log.error("can't find URL matching identifier " + std::string(itemIdentifier) +
                            "; " + url.error().description());
        return std::nullopt;
    }
    return *url;
}

std::optional<std::string> LocalFileProvider::persistentIdentifierForItemAtURL(
    const URL& url) noexcept {
    return fetchIdentifierOfItemAt(platform_, url);
}

Expected<FileProviderItemPtr> LocalFileProvider::itemForIdentifier(
    std::string_view itemIdentifier) noexcept {
    auto item = fetchItem(platform_, itemIdentifier);
    return item ? Expected<FileProviderItemPtr>(std::move(*item)) : Unexpected(item.error());
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
    auto item = itemAtURL(platform_, url);
    return item ? Expected<FileProviderItemPtr>(std::move(*item)) : Unexpected(item.error());
}

Expected<URL> LocalFileProvider::_urlForItemWithPersistentIdentifier(
    std::string_view itemIdentifier) {
    return urlOfItem(platform_, itemIdentifier);
}

std::optional<std::string> LocalFileProvider::_persistentIdentifierForItemAt(const URL& url) {
    return identifierOfItemAt(platform_, url);
}

}  // namespace marrowdale
