#include "platform/foundation/ResourceValue.h"

#include <array>
#include <utility>

namespace marrowdale {

std::string_view name(ResourceKey key) {
    static constexpr std::array<std::string_view, resourceKeyCount> names = {
        "OrbURLParentDirectoryURLKey",
        "OrbURLNameKey",
        "OrbURLLocalizedNameKey",
        "OrbURLTypeIdentifierKey",
        "OrbURLFileSizeKey",
        "OrbURLCreationDateKey",
        "OrbURLContentModificationDateKey",
        "OrbURLIsReadableKey",
        "OrbURLIsWritableKey",
        "_kOrbURLFileIDKey",
        "OrbURLDocumentIdentifierKey",
        "OrbURLIsPackageKey",
        "OrbURLIsDirectoryKey",
    };
    return names.at(std::to_underlying(key));
}

std::string_view className(const ResourceValue& value) {
    static constexpr std::array<std::string_view, std::variant_size_v<ResourceValue>> names = {
        "nil", "OrbString", "OrbNumber", "OrbDate", "OrbBoolean", "OrbData"};
    return names.at(value.index());
}

}  // namespace marrowdale
