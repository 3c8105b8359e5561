#include "host/daemon/AnchorVersions.h"

#include <initializer_list>
#include <utility>

#include "platform/foundation/PropertyList.h"

namespace marrowdale::host {

namespace {

// Anchors come from anywhere; a real one is far smaller.
constexpr PropertyListLimits limits{.depth = 2, .objects = 64, .bytes = 4096};

std::optional<std::uint64_t> numberIn(const Data& anchor, const char* key) {
    const auto list = decodePropertyList(anchor.bytes(), limits);
    const auto* fields = list ? list->as<PropertyListDictionary>() : nullptr;
    if (!fields) {
        return std::nullopt;
    }
    const auto number = fields->find(key);
    return number == fields->end() ? std::nullopt : number->second.asUnsigned();
}

// With other numbers under keys that it has.
Data with(const Data& anchor,
          std::initializer_list<std::pair<const char*, std::uint64_t>> numbers) {
    const auto list = decodePropertyList(anchor.bytes(), limits);
    const auto* fields = list ? list->as<PropertyListDictionary>() : nullptr;
    if (!fields) {
        return anchor;
    }
    PropertyListDictionary changed = *fields;
    for (const auto& [key, number] : numbers) {
        if (const auto field = changed.find(key); field != changed.end()) {
            field->second = PropertyList(number);
        }
    }
    return encodePropertyList(PropertyList(std::move(changed))).value_or(anchor);
}

}  // namespace

std::optional<std::uint64_t> libraryVersionIn(const Data& anchor) {
    return numberIn(anchor, anchorLibraryVersionKey);
}

std::optional<EventID> eventIn(const Data& anchor) {
    const auto number = numberIn(anchor, anchorEventKey);
    return number ? std::optional(EventID{*number}) : std::nullopt;
}

Data withEvent(const Data& anchor, EventID event) {
    return with(anchor, {{anchorEventKey, raw(event)}, {anchorOffsetKey, 0}});
}

Data withoutLibraryVersion(const Data& anchor) {
    return libraryVersionIn(anchor) ? with(anchor, {{anchorLibraryVersionKey, 0}}) : anchor;
}

}  // namespace marrowdale::host
