#include "platform/foundation/PropertyList.h"

#include "platform/foundation/PropertyListReader.h"
#include "platform/foundation/PropertyListWriter.h"

namespace marrowdale {

PropertyList::PropertyList(const PropertyList& other) = default;
PropertyList::PropertyList(PropertyList&& other) noexcept = default;
PropertyList& PropertyList::operator=(const PropertyList& other) = default;
PropertyList& PropertyList::operator=(PropertyList&& other) noexcept = default;
PropertyList::~PropertyList() = default;

std::optional<std::uint64_t> PropertyList::asUnsigned() const {
    if (const auto* number = as<std::uint64_t>()) {
        return *number;
    }
    if (const auto* number = as<std::int64_t>(); number != nullptr && *number >= 0) {
        return static_cast<std::uint64_t>(*number);
    }
    return std::nullopt;
}

Expected<Data> encodePropertyList(const PropertyList& list) {
    return PropertyListWriter().write(list);
}

Expected<PropertyList> decodePropertyList(std::span<const std::uint8_t> bytes,
                                          const PropertyListLimits& limits) {
    return PropertyListReader(bytes, limits).read();
}

}  // namespace marrowdale
