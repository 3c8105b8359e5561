#pragma once

#include <cstddef>
#include <cstdint>
#include <iosfwd>
#include <string>
#include <vector>

#include "tests/powerloss/MemoryFile.h"

namespace marrowdale::tests {

// A file system that survives power cuts, and how a disk for it is made.
struct DiskFormat {
    std::string name;                  // as mount(2) has it
    std::vector<std::string> command;  // that formats; the image's path comes last
    std::uint64_t size = 0;            // of the image, bytes
    // The smallest write that the file system takes to be whole or not there at all.
    std::size_t atom = 0;
    std::string options;  // for mount(2)

    // A freshly formatted disk. std::system_error where the program is missing or fails.
    [[nodiscard]] MemoryFile make() const;
};

void PrintTo(const DiskFormat& format, std::ostream* stream);

// ext4, xfs and btrfs.
[[nodiscard]] std::vector<DiskFormat> diskFormats();

// The last argument of INSTANTIATE_TEST_SUITE_P: the file system's name in the test's name.
inline constexpr auto diskFormatName = [](const auto& info) { return info.param.name; };

}  // namespace marrowdale::tests
