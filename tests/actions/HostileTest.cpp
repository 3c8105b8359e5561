// Actions on disks that are full, may not be written or change under them.

#include <atomic>
#include <cerrno>
#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <thread>
#include <unistd.h>
#include <vector>

#include <gtest/gtest.h>

#include "platform/testing/ScopedMount.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"
#include "tests/actions/ActionsWorld.h"
#include "tests/changes/Replica.h"

namespace marrowdale::tests {
namespace {

namespace fs = std::filesystem;

class HostileTest : public testing::TestWithParam<TestFileSystem> {
  protected:
    ~HostileTest() override { world_.close(); }
    void makeTree(const std::string& folder, int files) {
        makeFolder(folder);
        for (int i = 0; i < files; ++i) {
            writeFile(folder + "/" + std::to_string(i), "x");
        }
    }
    // Exchanges the folder for a link to outside, over and over, while each action is done on what
    // is in it.
    void actWhileSwapping(const std::string& folder) {
        makeTree(world_.outside("target/folder"), 3);
        writeFile(world_.outside("target/file"), "kept");
        writeFile(world_.outside("source"), "source");
        makeTree(world_.outside("tree"), 3);
        makeFolder(world_.path("swapped"));
        makeFolder(world_.path(".Trash"));
        fs::create_directory_symlink(world_.outside("target"), world_.path("link"));
        world_.open();
        const auto before = entriesBelow(world_.outside("target"));
        std::atomic<bool> done = false;
        std::thread swapper([&] {
            while (!done) {
                ::renameat2(AT_FDCWD, world_.path(folder).c_str(), AT_FDCWD,
                            world_.path("link").c_str(), RENAME_EXCHANGE);
            }
        });
        for (int round = 0; round < 40 * stress(); ++round) {
            actIn("swapped", std::to_string(round));
        }
        done = true;
        swapper.join();
        EXPECT_EQ(entriesBelow(world_.outside("target")), before);
        EXPECT_EQ(readFile(world_.outside("target/file")), "kept");
        EXPECT_EQ(world_.leftOvers(), std::set<std::string>());
    }

    ActionsWorld world_{GetParam().dir};

