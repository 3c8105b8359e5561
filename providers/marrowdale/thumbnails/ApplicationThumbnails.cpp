#include "providers/marrowdale/thumbnails/ApplicationThumbnails.h"

#include <utility>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/thumbnails/IconVariants.h"

namespace marrowdale {

namespace {

std::string titleFor(const std::vector<std::string>& identifiers) {
    std::string list;
    for (const std::string& identifier : identifiers) {
        list.append(list.empty() ? "" : ", ").append(identifier);
    }
    return "fetching thumbnails for [" + list + "]";
}

}  // namespace

std::unique_ptr<Progress> ApplicationThumbnails::fetch(
    const std::vector<std::string>& itemIdentifiers,
    const FileProviderApplications::TypedThumbnailHandler& perThumbnailCompletionHandler,
    const std::function<void(const std::optional<Error>&)>& completionHandler) const {
    const LogSection section(platform_.log, [&] { return titleFor(itemIdentifiers); });
    for (const std::string& identifier : itemIdentifiers) {
        const auto data = iconData(identifier);
        if (data) {
            logReturning(identifier, *data);
        }
        perThumbnailCompletionHandler(
            identifier, data,
            data ? std::optional(std::string(VantrelThumbnailFormatCachedBitmap)) : std::nullopt,
            std::nullopt);
    }
    completionHandler(std::nullopt);
    return std::make_unique<Progress>();
}

std::unique_ptr<Progress> ApplicationThumbnails::fetch(
    const std::vector<std::string>& itemIdentifiers,
    const FileProviderApplications::ThumbnailHandler& perThumbnailCompletionHandler,
    const std::function<void(const std::optional<Error>&)>& completionHandler) const {
    const LogSection section(platform_.log, [&] { return titleFor(itemIdentifiers); });
    for (const std::string& identifier : itemIdentifiers) {
        const auto icon = iconData(identifier);
        const auto data = icon ? pngData(identifier, *icon) : std::nullopt;
        if (data) {
            logReturning(identifier, *data);
        }
        perThumbnailCompletionHandler(identifier, data, std::nullopt);
    }
    completionHandler(std::nullopt);
    return std::make_unique<Progress>();
}

std::optional<Data> ApplicationThumbnails::iconData(const std::string& identifier) const {
    if (!identifier.starts_with('#')) {
        return std::nullopt;
    }
    const std::string bundleIdentifier = identifier.substr(1);
    const auto record = platform_.applications.bundleRecordForIdentifier(bundleIdentifier);
    if (!record) {
        platform_.log.debug(
            [&] { return identifier + ": can't get app proxy for " + bundleIdentifier; });
        return std::nullopt;
    }
    auto data = bestIconData(platform_, *record);
    if (!data) {
        platform_.log.debug(
            [&] { return identifier + ": can't get primary icon data; the screen has no scale"; });
    }
    return data;
}

std::optional<Data> ApplicationThumbnails::pngData(const std::string& identifier,
                                                   const Data& iconData) const {
    const auto image = platform_.icons.imageFromCachedBitmap(iconData);
    if (!image) {
        platform_.log.debug([&] { return identifier + ": can't create icon from cached bitmap"; });
        return std::nullopt;
    }
    const auto bytes = platform_.imageEncoder.makeData();
    if (!bytes) {
        platform_.log.error(identifier + ": can't create new data");
        return std::nullopt;
    }
    const auto destination = platform_.imageEncoder.makePNGDestination(*bytes, 1);
    if (!destination) {
        platform_.log.error(identifier + ": can't create image from new data");
        return std::nullopt;
    }
    destination->addImage(*image);
    if (destination->finalize() == ImageDestination::Finalized::no) {
        platform_.log.error(identifier + ": can't finalize image");
        return std::nullopt;
    }
    return Data(std::move(*bytes));
}

void ApplicationThumbnails::logReturning(const std::string& identifier, const Data& data) const {
    platform_.log.debug(
        [&] { return identifier + ": returning " + std::to_string(data.size()) + " bytes"; });
}

}  // namespace marrowdale
