#pragma once

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <memory>
#include <string>
#include <string_view>
#include <variant>

#include "platform/foundation/AttributeSet.h"
#include "platform/foundation/Data.h"
#include "platform/foundation/Date.h"
#include "platform/foundation/Identifiers.h"

namespace marrowdale {

// What can be asked of a file URL. The text of a key (`name`) is what log lines show.
enum class ResourceKey : std::uint8_t {
    parentDirectoryURL,       // OrbURLParentDirectoryURLKey: URL::deletingLastPathComponent
    name,                     // OrbURLNameKey: string, the last path component's bytes
    localizedName,            // OrbURLLocalizedNameKey: string
    typeIdentifier,           // OrbURLTypeIdentifierKey: string, a MIME type
    fileSize,                 // OrbURLFileSizeKey: number, bytes; regular files and links only
    creationDate,             // OrbURLCreationDateKey: date
    contentModificationDate,  // OrbURLContentModificationDateKey: date
    isReadable,               // OrbURLIsReadableKey: boolean, for this process's user
    isWritable,               // OrbURLIsWritableKey: boolean, for this process's user
    fileID,                   // _kOrbURLFileIDKey: number
    documentIdentifier,       // OrbURLDocumentIdentifierKey: number; allocated where there is none
    isPackage,                // OrbURLIsPackageKey: boolean
    isDirectory,              // OrbURLIsDirectoryKey: boolean; packages are directories
};
inline constexpr std::size_t resourceKeyCount = 13;

[[nodiscard]] std::string_view name(ResourceKey key);

// A set of keys.
class ResourceKeySet {
  public:
    constexpr ResourceKeySet() = default;
    constexpr ResourceKeySet(std::initializer_list<ResourceKey> keys) {
        for (const ResourceKey key : keys) {
            insert(key);
        }
    }
    constexpr void insert(ResourceKey key) { bits_ |= bit(key); }
    constexpr void erase(ResourceKey key) { bits_ &= ~bit(key); }
    [[nodiscard]] constexpr bool contains(ResourceKey key) const { return (bits_ & bit(key)) != 0; }
    [[nodiscard]] constexpr bool empty() const { return bits_ == 0; }

  private:
    static constexpr std::uint32_t bit(ResourceKey key) {
        return std::uint32_t{1} << static_cast<unsigned>(key);
    }
    std::uint32_t bits_ = 0;
};

// A number with its width's sign kept.
using Number = std::variant<std::int64_t, std::uint64_t, double>;

// A resource's value; monostate is "no value" (the resource has none; not an error).
using ResourceValue = std::variant<std::monostate, std::string, Number, Date, bool, Data>;

// The class of a value as log lines name it: "OrbString", "OrbNumber", "OrbDate", "OrbBoolean",
// "OrbData", "nil".
[[nodiscard]] std::string_view className(const ResourceValue& value);

// What a status query of a path says, final links followed.
struct FileStatus {
    DeviceID device{};
    FileID fileID{};
    // 2 plus the number of subfolders for a folder, 2 to 65,537 whatever the file system keeps; the
    // number of names for everything else.
    std::uint32_t linkCount = 0;
    bool isDirectory = false;
};

// Values that a directory listing learnt on its way; see URL::prefetched. Fixed at construction.
// `known` names the keys that are answered here; of those, the ones in `absent` have no value.
struct PrefetchedValues {
    ResourceKeySet known;
    ResourceKeySet absent;
    FileID fileID{};
    DocumentID documentIdentifier{};
    std::uint64_t fileSize = 0;
    Date creationDate;
    Date contentModificationDate;
    // Text that lives as long as the platform object which listed the folder.
    std::string_view typeIdentifier;
    bool isReadable = false;
    bool isWritable = false;
    bool isPackage = false;
    bool isDirectory = false;
    bool hasStatus = false;  // `status` is filled in
    FileStatus status;
    std::shared_ptr<const AttributeSet> attributes;  // null: not asked for
};

}  // namespace marrowdale
