#include "host/requests/TagNames.h"

#include "platform/foundation/PropertyList.h"

namespace marrowdale::host {

std::vector<std::string> tagNames(const FileProviderItem& item) {
    std::vector<std::string> names;
    if (!item.tagData) {
        return names;
    }
    const auto list = decodePropertyList(item.tagData->bytes());
    const auto* const tags = list ? list->as<PropertyListArray>() : nullptr;
    if (tags == nullptr) {
        return names;
    }
    for (const PropertyList& tag : *tags) {
        const auto* const entries = tag.as<PropertyListDictionary>();
        const auto label =
            entries ? entries->find("label") : PropertyListDictionary::const_iterator();
        if (entries && label != entries->end() && label->second.as<std::string>()) {
            names.push_back(*label->second.as<std::string>());
        }
    }
    return names;
}

std::optional<Data> tagDataFor(std::span<const std::string> names) {
    PropertyListArray tags;
    for (const std::string& name : names) {
        tags.emplace_back(PropertyListDictionary{{"label", PropertyList(name)},
                                                 {"color", PropertyList(std::int64_t{0})}});
    }
    auto data = encodePropertyList(PropertyList(std::move(tags)));
    return data ? std::optional(std::move(*data)) : std::nullopt;
}

}  // namespace marrowdale::host
