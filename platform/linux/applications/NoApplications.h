#pragma once

#include "platform/services/ApplicationRegistry.h"

namespace marrowdale::native {

// A registry of a system without applications, so the provider serves the storage root alone. Any
// thread.
class NoApplications final : public ApplicationRegistry {
  public:
    void enumerateApplications(ApplicationKind kind, const RecordBlock& block) override;
    std::shared_ptr<const BundleRecord> proxyFor(const URL& url,
                                                 URLRelationship relationship) override;
    std::shared_ptr<const BundleRecord> bundleRecordForIdentifier(
        std::string_view bundleIdentifier) override;
    // Null: no record was ever archived.
    std::shared_ptr<const BundleRecord> unarchivedRecord(
        const ArchivedBundleRecord& record) override;
    std::optional<PropertyListDictionary> infoValuesForKeys(
        const BundleRecord& record, std::span<const std::string_view> keys) override;
};

}  // namespace marrowdale::native
