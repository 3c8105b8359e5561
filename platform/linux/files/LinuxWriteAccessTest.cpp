#include <cerrno>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

#include "platform/linux/files/LinuxFilesTestWorld.h"
#include "platform/linux/files/LinuxWriteAccess.h"

namespace marrowdale::native {
namespace {

struct LinuxWriteAccessTest : OnEachFileSystem {};
INSTANTIATE_TEST_SUITE_P(OnEach, LinuxWriteAccessTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(LinuxWriteAccessTest, opensOnlyFilesAndFolders) {
    writeFile(world_.at("file"), "");
    makeFolder(world_.at("folder"));
    std::filesystem::create_symlink("file", world_.at("link"));
    ASSERT_EQ(::mkfifo(world_.at("pipe").c_str(), 0600), 0);
    EXPECT_TRUE(world_.writeAccess.openForWriting(world_.url("file")));
    EXPECT_TRUE(world_.writeAccess.openForWriting(world_.url("folder")));
    const auto codeOf = [&](const char* name) {
        const auto opened = world_.writeAccess.openForWriting(world_.url(name));
        return opened ? 0 : opened.error().code;
    };
    EXPECT_EQ(codeOf("link"), ENOTSUP);
    EXPECT_EQ(codeOf("pipe"), ENOTSUP);
    EXPECT_EQ(codeOf("none"), ENOENT);
}

TEST_P(LinuxWriteAccessTest, refusalIsTheFileDomains513) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    writeFile(world_.at("file"), "");
    ASSERT_EQ(::chmod(world_.at("file").c_str(), 0400), 0);
    const auto opened = world_.writeAccess.openForWriting(world_.url("file"));
    ASSERT_FALSE(opened);
    EXPECT_EQ(opened.error(), errorFileWriteNoPermission());
    // One that may be written and not read can be opened all the same.
    ASSERT_EQ(::chmod(world_.at("file").c_str(), 0200), 0);
    EXPECT_TRUE(world_.writeAccess.openForWriting(world_.url("file")));
}

}  // namespace
}  // namespace marrowdale::native
