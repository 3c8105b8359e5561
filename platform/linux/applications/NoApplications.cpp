#include "platform/linux/applications/NoApplications.h"

namespace marrowdale::native {

void NoApplications::enumerateApplications(ApplicationKind /*kind*/, const RecordBlock& /*block*/) {
}

std::shared_ptr<const BundleRecord> NoApplications::proxyFor(const URL& /*url*/,
                                                             URLRelationship /*relationship*/) {
    return nullptr;
}

std::shared_ptr<const BundleRecord> NoApplications::bundleRecordForIdentifier(
    std::string_view /*bundleIdentifier*/) {
    return nullptr;
}

std::shared_ptr<const BundleRecord> NoApplications::unarchivedRecord(
    const ArchivedBundleRecord& /*record*/) {
    return nullptr;
}

std::optional<PropertyListDictionary> NoApplications::infoValuesForKeys(
    const BundleRecord& /*record*/, std::span<const std::string_view> /*keys*/) {
    return std::nullopt;
}

}  // namespace marrowdale::native
