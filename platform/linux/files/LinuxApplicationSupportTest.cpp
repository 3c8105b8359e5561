#include <cerrno>
#include <csignal>
#include <filesystem>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "platform/linux/files/LinuxApplicationSupport.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {
namespace {

class LinuxApplicationSupportTest : public ::testing::Test {
  protected:
    URL url(std::string_view name) const { return URL::fileURL(directory_.path(name)); }
    std::vector<std::string> names() const {
        std::vector<std::string> found;
        for (const auto& entry : std::filesystem::directory_iterator(directory_.path())) {
            found.push_back(entry.path().filename());
        }
        return found;
    }

    TemporaryDirectory directory_;
    LinuxApplicationSupport support_{directory_.path()};
};

TEST_F(LinuxApplicationSupportTest, namesTheFolderOfTheUser) {
    EXPECT_EQ(support_.applicationSupportDirectories(),
              std::vector<URL>{URL::fileURL(directory_.path())});
    EXPECT_TRUE(LinuxApplicationSupport("").applicationSupportDirectories().empty());
}

TEST_F(LinuxApplicationSupportTest, whatWasWrittenIsReadAndNothingIsLeftBeside) {
    ASSERT_TRUE(support_.replace(url("a.plist"), Data::fromText("old")));
    ASSERT_TRUE(support_.replace(url("a.plist"), Data::fromText("new")));
    EXPECT_EQ(support_.read(url("a.plist"))->text(), "new");
    EXPECT_EQ(names(), std::vector<std::string>{"a.plist"});
}

TEST_F(LinuxApplicationSupportTest, aMissingFileIsNoSuchFile) {
    const auto data = support_.read(url("a"));
    ASSERT_FALSE(data);
    EXPECT_EQ(data.error(), (Error{ErrorDomain::file, 260, {}, {}}));
    // Below something that is no folder it is another error.
    writeFile(directory_.path("b"), "");
    EXPECT_EQ(support_.read(url("b/a")).error(), errorWithPOSIXCode(ENOTDIR));
}

TEST_F(LinuxApplicationSupportTest, whatIsNoRegularFileIsRefusedWithoutWaiting) {
    ASSERT_EQ(::mkfifo(directory_.path("pipe").c_str(), 0600), 0);
    EXPECT_EQ(support_.read(url("pipe")).error(), errorWithPOSIXCode(EINVAL));
    makeFolder(directory_.path("folder"));
    EXPECT_EQ(support_.read(url("folder")).error(), errorWithPOSIXCode(EINVAL));
}

TEST_F(LinuxApplicationSupportTest, aFileOfEndlessSizeIsRefused) {
    writeFile(directory_.path("large"), "");
    std::filesystem::resize_file(directory_.path("large"),
                                 LinuxApplicationSupport::largestFile + 1);
    EXPECT_EQ(support_.read(url("large")).error(), errorWithPOSIXCode(EFBIG));
}

TEST_F(LinuxApplicationSupportTest, foldersAreMadeWithThoseAboveThem) {
    EXPECT_TRUE(support_.createDirectory(url("a/b/c")));
    EXPECT_TRUE(std::filesystem::is_directory(directory_.path("a/b/c")));
    EXPECT_TRUE(support_.createDirectory(url("a/b/c")));
    writeFile(directory_.path("file"), "");
    EXPECT_EQ(support_.createDirectory(url("file")).error(), errorWithPOSIXCode(ENOTDIR));
    EXPECT_EQ(support_.createDirectory(url("file/a")).error(), errorWithPOSIXCode(ENOTDIR));
}

TEST_F(LinuxApplicationSupportTest, aReplacementThatFailsLeavesTheOldFileAlone) {
    makeFolder(directory_.path("taken/x"));  // a folder can't be replaced by a file
    EXPECT_FALSE(support_.replace(url("taken"), Data::fromText("new")));
    EXPECT_EQ(names(), std::vector<std::string>{"taken"});
    EXPECT_EQ(support_.replace(url("none/a"), Data::fromText("new")).error(),
              errorWithPOSIXCode(ENOENT));
}

TEST_F(LinuxApplicationSupportTest, whatAKilledWriterLeftIsTakenOver) {
    writeFile(directory_.path("victim"), "untouched");
    std::filesystem::create_symlink("victim", directory_.path(".a.new"));
    ASSERT_TRUE(support_.replace(url("a"), Data::fromText("new")));
    EXPECT_EQ(readFile(directory_.path("victim")), "untouched");
    EXPECT_EQ(readFile(directory_.path("a")), "new");
}

TEST_F(LinuxApplicationSupportTest, aDiskThatIsFullLeavesTheOldFileAndNoCopy) {
    ASSERT_TRUE(support_.replace(url("a"), Data::fromText("old")));
    const pid_t child = ::fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        // A limit on file sizes stands for the disk: the write fails in the middle.
        ::signal(SIGXFSZ, SIG_IGN);
        const rlimit limit{4096, 4096};
        ::setrlimit(RLIMIT_FSIZE, &limit);
        const auto written = support_.replace(url("a"), Data(Bytes(100'000, 'x')));
        ::_exit(!written && written.error() == errorWithPOSIXCode(EFBIG) ? 0 : 1);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(readFile(directory_.path("a")), "old");
    EXPECT_EQ(names(), std::vector<std::string>{"a"});
}

TEST_F(LinuxApplicationSupportTest, aKillAtAnyMomentLeavesTheOldContentsOrTheNew) {
    const std::string contents[] = {std::string(200'000, 'a'), std::string(200'000, 'b')};
    ASSERT_TRUE(support_.replace(url("f"), Data::fromText(contents[0])));
    for (int round = 0; round < 30; ++round) {
        const pid_t child = ::fork();
        ASSERT_GE(child, 0);
        if (child == 0) {
            for (unsigned i = 0;; ++i) {
                (void)support_.replace(url("f"), Data::fromText(contents[i % 2]));
            }
        }
        // Some way into its work: it has replaced the file at least once.
        struct stat before{};
        ASSERT_EQ(::stat(directory_.path("f").c_str(), &before), 0);
        EXPECT_TRUE(waitUntil([&] {
            struct stat now{};
            return ::stat(directory_.path("f").c_str(), &now) == 0 &&
                   (now.st_ino != before.st_ino || now.st_ctim.tv_nsec != before.st_ctim.tv_nsec);
        }));
        ::kill(child, SIGKILL);
        ::waitpid(child, nullptr, 0);
        const std::string found = readFile(directory_.path("f"));
        EXPECT_TRUE(found == contents[0] || found == contents[1]);
    }
}

}  // namespace
}  // namespace marrowdale::native
