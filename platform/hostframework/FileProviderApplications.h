#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Data.h"
#include "platform/foundation/Error.h"
#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale {

// How far a request has got, for hosts that show it. No counts are set by requests that are done
// when they return.
struct Progress {
    std::optional<std::uint64_t> totalUnitCount;
    std::uint64_t completedUnitCount = 0;
};

// In points; providers may answer any size.
struct ThumbnailSize {
    double width = 0;
    double height = 0;
};

// What a host asks about applications: their document folders and icons. Any thread, several at
// once.
class FileProviderApplications {
  public:
    virtual ~FileProviderApplications() = default;

    // Reads the registry of applications again, soon. A handler is called after every refresh from
    // then on, for as long as the extension lives; an empty one only asks.
    virtual void _refreshInstalledAppsWithCompletionHandler(
        std::function<void()> completionHandler) = 0;
    virtual void _defaultApplicationContainerForBundleIdentifier(
        std::string_view bundleIdentifier,
        std::function<void(Expected<FileProviderItemPtr>)> completionHandler) = 0;

    // One call an identifier, in order, before the request returns; no data where there is no
    // thumbnail, which is no error.
    using ThumbnailHandler =
        std::function<void(std::string_view itemIdentifier, const std::optional<Data>& data,
                           const std::optional<Error>& error)>;
    // `formatIdentifier`: what the data is; none without data.
    using TypedThumbnailHandler = std::function<void(
        std::string_view itemIdentifier, const std::optional<Data>& data,
        const std::optional<std::string>& formatIdentifier, const std::optional<Error>& error)>;

    // The icons in the icon service's own form.
    virtual std::unique_ptr<Progress> fetchThumbnailsForItemIdentifiers(
        const std::vector<std::string>& itemIdentifiers, ThumbnailSize requestedSize,
        const TypedThumbnailHandler& perThumbnailCompletionHandlerWithType,
        const std::function<void(const std::optional<Error>&)>& completionHandler) = 0;
    // The icons as PNG.
    virtual std::unique_ptr<Progress> fetchThumbnailsForItemIdentifiers(
        const std::vector<std::string>& itemIdentifiers, ThumbnailSize requestedSize,
        const ThumbnailHandler& perThumbnailCompletionHandler,
        const std::function<void(const std::optional<Error>&)>& completionHandler) = 0;
};

}  // namespace marrowdale
