#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <thread>
#include <unistd.h>

#include "platform/linux/operations/OperationsTestWorld.h"
#include "platform/testing/ScopedMount.h"

namespace marrowdale::native {
namespace {

struct RemovalTest : OperationsTest {
    // A chain of folders, each in the one before, with a file in each.
    void makeDeep(const std::string& top, int depth) {
        makeFolder(top);
        UniqueFD folder(::open(top.c_str(), O_RDONLY | O_DIRECTORY));
        const std::string name(50, 'd');
        for (int i = 0; i < depth; ++i) {
            ASSERT_EQ(::mkdirat(folder.get(), name.c_str(), 0755), 0);
            const UniqueFD file(::openat(folder.get(), "file", O_CREAT | O_WRONLY, 0644));
            folder = UniqueFD(::openat(folder.get(), name.c_str(), O_RDONLY | O_DIRECTORY));
            ASSERT_TRUE(folder);
        }
    }
};
INSTANTIATE_TEST_SUITE_P(OnEach, RemovalTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(RemovalTest, filesLinksPipesAndFoldersGo) {
    writeFile(world_.at("file"), "");
    makeFolder(world_.at("empty"));
    makeFolder(world_.at("full/inner"));
    writeFile(world_.at("full/inner/file"), "");
    ASSERT_EQ(::mkfifo(world_.at("pipe").c_str(), 0600), 0);
    std::filesystem::create_symlink("nowhere", world_.at("link"));
    for (const char* name : {"file", "empty", "full", "pipe", "link"}) {
        EXPECT_EQ(world_.remove(name), std::nullopt) << name;
    }
    EXPECT_TRUE(world_.names().empty());
    EXPECT_TRUE(world_.notes().empty());
    EXPECT_EQ(world_.remove("file")->code, ENOENT);
    EXPECT_EQ(world_.remove("")->code, EBUSY);
}

TEST_P(RemovalTest, whatTookTheNameSinceStays) {
    writeFile(world_.at("a"), "a");
    writeFile(world_.at("b"), "b");
    const URL meant = world_.url("a");
    const auto status = statEntry(AT_FDCWD, world_.at("a").c_str());
    ASSERT_TRUE(status);
    meant.setCachedResourceValue(ResourceKey::fileID, Number(raw(status->fileID)));
    std::filesystem::rename(world_.at("b"), world_.at("a"));
    std::promise<std::optional<Error>> answer;
    world_.operations.deleteItemAtURL(
        meant, [&](const std::optional<Error>& error) { answer.set_value(error); });
    EXPECT_EQ(answer.get_future().get().value_or(Error()).code, ENOENT);
    EXPECT_EQ(readFile(world_.at("a")), "b");
}

TEST_P(RemovalTest, linksOutOfATreeAreNotFollowed) {
    makeFolder(world_.outside("folder"));
    writeFile(world_.outside("folder/file"), "kept");
    makeFolder(world_.at("tree/inner"));
    std::filesystem::create_directory_symlink(world_.outside("folder"), world_.at("tree/out"));
    std::filesystem::create_symlink(world_.outside("folder/file"), world_.at("tree/inner/out"));
    EXPECT_EQ(world_.remove("tree"), std::nullopt);
    EXPECT_EQ(readFile(world_.outside("folder/file")), "kept");
    EXPECT_TRUE(world_.names().empty());
}

TEST_P(RemovalTest, treesDeeperThanAnyPathGo) {
    makeDeep(world_.at("deep"), 300);
    EXPECT_EQ(world_.remove("deep"), std::nullopt);
    EXPECT_TRUE(world_.names().empty());
}

TEST_P(RemovalTest, wideTreesGo) {
    makeFolder(world_.at("wide"));
    for (int i = 0; i < 5000; ++i) {
        writeFile(world_.at("wide/" + std::to_string(i)), "");
    }
    const auto monitor = std::make_shared<TestMonitor>();
    const ScopedOperationMonitor scope(monitor);
    EXPECT_EQ(world_.remove("wide"), std::nullopt);
    EXPECT_TRUE(world_.names().empty());
    EXPECT_EQ(monitor->last.entries, 5001U);
    EXPECT_EQ(monitor->last.kind, OperationProgress::Kind::deleting);
}

TEST_P(RemovalTest, entriesThatVanishMeanwhileDoNoHarm) {
    for (int round = 0; round < 10; ++round) {
        makeFolder(world_.at("tree"));
        for (int i = 0; i < 300; ++i) {
            makeFolder(world_.at("tree/" + std::to_string(i)));
            writeFile(world_.at("tree/" + std::to_string(i) + "/file"), "");
        }
        const UniqueFD tree(::open(world_.at("tree").c_str(), O_RDONLY | O_DIRECTORY));
        std::thread other([&] {
            for (int i = 299; i >= 0; --i) {
                ::unlinkat(tree.get(), (std::to_string(i) + "/file").c_str(), 0);
                ::unlinkat(tree.get(), std::to_string(i).c_str(), AT_REMOVEDIR);
            }
        });
        EXPECT_EQ(world_.remove("tree"), std::nullopt);
        other.join();
    }
}

TEST_P(RemovalTest, whatAppearsMeanwhileGoesToo) {
    makeFolder(world_.at("tree/inner"));
    for (int i = 0; i < 300; ++i) {
        writeFile(world_.at("tree/" + std::to_string(i)), "");
    }
    const UniqueFD inner(::open(world_.at("tree/inner").c_str(), O_RDONLY | O_DIRECTORY));
    std::thread other([&] {
        for (int i = 0; i < 300; ++i) {
            const UniqueFD file(::openat(inner.get(), std::to_string(i).c_str(),
                                         O_CREAT | O_WRONLY | O_CLOEXEC, 0600));
        }
    });
    EXPECT_EQ(world_.remove("tree"), std::nullopt);
    other.join();
    EXPECT_TRUE(world_.names().empty());
}

TEST_P(RemovalTest, cancelledBeforeItBeginsNothingGoes) {
    makeFolder(world_.at("tree"));
    writeFile(world_.at("tree/file"), "");
    const auto monitor = std::make_shared<TestMonitor>();
    monitor->cancel();
    const ScopedOperationMonitor scope(monitor);
    EXPECT_EQ(world_.remove("tree")->code, ECANCELED);
    EXPECT_TRUE(std::filesystem::exists(world_.at("tree/file")));
}

TEST_P(RemovalTest, cancelledInTheMiddleItGoesWhole) {
    makeFolder(world_.at("tree"));
    for (int i = 0; i < 100; ++i) {
        writeFile(world_.at("tree/" + std::to_string(i)), "");
    }
    const auto monitor = std::make_shared<TestMonitor>();
    monitor->cancelWhen = [](const OperationProgress&) { return true; };
    const ScopedOperationMonitor scope(monitor);
    EXPECT_EQ(world_.remove("tree"), std::nullopt);
    EXPECT_TRUE(world_.names().empty());
}

TEST_P(RemovalTest, whatCanNotBeRemovedComesBack) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    makeFolder(world_.at("tree/locked"));
    writeFile(world_.at("tree/locked/file"), "kept");
    ASSERT_EQ(::chmod(world_.at("tree/locked").c_str(), 0555), 0);
    const auto error = world_.remove("tree");
    ASSERT_TRUE(error);
    EXPECT_EQ(error->code, EACCES);
    EXPECT_EQ(error->subject, world_.at("tree/locked/file"));
    EXPECT_EQ(readFile(world_.at("tree/locked/file")), "kept");
    EXPECT_EQ(world_.names(), (std::set<std::string>{"tree"}));
    EXPECT_TRUE(world_.notes().empty());
}

TEST_P(RemovalTest, aMountInATreeIsNotEntered) {
    if (!runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    makeFolder(world_.at("tree/mount"));
    makeFolder(world_.outside("folder"));
    writeFile(world_.outside("folder/file"), "kept");
    const auto mount = ScopedMount::bind(world_.outside("folder"), world_.at("tree/mount"));
    ASSERT_TRUE(mount);
    EXPECT_TRUE(world_.remove("tree"));
    EXPECT_EQ(readFile(world_.outside("folder/file")), "kept");
    EXPECT_EQ(world_.names(), (std::set<std::string>{"tree"}));
}

// A folder is exchanged for a link to outside, over and over, while trees in it are removed.
TEST_P(RemovalTest, aFolderThatBecomesALinkLeadsNowhere) {
    makeFolder(world_.outside("tree/inner"));
    writeFile(world_.outside("tree/inner/file"), "kept");
    std::atomic<bool> done = false;
    std::filesystem::create_directory_symlink(world_.directory.path("outside"), world_.at("other"));
    makeFolder(world_.at("folder"));
    std::thread swapper([&] {
        while (!done) {
            ::renameat2(AT_FDCWD, world_.at("folder").c_str(), AT_FDCWD, world_.at("other").c_str(),
                        RENAME_EXCHANGE);
        }
    });
    for (int round = 0; round < 200; ++round) {
        const UniqueFD folder(
            ::open(world_.at("folder").c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW));
        if (folder) {
            ::mkdirat(folder.get(), "tree", 0755);
            ::mkdirat(folder.get(), "tree/inner", 0755);
            const UniqueFD file(
                ::openat(folder.get(), "tree/inner/file", O_CREAT | O_WRONLY, 0600));
        }
        static_cast<void>(world_.remove("folder/tree"));
        static_cast<void>(world_.rename("folder/tree", "renamed"));
        static_cast<void>(world_.create("made", "folder"));
    }
    done = true;
    swapper.join();
    EXPECT_EQ(readFile(world_.outside("tree/inner/file")), "kept");
    EXPECT_EQ(OperationsWorld::namesIn(world_.directory.path("outside")),
              (std::set<std::string>{"tree"}));
}

}  // namespace
}  // namespace marrowdale::native
