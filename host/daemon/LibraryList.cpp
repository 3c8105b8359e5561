#include "host/daemon/LibraryList.h"

#include <algorithm>
#include <string_view>
#include <variant>

#include "platform/foundation/KeyedArchive.h"

namespace marrowdale::host {

namespace {

constexpr std::string_view versionKey = "versionToken";
constexpr std::string_view recordsKey = "bundleProxy";

const ArchivedObject* entryIn(const ArchivedDictionary& fields, std::string_view key) {
    const auto field = fields.find(key);
    return field == fields.end() ? nullptr : &field->second;
}

std::uint64_t versionIn(const ArchivedDictionary& fields) {
    const auto* entry = entryIn(fields, versionKey);
    const auto* number = entry ? entry->as<Number>() : nullptr;
    if (number == nullptr) {
        return 0;
    }
    const auto* positive = std::get_if<std::uint64_t>(number);
    const auto* other = std::get_if<std::int64_t>(number);
    return positive ? *positive : other && *other > 0 ? static_cast<std::uint64_t>(*other) : 0;
}

std::vector<std::string> identifiersIn(const ArchivedDictionary& fields) {
    std::vector<std::string> identifiers;
    const auto* entry = entryIn(fields, recordsKey);
    const auto* records = entry ? entry->as<ArchivedArray>() : nullptr;
    for (const ArchivedObject& object : records ? *records : ArchivedArray()) {
        if (const auto* record = object.as<ArchivedBundleRecord>()) {
            identifiers.push_back(record->bundleIdentifier);
        }
    }
    std::ranges::sort(identifiers);
    return identifiers;
}

}  // namespace

LibraryList libraryListIn(const Data& file) {
    const auto archived = unarchive(file.bytes());
    const auto* fields = archived ? archived->as<ArchivedDictionary>() : nullptr;
    return fields ? LibraryList{versionIn(*fields), identifiersIn(*fields)} : LibraryList();
}

}  // namespace marrowdale::host
