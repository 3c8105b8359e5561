#pragma once

#include <cctype>
#include <iosfwd>
#include <string>
#include <string_view>
#include <vector>

namespace marrowdale {

// A file system that tests of file behaviour run on.
struct TestFileSystem {
    std::string name;  // "ext4", "xfs", "btrfs", "tmpfs", …; "tmp" is wherever temporary files go
    std::string dir;   // a folder on it that this process may write to
};

void PrintTo(const TestFileSystem& fileSystem, std::ostream* stream);

// The file systems to test on: the pairs `name=dir` of the environment variable
// MARROWDALE_TEST_DIRS, separated by ":"; where that is unset, "tmp" alone. A value that can't be
// read ends the process with a message, for tests must not go missing because of a typing error.
//
//     INSTANTIATE_TEST_SUITE_P(OnEach, WalkTest, ::testing::ValuesIn(testFileSystems()),
//                              testFileSystemName);
[[nodiscard]] std::vector<TestFileSystem> testFileSystems();

// Reads the value of MARROWDALE_TEST_DIRS; empty when it is malformed.
[[nodiscard]] std::vector<TestFileSystem> parseTestFileSystems(std::string_view text);

// The last argument of INSTANTIATE_TEST_SUITE_P: the file system's name in the test's name.
// (A template, so that this header does not need GoogleTest's.)
inline constexpr auto testFileSystemName = [](const auto& info) {
    std::string name = info.param.name;
    for (char& c : name) {
        if (std::isalnum(static_cast<unsigned char>(c)) == 0) {
            c = '_';
        }
    }
    return name;
};

}  // namespace marrowdale
