#include "providers/marrowdale/fs/FSChangeToken.h"

#include <cerrno>
#include <optional>
#include <string_view>

#include "platform/foundation/FatalError.h"
#include "platform/foundation/PropertyList.h"

namespace marrowdale {

namespace {

constexpr std::size_t refusedLength = 48;

// A dictionary of five scalars: anything larger or deeper is none of ours.
constexpr PropertyListLimits tokenLimits{.depth = 2, .objects = 64, .bytes = 4096};

Unexpected undecodable() {
    return Unexpected(errorWithPOSIXCode(EBADMSG));
}

const PropertyList* find(const PropertyListDictionary& dictionary, std::string_view key) {
    const auto entry = dictionary.find(key);
    return entry == dictionary.end() ? nullptr : &entry->second;
}

bool readNumber(const PropertyListDictionary& dictionary, std::string_view key,
                std::uint64_t& number) {
    const PropertyList* value = find(dictionary, key);
    const auto read = value ? value->asUnsigned() : std::nullopt;
    number = read.value_or(0);
    return read.has_value();
}

bool readUUID(const PropertyListDictionary& dictionary, std::string_view key, UUID& uuid) {
    const PropertyList* value = find(dictionary, key);
    const auto* text = value ? value->as<std::string>() : nullptr;
    const auto read = text ? UUID::fromText(*text) : std::nullopt;
    uuid = read.value_or(UUID{});
    return read.has_value();
}

}  // namespace

Data FSChangeToken::encode() const {
    const auto encoded = encodePropertyList(PropertyList(PropertyListDictionary{
        {"version", PropertyList(version)},
        {"deviceUUID", PropertyList(deviceUUID.text())},
        {"streamEventID", PropertyList(streamEventID)},
        {"offset", PropertyList(offset)},
        {"appLibraryVersionToken", PropertyList(appLibraryVersionToken)},
    }));
    if (!encoded) {
        fatalError("can't encode a change token; " + encoded.error().description());
    }
    return *encoded;
}

Expected<FSChangeToken> FSChangeToken::decode(const Data& data) {
    if (data.size() == refusedLength) {
        return undecodable();
    }
    const auto list = decodePropertyList(data.bytes(), tokenLimits);
    const auto* dictionary = list ? list->as<PropertyListDictionary>() : nullptr;
    FSChangeToken token;
    if (!dictionary || !readNumber(*dictionary, "version", token.version) ||
        !readUUID(*dictionary, "deviceUUID", token.deviceUUID) ||
        !readNumber(*dictionary, "streamEventID", token.streamEventID) ||
        !readNumber(*dictionary, "offset", token.offset) ||
        !readNumber(*dictionary, "appLibraryVersionToken", token.appLibraryVersionToken)) {
        return undecodable();
    }
    return token;
}

std::string FSChangeToken::description() const {
    return "<FSChangeToken version:" + std::to_string(version) +
           " deviceUUID:" + deviceUUID.text() + " streamEventID:" + std::to_string(streamEventID) +
           " offset:" + std::to_string(offset) +
           " appLibraryVersionToken:" + std::to_string(appLibraryVersionToken) + ">";
}

}  // namespace marrowdale
