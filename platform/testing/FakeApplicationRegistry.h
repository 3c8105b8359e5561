#pragma once

#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/services/ApplicationRegistry.h"

namespace marrowdale {

// What a test says about an application; changed between calls only.
struct FakeBundleRecord : BundleRecord {
    std::optional<std::string> identifier;
    std::optional<std::string> displayName;
    std::optional<URL> container;
    bool opensInPlace = false;
    bool sharesFiles = false;
    bool isOne = true;
    // None: the record has no readable description.
    std::optional<PropertyListDictionary> info = PropertyListDictionary();
    std::map<int, Data> icons;
    // Called first, with the variant that is asked for.
    std::function<void(int)> onIconAsked;

    [[nodiscard]] std::optional<std::string> bundleIdentifier() const override {
        return identifier;
    }
    [[nodiscard]] std::optional<std::string> localizedName() const override { return displayName; }
    [[nodiscard]] std::optional<URL> dataContainerURL() const override { return container; }
    [[nodiscard]] bool supportsOpenInPlace() const override { return opensInPlace; }
    [[nodiscard]] bool fileSharingEnabled() const override { return sharesFiles; }
    [[nodiscard]] bool isApplication() const override { return isOne; }
    [[nodiscard]] std::optional<Data> iconDataForVariant(int variant) const override {
        if (onIconAsked) {
            onIconAsked(variant);
        }
        const auto icon = icons.find(variant);
        return icon == icons.end() ? std::nullopt : std::optional(icon->second);
    }
};

// The applications that a test adds. Any thread, but for the records themselves.
class FakeApplicationRegistry : public ApplicationRegistry {
  public:
    // An application of the user that shares its documents, whose data container is the folder at
    // `containerPath`.
    std::shared_ptr<FakeBundleRecord> add(std::string identifier, std::string displayName,
                                          std::string_view containerPath);
    // Null: an entry without a record.
    void add(std::shared_ptr<const FakeBundleRecord> record,
             ApplicationKind kind = ApplicationKind::user);
    void remove(std::string_view identifier);
    // The same applications, the last one first.
    void reverse();

    void enumerateApplications(ApplicationKind kind, const RecordBlock& block) override;
    std::shared_ptr<const BundleRecord> proxyFor(const URL& url,
                                                 URLRelationship relationship) override;
    std::shared_ptr<const BundleRecord> bundleRecordForIdentifier(
        std::string_view bundleIdentifier) override;
    // A record without a container where there is none of that identifier.
    std::shared_ptr<const BundleRecord> unarchivedRecord(
        const ArchivedBundleRecord& record) override;
    std::optional<PropertyListDictionary> infoValuesForKeys(
        const BundleRecord& record, std::span<const std::string_view> keys) override;

    // How often the applications of a kind were enumerated, in order.
    [[nodiscard]] std::vector<ApplicationKind> enumerations() const;

  private:
    struct Entry {
        ApplicationKind kind;
        std::shared_ptr<const FakeBundleRecord> record;
    };
    [[nodiscard]] std::vector<Entry> entries() const;

    mutable std::mutex mutex_;
    std::vector<Entry> entries_;                 // guarded by mutex_
    std::vector<ApplicationKind> enumerations_;  // guarded by mutex_
};

}  // namespace marrowdale
