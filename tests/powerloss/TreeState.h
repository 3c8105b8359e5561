#pragma once

#include <compare>
#include <cstdint>
#include <map>
#include <string>

#include "platform/foundation/Date.h"
#include "platform/foundation/Identifiers.h"

namespace marrowdale::tests {

// A file or folder itself, whatever its name: the inode number comes back, with another birth.
struct FileKey {
    FileID file{};
    Date birth;
    friend auto operator<=>(const FileKey&, const FileKey&) = default;
};

// What can be seen of an entry without reading it.
struct EntryState {
    FileKey key;
    std::uint32_t mode = 0;
    std::uint64_t size = 0;  // 0 for folders, as the next
    Date changed;
    bool isFolder = false;
    friend bool operator==(const EntryState&, const EntryState&) = default;
};

// Entries by their paths below a root, which is not among them.
using Tree = std::map<std::string, EntryState>;

// What is below the root now. std::system_error where it can't be read.
[[nodiscard]] Tree treeBelow(const std::string& root);

// For people.
[[nodiscard]] std::string describe(const EntryState& state);

}  // namespace marrowdale::tests
