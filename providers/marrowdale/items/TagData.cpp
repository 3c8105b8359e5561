#include "providers/marrowdale/items/TagData.h"

#include <cerrno>
#include <optional>
#include <utility>

#include "platform/foundation/PropertyList.h"

namespace marrowdale {

namespace {

std::optional<Tag> tagFromPropertyList(const PropertyList& list) {
    const auto* dictionary = list.as<PropertyListDictionary>();
    if (!dictionary) {
        return std::nullopt;
    }
    const auto label = dictionary->find("label");
    const auto color = dictionary->find("color");
    if (label == dictionary->end() || color == dictionary->end()) {
        return std::nullopt;
    }
    const auto* text = label->second.as<std::string>();
    const auto number = color->second.asUnsigned();
    return text && number ? std::optional(Tag{*text, *number}) : std::nullopt;
}

}  // namespace

Expected<Data> encodeTagData(const std::vector<Tag>& tags) {
    PropertyListArray array;
    array.reserve(tags.size());
    for (const Tag& tag : tags) {
        array.emplace_back(PropertyListDictionary{{"label", PropertyList(tag.label)},
                                                  {"color", PropertyList(tag.color)}});
    }
    return encodePropertyList(PropertyList(std::move(array)));
}

Expected<std::vector<Tag>> decodeTagData(const Data& data) {
    const auto list = decodePropertyList(data.bytes());
    if (!list) {
        return Unexpected(list.error());
    }
    const auto* array = list->as<PropertyListArray>();
    if (!array) {
        return Unexpected(errorWithPOSIXCode(EBADMSG));
    }
    std::vector<Tag> tags;
    for (const PropertyList& element : *array) {
        auto tag = tagFromPropertyList(element);
        if (!tag) {
            return Unexpected(errorWithPOSIXCode(EBADMSG));
        }
        tags.push_back(std::move(*tag));
    }
    return tags;
}

}  // namespace marrowdale
