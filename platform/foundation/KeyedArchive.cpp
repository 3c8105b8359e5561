#include "platform/foundation/KeyedArchive.h"

#include <array>
#include <cerrno>
#include <optional>
#include <string>
#include <utility>

#include "platform/foundation/PropertyList.h"
#include "platform/foundation/Utf8.h"

namespace marrowdale {

namespace {

constexpr std::int64_t formatVersion = 1;
constexpr std::size_t deepest = PropertyListLimits{}.depth;

constexpr std::string_view versionKey = "version";
constexpr std::string_view classKey = "class";
constexpr std::string_view valueKey = "value";

constexpr std::string_view signedKind = "int64";
constexpr std::string_view unsignedKind = "uint64";
constexpr std::string_view realKind = "double";

// In the order of ArchivedObject::Value.
enum class ArchivedClass : std::size_t {
    date,
    number,
    string,
    data,
    array,
    dictionary,
    bundleRecord
};
constexpr std::array<std::string_view, std::variant_size_v<ArchivedObject::Value>> classNames = {
    "OrbDate", "OrbNumber", "OrbString", "OrbData", "OrbArray", "OrbDictionary", "OrbBundleRecord"};

std::optional<ArchivedClass> classNamed(std::string_view name) {
    for (std::size_t i = 0; i < classNames.size(); ++i) {
        if (classNames[i] == name) {
            return static_cast<ArchivedClass>(i);
        }
    }
    return std::nullopt;
}

// Makes the property list of an object. No value for one that is nested too deeply, so that the
// recursion is bounded, or has an impossible date.
class Archiver {
  public:
    std::optional<PropertyListDictionary> pairOf(const ArchivedObject& object, std::size_t depth) {
        if (depth >= deepest) {
            return std::nullopt;
        }
        auto value =
            std::visit([&](const auto& held) { return valueOf(held, depth); }, object.value());
        if (!value) {
            return std::nullopt;
        }
        PropertyListDictionary pair;
        pair.emplace(classKey, PropertyList(std::string(object.className())));
        pair.emplace(valueKey, *std::move(value));
        return pair;
    }

  private:
    using Result = std::optional<PropertyList>;

    static Result valueOf(const Date& date, std::size_t) {
        if (date.nanoseconds >= 1'000'000'000) {
            return std::nullopt;
        }
        return PropertyList(PropertyListArray{PropertyList(date.seconds),
                                              PropertyList(std::int64_t{date.nanoseconds})});
    }
    static Result valueOf(const Number& number, std::size_t) {
        return std::visit(
            [](auto held) {
                return PropertyList(
                    PropertyListArray{PropertyList(std::string(kindOf(held))), PropertyList(held)});
            },
            number);
    }
    static Result valueOf(const std::string& text, std::size_t) {
        return isUtf8(text) ? PropertyList(text) : PropertyList(Data::fromText(text));
    }
    static Result valueOf(const Data& data, std::size_t) { return PropertyList(data); }
    static Result valueOf(const ArchivedBundleRecord& record, std::size_t depth) {
        return valueOf(record.bundleIdentifier, depth);
    }
    Result valueOf(const ArchivedArray& array, std::size_t depth) {
        PropertyListArray elements;
        elements.reserve(array.size());
        for (const ArchivedObject& element : array) {
            auto pair = pairOf(element, depth + 1);
            if (!pair) {
                return std::nullopt;
            }
            elements.emplace_back(*std::move(pair));
        }
        return PropertyList(std::move(elements));
    }
    Result valueOf(const ArchivedDictionary& dictionary, std::size_t depth) {
        PropertyListDictionary entries;
        for (const auto& [key, element] : dictionary) {
            auto pair = pairOf(element, depth + 1);
            if (!pair) {
                return std::nullopt;
            }
            entries.emplace_hint(entries.end(), key, *std::move(pair));
        }
        return PropertyList(std::move(entries));
    }

    static constexpr std::string_view kindOf(std::int64_t) { return signedKind; }
    static constexpr std::string_view kindOf(std::uint64_t) { return unsignedKind; }
    static constexpr std::string_view kindOf(double) { return realKind; }
};

// Makes the object of a property list that was read, so its nesting is bounded already. No value
// for anything that the archiver would not have made.
class Unarchiver {
  public:
    static std::optional<ArchivedObject> objectOf(const PropertyListDictionary& pair) {
        const auto name = pair.find(classKey);
        const auto value = pair.find(valueKey);
        if (name == pair.end() || value == pair.end()) {
            return std::nullopt;
        }
        const auto* text = name->second.as<std::string>();
        const auto archivedClass = text == nullptr ? std::nullopt : classNamed(*text);
        return archivedClass ? objectOf(*archivedClass, value->second) : std::nullopt;
    }

  private:
    using Result = std::optional<ArchivedObject>;

