#pragma once

#include <memory>
#include <string>
#include <vector>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderApplications.h"

namespace marrowdale {

// Answers a host's request for thumbnails: the icons of the applications whose libraries are asked
// for, and none for everything else. No failure reaches the host as an error. All handlers are
// called on the caller's thread, before the call returns.
class ApplicationThumbnails {
  public:
    // `platform` lives longer.
    explicit ApplicationThumbnails(const Platform& platform) : platform_(platform) {}

    [[nodiscard]] std::unique_ptr<Progress> fetch(
        const std::vector<std::string>& itemIdentifiers,
        const FileProviderApplications::TypedThumbnailHandler& perThumbnailCompletionHandler,
        const std::function<void(const std::optional<Error>&)>& completionHandler) const;
    [[nodiscard]] std::unique_ptr<Progress> fetch(
        const std::vector<std::string>& itemIdentifiers,
        const FileProviderApplications::ThumbnailHandler& perThumbnailCompletionHandler,
        const std::function<void(const std::optional<Error>&)>& completionHandler) const;

  private:
    [[nodiscard]] std::optional<Data> iconData(const std::string& identifier) const;
    [[nodiscard]] std::optional<Data> pngData(const std::string& identifier,
                                              const Data& iconData) const;
    void logReturning(const std::string& identifier, const Data& data) const;

    const Platform& platform_;
};

}  // namespace marrowdale
