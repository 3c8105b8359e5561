#include "platform/linux/applications/NoApplications.h"

namespace marrowdale::native {

std::shared_ptr<const BundleRecord> NoApplications::proxyFor(const URL& /*url*/,
                                                             URLRelationship /*relationship*/) {
    return nullptr;
}

std::shared_ptr<const BundleRecord> NoApplications::bundleRecordForIdentifier(
    std::string_view /*bundleIdentifier*/) {
    return nullptr;
}

std::vector<URL> NoApplications::documentFolders() {
    return {};
}

}  // namespace marrowdale::native
