#include "platform/testing/FakeApplicationRegistry.h"

#include <utility>

namespace marrowdale {

std::shared_ptr<FakeBundleRecord> FakeApplicationRegistry::add(std::string identifier,
                                                               std::string displayName,
                                                               std::string_view containerPath) {
    auto record = std::make_shared<FakeBundleRecord>();
    record->identifier = std::move(identifier);
    record->displayName = std::move(displayName);
    record->container = URL::fileURL(containerPath);
    documentFolders_.push_back(record->container->appendingPathComponent("Documents"));
    records_.push_back(record);
    return record;
}

std::shared_ptr<const BundleRecord> FakeApplicationRegistry::proxyFor(
    const URL& url, URLRelationship relationship) {
    for (const auto& record : records_) {
        if (!record->container) {
            continue;
        }
        const URL documents = record->container->appendingPathComponent("Documents");
        if (marrowdale::relationship(*record->container, url) == relationship ||
            marrowdale::relationship(documents, url) == relationship) {
            return record;
        }
    }
    return nullptr;
}

std::shared_ptr<const BundleRecord> FakeApplicationRegistry::bundleRecordForIdentifier(
    std::string_view bundleIdentifier) {
    for (const auto& record : records_) {
        if (record->identifier == bundleIdentifier) {
            return record;
        }
    }
    return nullptr;
}

}  // namespace marrowdale
