#include "platform/services/ApplicationRegistry.h"

namespace marrowdale {

std::string description(const BundleRecord& record) {
    return "<BundleRecord " + record.bundleIdentifier().value_or("<unknown>") + ">";
}

ArchivedBundleRecord archived(const BundleRecord& record) {
    return {record.bundleIdentifier().value_or("")};
}

}  // namespace marrowdale
