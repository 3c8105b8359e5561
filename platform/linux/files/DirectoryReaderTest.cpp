#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <set>
#include <string>
#include <sys/stat.h>

#include <gtest/gtest.h>

#include "platform/linux/files/DirectoryReader.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {
namespace {

class DirectoryReaderTest : public testing::Test {
  protected:
    void makeFiles(int count) const {
        for (int i = 0; i < count; ++i) {
            writeFile(root_ + "/file" + std::to_string(i), "");
        }
    }
    [[nodiscard]] DirectoryReader reader(std::size_t bufferBytes) const {
        auto folder = openFolder(root_);
        EXPECT_TRUE(folder.has_value());
        return {std::move(*folder), bufferBytes};
    }

    TemporaryDirectory folder_;
    std::string root_ = folder_.path();
};

std::set<std::string> namesOf(DirectoryReader& reader) {
    std::set<std::string> names;
    for (auto entry = reader.next(); entry && *entry; entry = reader.next()) {
        EXPECT_TRUE(names.emplace((*entry)->name).second) << (*entry)->name;
        EXPECT_EQ((*entry)->name.data()[(*entry)->name.size()], '\0');
    }
    return names;
}

TEST_F(DirectoryReaderTest, readsEveryEntryOnceThroughManyBuffers) {
    makeFiles(500);
    DirectoryReader folder = reader(1024);
    EXPECT_EQ(namesOf(folder).size(), 500U);
}

TEST_F(DirectoryReaderTest, leavesDotAndDotDotOutAndKeepsNamesThatBeginWithDots) {
    makeFiles(1);
    writeFile(root_ + "/...", "");
    writeFile(root_ + "/.a", "");
    DirectoryReader folder = reader(8192);
    EXPECT_EQ(namesOf(folder), (std::set<std::string>{"file0", "...", ".a"}));
}

TEST_F(DirectoryReaderTest, goesOnBehindAPosition) {
    makeFiles(300);
    DirectoryReader first = reader(512);
    std::set<std::string> seen;
    std::int64_t position = 0;
    for (int i = 0; i < 120; ++i) {
        const auto entry = first.next();
        ASSERT_TRUE(entry && *entry);
        seen.emplace((*entry)->name);
        position = (*entry)->position;
    }
    DirectoryReader second = reader(8192);
    ASSERT_TRUE(second.seek(position));
    const std::set<std::string> rest = namesOf(second);
    EXPECT_EQ(rest.size(), 180U);
    seen.insert(rest.begin(), rest.end());
    EXPECT_EQ(seen.size(), 300U);
    ASSERT_TRUE(second.seek(0));
    EXPECT_EQ(namesOf(second).size(), 300U);
}

TEST_F(DirectoryReaderTest, opensNoLinkAndNothingOutsideTheTree) {
    std::filesystem::create_directories(root_ + "/in/below");
    std::filesystem::create_directory_symlink("/", root_ + "/out");
    std::filesystem::create_directory_symlink("in", root_ + "/link");
    makeFiles(1);
    const auto base = openFolder(root_);
    ASSERT_TRUE(base);
    EXPECT_TRUE(openFolderBeneath(base->get(), "in/below"));
    EXPECT_TRUE(openFolderBeneath(base->get(), ""));
    const auto codeOf = [&](const char* path) {
        const auto opened = openFolderBeneath(base->get(), path);
        return opened ? 0 : opened.error().code;
    };
    EXPECT_EQ(codeOf("out/tmp"), ELOOP);
    EXPECT_EQ(codeOf("link/below"), ELOOP);
    EXPECT_TRUE(codeOf("link") == ELOOP || codeOf("link") == ENOTDIR);
    EXPECT_EQ(codeOf("../"), EXDEV);
    EXPECT_EQ(codeOf("/tmp"), EXDEV);
    EXPECT_EQ(codeOf("file0"), ENOTDIR);
    EXPECT_EQ(codeOf("none"), ENOENT);
    EXPECT_FALSE(openFolder(root_ + "/link"));
}

TEST_F(DirectoryReaderTest, opensFoldersBeyondTheLongestPath) {
    const std::string name(250, 'd');
    std::string path;
    UniqueFD at(::open(root_.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    for (int depth = 0; depth < 40; ++depth) {
        ASSERT_TRUE(at);
        ASSERT_EQ(::mkdirat(at.get(), name.c_str(), 0700), 0);
        at.reset(::openat(at.get(), name.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
        path += (path.empty() ? "" : "/") + name;
    }
    const auto base = openFolder(root_);
    ASSERT_TRUE(base);
    EXPECT_TRUE(openFolderBeneath(base->get(), path));
    EXPECT_TRUE(openFolder(root_ + "/" + path));
    EXPECT_FALSE(openFolderBeneath(base->get(), path + "/none"));
    EXPECT_FALSE(openFolderBeneath(base->get(), std::string(5000, 'x')));
}

}  // namespace
}  // namespace marrowdale::native
