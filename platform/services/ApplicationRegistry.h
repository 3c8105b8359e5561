#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "platform/foundation/Data.h"
#include "platform/foundation/KeyedArchive.h"
#include "platform/foundation/PropertyList.h"
#include "platform/foundation/URL.h"

namespace marrowdale {

// What the system knows of one application. Values are read when they are asked for, so a record
// that is kept tells what is true now; a record whose application is gone answers its identifier
// alone. Any thread.
class BundleRecord {
  public:
    virtual ~BundleRecord() = default;
    [[nodiscard]] virtual std::optional<std::string> bundleIdentifier() const = 0;
    // In the user's language; none when the record has no name.
    [[nodiscard]] virtual std::optional<std::string> localizedName() const = 0;
    // The folder that holds the application's data; its documents are in "Documents" below.
    [[nodiscard]] virtual std::optional<URL> dataContainerURL() const = 0;
    [[nodiscard]] virtual bool supportsOpenInPlace() const = 0;
    [[nodiscard]] virtual bool fileSharingEnabled() const = 0;
    // False for a record of something else that is registered (a link, a folder of a menu).
    [[nodiscard]] virtual bool isApplication() const = 0;
    // The icon in the icon service's cached-bitmap form, in the size of a variant (in pixels:
    // 0 is 60, 1 is 76, 15 is 120, 24 is 152, 32 is 180). None for another variant, and where the
    // icon has nothing to show at that size. Variants 0 and 1 always have data, for every
    // application that is installed and for every one that is gone.
    [[nodiscard]] virtual std::optional<Data> iconDataForVariant(int variant) const = 0;
};

// For log lines.
[[nodiscard]] std::string description(const BundleRecord& record);

// A record in an archive is its bundle identifier, empty where it has none.
[[nodiscard]] ArchivedBundleRecord archived(const BundleRecord& record);

// Which applications an enumeration visits.
enum class ApplicationKind : std::uint8_t { user = 0, system = 2 };

// The applications of this system. Any thread.
class ApplicationRegistry {
  public:
    virtual ~ApplicationRegistry() = default;

    // Null stands for an entry that no record could be made of.
    using RecordBlock = std::function<void(std::shared_ptr<const BundleRecord>)>;
    // Calls the block once for each application of that kind, on the caller's thread, in an order
    // that stays the same while the applications do. What the user has under an identifier hides
    // what the system has under it.
    virtual void enumerateApplications(ApplicationKind kind, const RecordBlock& block) = 0;

    // The record whose data container lies to `url` as asked ("same": is that very folder, or the
    // documents folder in it). Null when there is none.
    [[nodiscard]] virtual std::shared_ptr<const BundleRecord> proxyFor(
        const URL& url, URLRelationship relationship) = 0;

    // Null when no such application is installed.
    [[nodiscard]] virtual std::shared_ptr<const BundleRecord> bundleRecordForIdentifier(
        std::string_view bundleIdentifier) = 0;

    // The record that was archived, whether or not its application is installed still.
    [[nodiscard]] virtual std::shared_ptr<const BundleRecord> unarchivedRecord(
        const ArchivedBundleRecord& record) = 0;

    // What the application says about itself under these keys; a key of which it says nothing is
    // left out. None when the application's own description can't be read.
    [[nodiscard]] virtual std::optional<PropertyListDictionary> infoValuesForKeys(
        const BundleRecord& record, std::span<const std::string_view> keys) = 0;
};

}  // namespace marrowdale
