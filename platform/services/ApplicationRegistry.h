#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/URL.h"

namespace marrowdale {

// What the system knows of one application. Values are read when they are asked for.
class BundleRecord {
  public:
    virtual ~BundleRecord() = default;
    [[nodiscard]] virtual std::optional<std::string> bundleIdentifier() const = 0;
    // In the user's language; none when the record has no name.
    [[nodiscard]] virtual std::optional<std::string> localizedName() const = 0;
    // The folder that holds the application's data; its documents are in "Documents" below.
    [[nodiscard]] virtual std::optional<URL> dataContainerURL() const = 0;
};

// The applications of this system. Any thread.
class ApplicationRegistry {
  public:
    virtual ~ApplicationRegistry() = default;

    // The record whose data container lies to `url` as asked ("same": is that very folder, or the
    // documents folder in it). Null when there is none.
    [[nodiscard]] virtual std::shared_ptr<const BundleRecord> proxyFor(
        const URL& url, URLRelationship relationship) = 0;

    [[nodiscard]] virtual std::shared_ptr<const BundleRecord> bundleRecordForIdentifier(
        std::string_view bundleIdentifier) = 0;

    // The documents folders that are served, in a lasting order.
    [[nodiscard]] virtual std::vector<URL> documentFolders() = 0;
};

}  // namespace marrowdale
