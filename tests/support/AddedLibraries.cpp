#include "tests/support/AddedLibraries.h"

#include <utility>

#include "providers/marrowdale/items/MRWAppLibraryManager.h"

namespace marrowdale {

std::shared_ptr<FakeBundleRecord> addLibrary(const Platform& platform,
                                             FakeApplicationRegistry& applications,
                                             std::string identifier, std::string displayName,
                                             std::string_view containerPath) {
    auto record = applications.add(std::move(identifier), std::move(displayName), containerPath);
    AppLibraries libraries;
    const auto add = [&](const std::shared_ptr<const BundleRecord>& known) {
        if (const auto container = known->dataContainerURL()) {
            libraries.push_back({container->appendingPathComponent("Documents"), known});
        }
    };
    applications.enumerateApplications(ApplicationKind::user, add);
    MRWAppLibraryManager::setKnownLibraries(platform, std::move(libraries));
    return record;
}

}  // namespace marrowdale
