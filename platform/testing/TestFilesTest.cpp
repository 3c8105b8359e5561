#include <atomic>
#include <filesystem>
#include <system_error>
#include <thread>

#include <gtest/gtest.h>

#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale {
namespace {

TEST(TestFilesTest, WritesAndReadsBytes) {
    const TemporaryDirectory directory;
    const std::string contents("a\0b\n\xff", 5);
    writeFile(directory.path("file"), contents);
    EXPECT_EQ(readFile(directory.path("file")), contents);
    writeFile(directory.path("file"), "x");
    EXPECT_EQ(readFile(directory.path("file")), "x");
}

TEST(TestFilesTest, RefusalsThrow) {
    const TemporaryDirectory directory;
    EXPECT_THROW(writeFile(directory.path("none/file"), ""), std::system_error);
    EXPECT_THROW((void)readFile(directory.path("none")), std::system_error);
    EXPECT_THROW(setAttribute(directory.path("none"), "user.a", ""), std::system_error);
    EXPECT_THROW((void)attribute(directory.path("none"), "user.a"), std::system_error);
}

class TestFilesOnEachTest : public ::testing::TestWithParam<TestFileSystem> {};

INSTANTIATE_TEST_SUITE_P(OnEach, TestFilesOnEachTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(TestFilesOnEachTest, SetsAndReadsAttributes) {
    const TemporaryDirectory directory(GetParam().dir);
    if (!keepsUserAttributes(directory.path())) {
        MARROWDALE_SKIP("the file system keeps no user attributes");
    }
    writeFile(directory.path("file"), "");
    EXPECT_EQ(attribute(directory.path("file"), "user.a"), std::nullopt);
    setAttribute(directory.path("file"), "user.a", std::string_view("\0v", 2));
    EXPECT_EQ(attribute(directory.path("file"), "user.a"), std::string("\0v", 2));
}

TEST(TestFilesTest, ProgramFolderHoldsThisTest) {
    EXPECT_TRUE(std::filesystem::exists(programFolder() + "/testing_test"));
}

TEST(TestFilesTest, WaitsForWhatAnotherThreadDoes) {
    std::atomic<bool> done = false;
    std::thread other([&] { done = true; });
    EXPECT_TRUE(waitUntil([&] { return done.load(); }));
    other.join();
    EXPECT_FALSE(waitUntil([] { return false; }, std::chrono::milliseconds(2)));
}

}  // namespace
}  // namespace marrowdale
