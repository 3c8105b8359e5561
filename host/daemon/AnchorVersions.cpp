#include "host/daemon/AnchorVersions.h"

#include "platform/foundation/PropertyList.h"

namespace marrowdale::host {

namespace {

// Anchors come from anywhere; a real one is far smaller.
constexpr PropertyListLimits limits{.depth = 2, .objects = 64, .bytes = 4096};

}  // namespace

std::optional<std::uint64_t> libraryVersionIn(const Data& anchor) {
    const auto list = decodePropertyList(anchor.bytes(), limits);
    const auto* fields = list ? list->as<PropertyListDictionary>() : nullptr;
    if (!fields) {
        return std::nullopt;
    }
    const auto version = fields->find(anchorLibraryVersionKey);
    return version == fields->end() ? std::nullopt : version->second.asUnsigned();
}

Data withoutLibraryVersion(const Data& anchor) {
    const auto list = decodePropertyList(anchor.bytes(), limits);
    const auto* fields = list ? list->as<PropertyListDictionary>() : nullptr;
    if (!fields || !libraryVersionIn(anchor)) {
        return anchor;
    }
    PropertyListDictionary changed = *fields;
    changed.insert_or_assign(anchorLibraryVersionKey, PropertyList(std::uint64_t{0}));
    return encodePropertyList(PropertyList(std::move(changed))).value_or(anchor);
}

}  // namespace marrowdale::host
