#include <filesystem>
#include <optional>

#include <gtest/gtest.h>

#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale {
namespace {

namespace fs = std::filesystem;

TEST(TemporaryDirectoryTest, IsAFreshEmptyFolder) {
    const TemporaryDirectory one;
    const TemporaryDirectory two;
    EXPECT_NE(one.path(), two.path());
    EXPECT_TRUE(fs::is_directory(one.path()));
    EXPECT_TRUE(fs::is_empty(one.path()));
    EXPECT_EQ(one.path("a"), one.path() + "/a");
}

TEST(TemporaryDirectoryTest, TakesItsContentsWithIt) {
    std::optional<TemporaryDirectory> directory(std::in_place);
    const std::string path = directory->path();
    makeFolder(directory->path("a/b/c"));
    writeFile(directory->path("a/b/c/file"), "contents");
    directory.reset();
    EXPECT_FALSE(fs::exists(path));
}

TEST(TemporaryDirectoryTest, TakesFoldersThatNobodyMayEnter) {
    std::optional<TemporaryDirectory> directory(std::in_place);
    const std::string path = directory->path();
    makeFolder(directory->path("closed/inner"));
    writeFile(directory->path("closed/inner/file"), "");
    fs::permissions(directory->path("closed/inner"), fs::perms::none);
    fs::permissions(directory->path("closed"), fs::perms::none);
    directory.reset();
    EXPECT_FALSE(fs::exists(path));
}

TEST(TemporaryDirectoryTest, LeavesTheTargetsOfLinksAlone) {
    const TemporaryDirectory other;
    writeFile(other.path("kept"), "contents");
    {
        const TemporaryDirectory directory;
        fs::create_symlink(other.path(), directory.path("link"));
    }
    EXPECT_EQ(readFile(other.path("kept")), "contents");
}

TEST(TemporaryDirectoryTest, AMissingParentIsAnError) {
    EXPECT_THROW(TemporaryDirectory("/nonexistent/parent"), std::exception);
}

}  // namespace
}  // namespace marrowdale
