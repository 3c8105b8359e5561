// Actions where there is no room left: nothing is half there, and what frees room still works.

#include <cerrno>
#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

#include <gtest/gtest.h>

#include "platform/testing/ScopedMount.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"
#include "tests/actions/ActionsWorld.h"
#include "tests/powerloss/DiskFormat.h"
#include "tests/powerloss/LoopMount.h"

namespace marrowdale::tests {
namespace {

namespace fs = std::filesystem;

// Takes all the room that there is.
class Filler {
  public:
    explicit Filler(std::string folder) : folder_(std::move(folder)) { makeFolder(folder_); }
    // Bytes first, smaller and smaller, then names.
    void fill() {
        const native::UniqueFD file(
            ::open((folder_ + "/0").c_str(), O_CREAT | O_WRONLY | O_APPEND | O_CLOEXEC, 0644));
        for (std::size_t size = 1U << 20U; size >= 512; size /= 2) {
            const std::string block(size, 'x');
            while (::write(file.get(), block.data(), block.size()) > 0) {
            }
            ::fsync(file.get());
        }
        while (makeNext()) {
        }
    }

  private:
    bool makeNext() {
        const std::string path = folder_ + "/" + std::to_string(++number_);
        return static_cast<bool>(
            native::UniqueFD(::open(path.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644)));
    }

    std::string folder_;
    int number_ = 0;
};

class FullDiskTest : public testing::Test {
  protected:
    void SetUp() override {
        if (!runsAsRoot()) {
            MARROWDALE_SKIP_FOR_USER("only root may mount");
        }
    }
    // On what is mounted below the world's folder by now; `code` is what a lack of room is called.
    void fillAndAct(int code, const std::string& filledFolder) {
        makeFolder(world_.path("box/folder/inner"));
        makeFolder(world_.directory().path("outside"));
        for (const char* file : {"box/a", "box/b", "box/folder/c", "box/folder/inner/d"}) {
            writeFile(world_.path(file), file);
        }
        writeFile(world_.outside("new"), std::string(3 << 20, 'x'));
        world_.open();
        Filler filler(filledFolder);
        const auto box = world_.identifierOf("box");
        const auto file = world_.identifierOf("box/a");
        const auto other = world_.identifierOf("box/b");
        const auto folder = world_.identifierOf("box/folder");
        filler.fill();
        const auto before = boxPicture();
        EXPECT_EQ(codeOf(world_.import(world_.outside("new"), box)), code);
        EXPECT_EQ(codeOf(world_.create("new", box)), code);
        EXPECT_EQ(codeOf(world_.trash(file)), code);  // there is no trash yet
        EXPECT_EQ(boxPicture(), before);
        const auto failure = world_.remove(folder);
        EXPECT_EQ(failure, std::nullopt) << failure->description();
        EXPECT_FALSE(fs::exists(world_.box("folder")));
        // A quota may stand in the way of a new name.
        const int renamed = codeOf(world_.rename(file, "renamed"));
        EXPECT_TRUE(renamed == 0 || (code == EDQUOT && renamed == code)) << renamed;
        EXPECT_EQ(readFile(world_.box(renamed == 0 ? "renamed" : "a")), "box/a");
        filler.fill();
        EXPECT_EQ(world_.remove(other), std::nullopt);
        EXPECT_FALSE(fs::exists(world_.box("b")));
        EXPECT_EQ(world_.leftOvers(), std::set<std::string>());
        world_.close();
    }

    ActionsWorld world_{std::string()};

  private:
    [[nodiscard]] std::map<std::string, std::string> boxPicture() const {
        auto picture = world_.picture();
        std::erase_if(picture, [](const auto& entry) { return !entry.first.starts_with("box/"); });
        return picture;
    }
};

TEST_F(FullDiskTest, nothingIsLostAndDeletingMakesRoom) {
    const auto mount = ScopedMount::memory(world_.directory().path(), "size=8m,nr_inodes=200");
    ASSERT_TRUE(mount);
    fillAndAct(ENOSPC, world_.directory().path("filler"));
}

bool runs(std::vector<std::string> words) {
    std::vector<char*> arguments;
    for (std::string& word : words) {
        arguments.push_back(word.data());
    }
    arguments.push_back(nullptr);
    pid_t process = -1;
    int status = 0;
    return ::posix_spawnp(&process, arguments.front(), nullptr, nullptr, arguments.data(),
                          environ) == 0 &&
           ::waitpid(process, &status, 0) == process && status == 0;
}

// The quotas of btrfs, for they bind root as well.
TEST_F(FullDiskTest, aQuotaIsAsGoodAsAFullDisk) {
    const DiskFormat format = diskFormats().back();
    ASSERT_EQ(format.name, "btrfs");
    const auto disk = format.make();
    const auto mount = LoopMount::mount(disk.path(), world_.root(), format);
    if (!mount) {
        MARROWDALE_SKIP("can't mount btrfs: " + mount.error().description());
    }
    if (!runs({"btrfs", "quota", "enable", world_.root()}) ||
        !runs({"btrfs", "qgroup", "limit", "16M", world_.root()})) {
        MARROWDALE_SKIP("btrfs has no quotas here");
    }
    fillAndAct(EDQUOT, world_.path("filler"));
}

}  // namespace
}  // namespace marrowdale::tests
