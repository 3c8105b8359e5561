#pragma once

#include "platform/services/ApplicationRegistry.h"

namespace marrowdale::native {

// A registry of a system without applications: it knows no record and serves no documents folder,
// so the provider serves the storage root alone. Any thread.
class NoApplications final : public ApplicationRegistry {
  public:
    [[nodiscard]] std::shared_ptr<const BundleRecord> proxyFor(
        const URL& url, URLRelationship relationship) override;
    [[nodiscard]] std::shared_ptr<const BundleRecord> bundleRecordForIdentifier(
        std::string_view bundleIdentifier) override;
    [[nodiscard]] std::vector<URL> documentFolders() override;
};

}  // namespace marrowdale::native
