#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/services/ApplicationRegistry.h"

namespace marrowdale {

struct FakeBundleRecord : BundleRecord {
    std::optional<std::string> identifier;
    std::optional<std::string> displayName;
    std::optional<URL> container;

    [[nodiscard]] std::optional<std::string> bundleIdentifier() const override {
        return identifier;
    }
    [[nodiscard]] std::optional<std::string> localizedName() const override { return displayName; }
    [[nodiscard]] std::optional<URL> dataContainerURL() const override { return container; }
};

// The applications that a test adds. One thread.
class FakeApplicationRegistry : public ApplicationRegistry {
  public:
    // An application whose data container is the folder at `containerPath`; its documents folder is
    // served.
    std::shared_ptr<FakeBundleRecord> add(std::string identifier, std::string displayName,
                                          std::string_view containerPath);
    // A record that is found by its identifier alone; nothing of it is served.
    void add(std::shared_ptr<const FakeBundleRecord> record) {
        records_.push_back(std::move(record));
    }

    std::shared_ptr<const BundleRecord> proxyFor(const URL& url,
                                                 URLRelationship relationship) override;
    std::shared_ptr<const BundleRecord> bundleRecordForIdentifier(
        std::string_view bundleIdentifier) override;
    std::vector<URL> documentFolders() override { return documentFolders_; }

  private:
    std::vector<std::shared_ptr<const FakeBundleRecord>> records_;
    std::vector<URL> documentFolders_;
};

}  // namespace marrowdale
