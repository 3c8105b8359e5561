#include <cerrno>
#include <filesystem>
#include <set>

#include <gtest/gtest.h>

#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/FileHandle.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {
namespace {

class FileHandleTest : public testing::TestWithParam<TestFileSystem> {
  protected:
    [[nodiscard]] Expected<FileHandle> handleOf(std::string_view name) const {
        return fileHandle(AT_FDCWD, folder_.path(name).c_str());
    }

    TemporaryDirectory folder_{GetParam().dir};
};
INSTANTIATE_TEST_SUITE_P(OnEach, FileHandleTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(FileHandleTest, staysThroughRenamesAndDiffersFromEveryOther) {
    writeFile(folder_.path("a"), "x");
    writeFile(folder_.path("other"), "x");
    const auto before = handleOf("a");
    ASSERT_TRUE(before) << before.error().description();
    std::filesystem::rename(folder_.path("a"), folder_.path("b"));
    EXPECT_EQ(handleOf("b")->bytes(), before->bytes());
    EXPECT_NE(handleOf("other")->bytes(), before->bytes());
}

TEST_P(FileHandleTest, fingerprintIsThatOfTheBytesWhereverTheyComeFrom) {
    writeFile(folder_.path("a"), "x");
    const auto handle = handleOf("a");
    ASSERT_TRUE(handle);
    EXPECT_EQ(handle->fingerprint(), fingerprintOfHandle(handle->bytes()));
    EXPECT_EQ(*handleFingerprint(AT_FDCWD, folder_.path("a").c_str()), handle->fingerprint());
}

TEST_P(FileHandleTest, missingFileHasNone) {
    EXPECT_EQ(handleOf("none").error().code, ENOENT);
}

TEST(FileHandleFingerprintTest, sameOfEveryLengthNeverZeroAndToldApart) {
    std::set<std::uint32_t> seen;
    for (std::size_t length = 0; length <= 132; ++length) {
        seen.insert(fingerprintOfHandle(std::string(length, '\x7')));
    }
    EXPECT_EQ(seen.size(), 133U);
    EXPECT_FALSE(seen.contains(0));
}

}  // namespace
}  // namespace marrowdale::native
