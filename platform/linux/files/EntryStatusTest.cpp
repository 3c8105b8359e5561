#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <string>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "platform/linux/files/EntryStatus.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

class EntryStatusTest : public testing::Test {
  protected:
    [[nodiscard]] std::string at(const char* name) const { return root_ + "/" + name; }

    TemporaryDirectory folder_;
    std::string root_ = folder_.path();
};

TEST_F(EntryStatusTest, saysWhatStatSays) {
    writeFile(at("file"), "12345");
    ASSERT_EQ(::chmod(at("file").c_str(), 0640), 0);
    struct stat expected{};
    ASSERT_EQ(::stat(at("file").c_str(), &expected), 0);
    const auto status = statEntry(AT_FDCWD, at("file").c_str());
    ASSERT_TRUE(status);
    EXPECT_TRUE(status->isRegular());
    EXPECT_EQ(status->size, 5U);
    EXPECT_EQ(status->mode, expected.st_mode);
    EXPECT_EQ(raw(status->fileID), expected.st_ino);
    EXPECT_EQ(raw(status->device), major(expected.st_dev) << 20U | minor(expected.st_dev));
    EXPECT_EQ(status->owner, expected.st_uid);
    EXPECT_EQ(status->modified, (Date{expected.st_mtim.tv_sec,
                                      static_cast<std::uint32_t>(expected.st_mtim.tv_nsec)}));
}

TEST_F(EntryStatusTest, looksAtALinkItselfAndAtItsTargetWhenAsked) {
    writeFile(at("file"), "12345");
    std::filesystem::create_symlink("file", at("link"));
    std::filesystem::create_symlink("nowhere", at("dangling"));
    std::filesystem::create_symlink("loop", at("loop"));
    EXPECT_TRUE(statEntry(AT_FDCWD, at("link").c_str())->isSymbolicLink());
    EXPECT_TRUE(statTarget(AT_FDCWD, at("link").c_str())->isRegular());
    EXPECT_TRUE(statEntry(AT_FDCWD, at("dangling").c_str())->isSymbolicLink());
    EXPECT_EQ(statTarget(AT_FDCWD, at("dangling").c_str()).error().code, ENOENT);
    EXPECT_EQ(statTarget(AT_FDCWD, at("loop").c_str()).error().code, ELOOP);
}

TEST_F(EntryStatusTest, looksAtAnOpenFile) {
    const int folder = ::open(root_.c_str(), O_PATH | O_CLOEXEC);
    ASSERT_GE(folder, 0);
    const auto status = statEntry(folder, "");
    EXPECT_TRUE(status && status->isDirectory());
    EXPECT_EQ(statEntry(folder, "none").error().code, ENOENT);
    EXPECT_EQ(statEntry(folder, "none").error().subject, "none");
    ::close(folder);
}

TEST_F(EntryStatusTest, fingerprintStaysThroughARenameAndDiffersBetweenFiles) {
    writeFile(at("a"), "");
    writeFile(at("b"), "");
    const auto first = handleFingerprint(AT_FDCWD, at("a").c_str());
    ASSERT_TRUE(first);
    if (*first == 0) {
        MARROWDALE_SKIP("the file system of the temporary folder gives no file handles");
    }
    EXPECT_NE(*first, *handleFingerprint(AT_FDCWD, at("b").c_str()));
    std::filesystem::rename(at("a"), at("c"));
    EXPECT_EQ(*first, *handleFingerprint(AT_FDCWD, at("c").c_str()));
    EXPECT_EQ(handleFingerprint(AT_FDCWD, at("a").c_str()).error().code, ENOENT);
}

TEST_F(EntryStatusTest, fingerprintTellsTheNextFileOfAnInodeNumberApart) {
    for (int round = 0; round < 50; ++round) {
        writeFile(at("a"), "");
        const FileID number = statEntry(AT_FDCWD, at("a").c_str())->fileID;
        const std::uint32_t fingerprint = *handleFingerprint(AT_FDCWD, at("a").c_str());
        if (fingerprint == 0) {
            MARROWDALE_SKIP("the file system of the temporary folder gives no file handles");
        }
        std::filesystem::remove(at("a"));
        writeFile(at("b"), "");
        if (statEntry(AT_FDCWD, at("b").c_str())->fileID == number) {
            EXPECT_NE(fingerprint, *handleFingerprint(AT_FDCWD, at("b").c_str()));
        }
        std::filesystem::remove(at("b"));
    }
}

}  // namespace
}  // namespace marrowdale::native
