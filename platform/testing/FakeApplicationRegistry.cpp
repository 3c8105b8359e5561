#include "platform/testing/FakeApplicationRegistry.h"

#include <algorithm>
#include <utility>

namespace marrowdale {

std::shared_ptr<FakeBundleRecord> FakeApplicationRegistry::add(std::string identifier,
                                                               std::string displayName,
                                                               std::string_view containerPath) {
    auto record = std::make_shared<FakeBundleRecord>();
    record->identifier = std::move(identifier);
    record->displayName = std::move(displayName);
    record->container = URL::fileURL(containerPath);
    record->info = PropertyListDictionary{{"KvSupportsDocumentBrowser", PropertyList(true)}};
    add(record);
    return record;
}

void FakeApplicationRegistry::add(std::shared_ptr<const FakeBundleRecord> record,
                                  ApplicationKind kind) {
    const std::lock_guard lock(mutex_);
    entries_.push_back({kind, std::move(record)});
}

void FakeApplicationRegistry::remove(std::string_view identifier) {
    const std::lock_guard lock(mutex_);
    std::erase_if(entries_, [&](const Entry& entry) {
        return entry.record && entry.record->identifier == identifier;
    });
}

void FakeApplicationRegistry::reverse() {
    const std::lock_guard lock(mutex_);
    std::ranges::reverse(entries_);
}

std::vector<FakeApplicationRegistry::Entry> FakeApplicationRegistry::entries() const {
    const std::lock_guard lock(mutex_);
    return entries_;
}

void FakeApplicationRegistry::enumerateApplications(ApplicationKind kind,
                                                    const RecordBlock& block) {
    {
        const std::lock_guard lock(mutex_);
        enumerations_.push_back(kind);
    }
    for (const Entry& entry : entries()) {
        if (entry.kind == kind) {
            block(entry.record);
        }
    }
}

std::vector<ApplicationKind> FakeApplicationRegistry::enumerations() const {
    const std::lock_guard lock(mutex_);
    return enumerations_;
}

std::shared_ptr<const BundleRecord> FakeApplicationRegistry::proxyFor(
    const URL& url, URLRelationship relationship) {
    for (const auto& [kind, record] : entries()) {
        if (!record || !record->container) {
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
    for (const auto& [kind, record] : entries()) {
        if (record && record->identifier == bundleIdentifier) {
            return record;
        }
    }
    return nullptr;
}

std::shared_ptr<const BundleRecord> FakeApplicationRegistry::unarchivedRecord(
    const ArchivedBundleRecord& record) {
    if (auto known = bundleRecordForIdentifier(record.bundleIdentifier)) {
        return known;
    }
    auto gone = std::make_shared<FakeBundleRecord>();
    gone->identifier = record.bundleIdentifier;
    return gone;
}

std::optional<PropertyListDictionary> FakeApplicationRegistry::infoValuesForKeys(
    const BundleRecord& record, std::span<const std::string_view> keys) {
    const auto& fake = dynamic_cast<const FakeBundleRecord&>(record);
    if (!fake.info) {
        return std::nullopt;
    }
    PropertyListDictionary values;
    for (const std::string_view key : keys) {
        if (const auto value = fake.info->find(key); value != fake.info->end()) {
            values.insert(*value);
        }
    }
    return values;
}

}  // namespace marrowdale
