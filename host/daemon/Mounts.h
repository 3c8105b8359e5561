#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace marrowdale::host {

// Where a path lies, as the kernel's table of mounts has it.
struct Mount {
    std::string point;   // where it is mounted
    std::string type;    // "ext4", "btrfs", …
    std::string source;  // the device
    bool isReadOnly = false;
    friend bool operator==(const Mount&, const Mount&) = default;
};

// The mount that holds a canonical path, by a table in the form of /proc/self/mountinfo. None when
// the table has none, or can't be read.
[[nodiscard]] std::optional<Mount> mountOf(std::string_view path, std::string_view table);

// The same by the kernel's table for this process.
[[nodiscard]] std::optional<Mount> mountOf(std::string_view path);

// Where something is mounted below a folder, given by its canonical path: whole paths in their
// order, each once; what is mounted inside one of them is left out.
[[nodiscard]] std::vector<std::string> mountsBelow(std::string_view folder, std::string_view table);
[[nodiscard]] std::vector<std::string> mountsBelow(std::string_view folder);

}  // namespace marrowdale::host
