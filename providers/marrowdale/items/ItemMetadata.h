#pragma once

#include <optional>
#include <string_view>

#include "platform/Platform.h"

namespace marrowdale {

// The names of the extended attributes in which metadata is kept that the file system does not
// keep. This is their single definition; values are keyed archives.
inline constexpr std::string_view lastUsedDateAttribute = "com.quillory.lastuseddate#PS";
inline constexpr std::string_view tagDataAttribute = "com.quillory.metadata:_kMDItemUserTags";
inline constexpr std::string_view favoriteRankAttribute = "com.quillory.favorite-rank.number#PS";
inline constexpr std::string_view trashDateAttribute = "com.quillory.trash.time#PS";
inline constexpr std::string_view trashPutBackAttribute = "com.quillory.trash.putback#PS";

// What an item's attributes say, decoded.
struct ItemMetadata {
    std::optional<Date> lastUsedDate;
    std::optional<Data> tagData;  // as the host takes it, see TagData.h
    std::optional<Number> favoriteRank;
};

enum class LastUsedDate { read, leftOut };

// Reads and decodes the attributes of the item itself. One that is missing, can't be read or does
// not decode gives no value; the last two write their line. What a listing brought along is decoded
// once for as long as the file does not change.
[[nodiscard]] ItemMetadata readItemMetadata(const Platform& platform, const URL& url,
                                            LastUsedDate lastUsedDate);

}  // namespace marrowdale
