#pragma once

#include <cstdint>
#include <type_traits>
#include <utility>

namespace marrowdale {

// Strong types for the numbers that name things. A number of one kind never turns into a number of
// another by accident; `raw()` gives the number where text or bytes are made of it.

// The file system's own number of a file or folder (inode number). Only unique on one volume, and
// only while the file exists: file systems give a freed number to the next file.
enum class FileID : std::uint64_t {};

// The number that the store gives to a document; never given to another document of that store.
// 0 means "none".
enum class DocumentID : std::uint32_t {};

// The number of a mounted volume, in the kernel's encoding (major << 20 | minor). It changes
// between boots. 0 means "unknown".
enum class DeviceID : std::uint32_t {};

// The place of an event in a store's history. Only grows. 0 is before every event.
enum class EventID : std::uint64_t {};

template <typename ID>
    requires std::is_enum_v<ID>
[[nodiscard]] constexpr auto raw(ID id) noexcept {
    return std::to_underlying(id);
}

}  // namespace marrowdale
