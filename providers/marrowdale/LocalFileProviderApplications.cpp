// What the host asks the provider about applications.

#include <utility>

#include "providers/marrowdale/LocalFileProvider.h"
#include "providers/marrowdale/apps/AppRefresh.h"
#include "providers/marrowdale/apps/DefaultApplicationContainer.h"
#include "providers/marrowdale/thumbnails/ApplicationThumbnails.h"
#include "providers/marrowdale/thumbnails/IconVariants.h"

namespace marrowdale {

void LocalFileProvider::_refreshInstalledAppsWithCompletionHandler(
    std::function<void()> completionHandler) noexcept {
    appRefresh_->request(std::move(completionHandler));
}

void LocalFileProvider::_defaultApplicationContainerForBundleIdentifier(
    std::string_view bundleIdentifier,
    std::function<void(Expected<FileProviderItemPtr>)> completionHandler) noexcept {
    completionHandler(defaultApplicationContainer(platform_, bundleIdentifier));
}

std::unique_ptr<Progress> LocalFileProvider::fetchThumbnailsForItemIdentifiers(
    const std::vector<std::string>& itemIdentifiers, ThumbnailSize /*requestedSize*/,
    const TypedThumbnailHandler& perThumbnailCompletionHandlerWithType,
    const std::function<void(const std::optional<Error>&)>& completionHandler) noexcept {
    return ApplicationThumbnails(platform_).fetch(
        itemIdentifiers, perThumbnailCompletionHandlerWithType, completionHandler);
}

std::unique_ptr<Progress> LocalFileProvider::fetchThumbnailsForItemIdentifiers(
    const std::vector<std::string>& itemIdentifiers, ThumbnailSize /*requestedSize*/,
    const ThumbnailHandler& perThumbnailCompletionHandler,
    const std::function<void(const std::optional<Error>&)>& completionHandler) noexcept {
    return ApplicationThumbnails(platform_).fetch(itemIdentifiers, perThumbnailCompletionHandler,
                                                  completionHandler);
}

std::optional<Data> LocalFileProvider::bestIconData(const BundleRecord& record) const {
    return marrowdale::bestIconData(platform_, record);
}

}  // namespace marrowdale