    static Result objectOf(ArchivedClass archivedClass, const PropertyList& value) {
        switch (archivedClass) {
            case ArchivedClass::date:
                return dateOf(value);
            case ArchivedClass::number:
                return numberOf(value);
            case ArchivedClass::string: {
                auto text = textOf(value);
                return text ? Result(ArchivedObject(*std::move(text))) : std::nullopt;
            }
            case ArchivedClass::data: {
                const auto* data = value.as<Data>();
                return data != nullptr ? Result(ArchivedObject(*data)) : std::nullopt;
            }
            case ArchivedClass::array:
                return arrayOf(value);
            case ArchivedClass::dictionary:
                return dictionaryOf(value);
            case ArchivedClass::bundleRecord: {
                auto text = textOf(value);
                return text ? Result(ArchivedObject(ArchivedBundleRecord{*std::move(text)}))
                            : std::nullopt;
            }
        }
        return std::nullopt;
    }

    static Result dateOf(const PropertyList& value) {
        const auto* parts = value.as<PropertyListArray>();
        if (parts == nullptr || parts->size() != 2) {
            return std::nullopt;
        }
        const auto* seconds = (*parts)[0].as<std::int64_t>();
        const auto nanoseconds = (*parts)[1].asUnsigned();
        if (seconds == nullptr || !nanoseconds || *nanoseconds >= 1'000'000'000) {
            return std::nullopt;
        }
        return ArchivedObject(Date{*seconds, static_cast<std::uint32_t>(*nanoseconds)});
    }

    static Result numberOf(const PropertyList& value) {
        const auto* parts = value.as<PropertyListArray>();
        if (parts == nullptr || parts->size() != 2) {
            return std::nullopt;
        }
        const auto* kind = (*parts)[0].as<std::string>();
        if (kind == nullptr) {
            return std::nullopt;
        }
        const PropertyList& number = (*parts)[1];
        if (const auto* integer = number.as<std::int64_t>(); integer && *kind == signedKind) {
            return ArchivedObject(Number(*integer));
        }
        if (const auto natural = number.asUnsigned(); natural && *kind == unsignedKind) {
            return ArchivedObject(Number(*natural));
        }
        if (const auto* real = number.as<double>(); real && *kind == realKind) {
            return ArchivedObject(Number(*real));
        }
        return std::nullopt;
    }

    // Bytes stand for a string only where the format's strings can't.
    static std::optional<std::string> textOf(const PropertyList& value) {
        if (const auto* text = value.as<std::string>()) {
            return *text;
        }
        if (const auto* data = value.as<Data>()) {
            std::string text = data->text();
            return isUtf8(text) ? std::nullopt : std::optional(std::move(text));
        }
        return std::nullopt;
    }

    static Result arrayOf(const PropertyList& value) {
        const auto* elements = value.as<PropertyListArray>();
        if (elements == nullptr) {
            return std::nullopt;
        }
        ArchivedArray array;
        array.reserve(elements->size());
        for (const PropertyList& element : *elements) {
            auto object = elementOf(element);
            if (!object) {
                return std::nullopt;
            }
            array.push_back(*std::move(object));
        }
        return ArchivedObject(std::move(array));
    }

    static Result dictionaryOf(const PropertyList& value) {
        const auto* entries = value.as<PropertyListDictionary>();
        if (entries == nullptr) {
            return std::nullopt;
        }
        ArchivedDictionary dictionary;
        for (const auto& [key, element] : *entries) {
            auto object = elementOf(element);
            if (!object) {
                return std::nullopt;
            }
            dictionary.emplace_hint(dictionary.end(), key, *std::move(object));
        }
        return ArchivedObject(std::move(dictionary));
    }

    static Result elementOf(const PropertyList& element) {
        const auto* pair = element.as<PropertyListDictionary>();
        return pair != nullptr && pair->size() == 2 ? objectOf(*pair) : std::nullopt;
    }
};

std::optional<ArchivedObject> rootObject(const PropertyList& list) {
    const auto* root = list.as<PropertyListDictionary>();
    if (root == nullptr || root->size() != 3) {
        return std::nullopt;
    }
    const auto version = root->find(versionKey);
    if (version == root->end() || version->second != PropertyList(formatVersion)) {
        return std::nullopt;
    }
    return Unarchiver::objectOf(*root);
}

}  // namespace

ArchivedObject::ArchivedObject(const ArchivedObject& other) = default;
ArchivedObject::ArchivedObject(ArchivedObject&& other) noexcept = default;
ArchivedObject& ArchivedObject::operator=(const ArchivedObject& other) = default;
ArchivedObject& ArchivedObject::operator=(ArchivedObject&& other) noexcept = default;
ArchivedObject::~ArchivedObject() = default;

std::string_view ArchivedObject::className() const {
    return classNames.at(value_.index());
}

Expected<Data> archive(const ArchivedObject& object) {
    auto root = Archiver().pairOf(object, 0);
    if (!root) {
        return Unexpected(errorWithPOSIXCode(EINVAL, "archive object", object.className()));
    }
    root->emplace(versionKey, PropertyList(formatVersion));
    return encodePropertyList(PropertyList(*std::move(root)));
}

Expected<ArchivedObject> unarchive(std::span<const std::uint8_t> bytes) {
    const auto list = decodePropertyList(bytes);
    if (!list) {
        return Unexpected(list.error());
    }
    auto object = rootObject(*list);
    if (!object) {
        return Unexpected(errorWithPOSIXCode(EBADMSG, "unarchive object", ""));
    }
    return *std::move(object);
}

}  // namespace marrowdale