  private:
    static std::set<std::string> entriesBelow(const std::string& folder) {
        std::set<std::string> paths;
        for (const auto& entry : fs::recursive_directory_iterator(folder)) {
            paths.insert(entry.path().string());
        }
        return paths;
    }
    void actIn(const std::string& folder, const std::string& number) {
        const auto box = world_.identifierOf("box");
        const auto into = world_.identifierOf(folder);
        static_cast<void>(world_.import(world_.outside("source"), into));
        static_cast<void>(world_.import(world_.outside("tree"), into));
        static_cast<void>(world_.create("made", into));
        for (const std::string name : {"source", "tree", "made"}) {
            const std::string item = world_.identifierOf(folder + "/" + name);
            if (item.empty()) {
                continue;  // behind the link just now
            }
            static_cast<void>(world_.rename(item, name + number));
            static_cast<void>(world_.move(item, box));
            static_cast<void>(world_.move(item, into));
            static_cast<void>(world_.trash(item));
            static_cast<void>(world_.untrash(item, into));
            static_cast<void>(world_.remove(item));
        }
    }
};

INSTANTIATE_TEST_SUITE_P(OnEach, HostileTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(HostileTest, aFolderThatBecomesALinkLeadsNowhere) {
    actWhileSwapping("swapped");
}

TEST_P(HostileTest, aTrashThatBecomesALinkLeadsNowhere) {
    actWhileSwapping(".Trash");
}

TEST_P(HostileTest, aReadOnlyMountRefusesEveryActionAndKeepsAll) {
    if (!runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    writeFile(world_.box("a"), "a");
    makeTree(world_.box("folder"), 3);
    makeFolder(world_.path(".Trash"));
    writeFile(world_.path(".Trash/t"), "t");
    writeFile(world_.outside("new"), "new");
    const auto mount = ScopedMount::bind(world_.root(), world_.root());
    ASSERT_TRUE(mount);
    world_.open();
    const auto box = world_.identifierOf("box");
    const auto file = world_.identifierOf("box/a");
    const auto folder = world_.identifierOf("box/folder");
    const auto trashed = world_.identifierOf(".Trash/t");
    const auto before = world_.picture();
    ASSERT_EQ(
        ::mount("none", world_.root().c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr),
        0);
    EXPECT_EQ(codeOf(world_.import(world_.outside("new"), box)), EROFS);
    EXPECT_EQ(codeOf(world_.import(world_.outside("new"), folder)), EROFS);
    EXPECT_EQ(codeOf(world_.create("new", box)), EROFS);
    EXPECT_EQ(codeOf(world_.rename(file, "b")), EROFS);
    EXPECT_EQ(codeOf(world_.move(file, folder)), EROFS);
    EXPECT_EQ(codeOf(world_.trash(file)), EROFS);
    EXPECT_EQ(codeOf(world_.untrash(trashed, box)), EROFS);
    EXPECT_EQ(world_.remove(file).value_or(Error()).code, EROFS);
    EXPECT_EQ(world_.remove(folder).value_or(Error()).code, EROFS);
    EXPECT_EQ(codeOf(world_.favorite(file, 1)), EACCES);
    EXPECT_EQ(world_.picture(), before);
    EXPECT_EQ(world_.leftOvers(), std::set<std::string>());
}

TEST_P(HostileTest, permissionTakenAwayBetweenLookAndActIsSaid) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    writeFile(world_.box("a"), "a");
    makeTree(world_.box("folder"), 3);
    makeFolder(world_.path("other"));
    writeFile(world_.path("other/o"), "o");
    makeFolder(world_.path(".Trash"));
    writeFile(world_.outside("new"), "new");
    world_.open();
    const auto box = world_.identifierOf("box");
    const auto file = world_.identifierOf("box/a");
    const auto folder = world_.identifierOf("box/folder");
    const auto other = world_.identifierOf("other/o");
    const auto before = world_.picture();
    // The item was looked up; then its folder is closed, and only then the file work begins.
    world_.world().fileOperations.answer = [&](auto, const URL&) -> std::optional<Expected<URL>> {
        ::chmod(world_.path("box").c_str(), 0555);
        return std::nullopt;
    };
    const auto reopened = [&](auto code) {
        EXPECT_EQ(::chmod(world_.path("box").c_str(), 0755), 0);
        return code;
    };
    EXPECT_EQ(reopened(codeOf(world_.import(world_.outside("new"), box))), EACCES);
    EXPECT_EQ(reopened(codeOf(world_.create("new", box))), EACCES);
    EXPECT_EQ(reopened(codeOf(world_.rename(file, "b"))), EACCES);
    EXPECT_EQ(reopened(codeOf(world_.move(other, box))), EACCES);
    EXPECT_EQ(reopened(codeOf(world_.trash(file))), EACCES);
    EXPECT_EQ(reopened(world_.remove(file).value_or(Error()).code), EACCES);
    EXPECT_EQ(reopened(world_.remove(folder).value_or(Error()).code), EACCES);
    EXPECT_EQ(world_.picture(), before);
    EXPECT_EQ(world_.leftOvers(), std::set<std::string>());
}

TEST_P(HostileTest, aNameThatIsTooLongForTheTargetIsSaid) {
    const std::string longest(255, 'n');
    writeFile(world_.outside(longest), "n");
    makeFolder(world_.path(".Trash"));
    writeFile(world_.path(".Trash/" + longest), "other");
    world_.open();
    const auto box = world_.identifierOf("box");
    const auto made = world_.import(world_.outside(longest), box);
    ASSERT_TRUE(made);
    const std::string item = (*made)->itemIdentifier;
    EXPECT_EQ(codeOf(world_.rename(item, longest + "n")), ENAMETOOLONG);
    EXPECT_EQ(codeOf(world_.move(item, world_.identifierOf("box"), longest + "n")), ENAMETOOLONG);
    EXPECT_EQ(codeOf(world_.create(longest + "n", box)), ENAMETOOLONG);
    // The name in the trash is taken, and a number makes it no longer.
    const auto trashed = world_.trash(item);
    ASSERT_TRUE(trashed);
    EXPECT_EQ((*trashed)->filename.size(), 255U);
    EXPECT_EQ(readFile(world_.path(".Trash/" + longest)), "other");
}

TEST_P(HostileTest, aFolderOfAHundredThousandIsMovedTrashedPutBackAndDeleted) {
    const int files = stress() > 1 ? 1'000'000 : 100'000;
    makeTree(world_.box("many"), 0);
    const int folder = ::open(world_.box("many").c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    for (int i = 0; i < files; ++i) {
        const native::UniqueFD made(::openat(folder, ("f" + std::to_string(i)).c_str(),
                                             O_CREAT | O_WRONLY | O_CLOEXEC, 0644));
        ASSERT_TRUE(made);
    }
    ::close(folder);
    makeFolder(world_.path("other"));
    world_.open();
    const auto item = world_.identifierOf("box/many");
    ASSERT_TRUE(world_.rename(item, "renamed"));
    ASSERT_TRUE(world_.move(item, world_.identifierOf("other")));
    ASSERT_TRUE(world_.trash(item));
    EXPECT_TRUE(fs::exists(world_.path(".Trash/renamed/f99999")));
    ASSERT_TRUE(world_.untrash(item, world_.identifierOf("box")));
    EXPECT_TRUE(fs::exists(world_.box("renamed/f99999")));
    ASSERT_TRUE(world_.trash(item));
    EXPECT_EQ(world_.remove(item), std::nullopt);
    EXPECT_EQ(world_.picture(),
              (std::map<std::string, std::string>{{".Trash/", ""}, {"box/", ""}, {"other/", ""}}));
}

}  // namespace
}  // namespace marrowdale::tests
