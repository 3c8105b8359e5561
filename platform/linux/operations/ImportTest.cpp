#include <array>
#include <cerrno>
#include <csignal>
#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "platform/linux/operations/OperationsTestWorld.h"
#include "platform/testing/ScopedMount.h"

namespace marrowdale::native {
namespace {

constexpr const char* tagName = "user.com.quillory.metadata:_kMDItemUserTags";

struct stat statusOf(const std::string& path) {
    struct stat found{};
    EXPECT_EQ(::lstat(path.c_str(), &found), 0) << path;
    return found;
}

// Each test with the file made without a name, and in a hidden folder.
struct ImportTest : testing::TestWithParam<std::tuple<TestFileSystem, ImportMethod>> {
    [[nodiscard]] bool hasAttributes() const {
        return keepsUserAttributes(world_.directory.path());
    }
    void expectNoTraces() const {
        EXPECT_TRUE(world_.names().empty()) << *world_.names().begin();
        EXPECT_TRUE(world_.notes().empty());
    }

    OperationsWorld world_{std::get<0>(GetParam()).dir, NoReplaceMethod::rename,
                           std::get<1>(GetParam())};
    const std::string source_ = world_.outside("source");
};

std::string testName(const testing::TestParamInfo<ImportTest::ParamType>& test) {
    const auto& [fileSystem, method] = test.param;
    return fileSystem.name + (method == ImportMethod::unnamedFile ? "Unnamed" : "Hidden");
}
INSTANTIATE_TEST_SUITE_P(OnEach, ImportTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(ImportMethod::unnamedFile,
                                                          ImportMethod::hiddenFolder)),
                         testName);

TEST_P(ImportTest, aFileComesWithAllThatBelongsToIt) {
    const std::string contents(100'000, 'x');
    writeFile(source_, contents);
    if (hasAttributes()) {
        setAttribute(source_, tagName, "red");
        setAttribute(source_, "user.other", "");
    }
    ASSERT_EQ(::chmod(source_.c_str(), 04751), 0);
    const std::array times{timespec{1, 2}, timespec{1'000'000'000, 123'456'789}};
    ASSERT_EQ(::utimensat(AT_FDCWD, source_.c_str(), times.data(), 0), 0);
    const auto imported = world_.import(source_);
    ASSERT_TRUE(imported) << imported.error().description();
    EXPECT_EQ(*imported, world_.url("source"));
    EXPECT_EQ(readFile(world_.at("source")), contents);
    EXPECT_EQ(readFile(source_), contents);
    const auto status = statusOf(world_.at("source"));
    EXPECT_EQ(status.st_mode & 07777U, 0751U);
    EXPECT_EQ(status.st_mtim.tv_sec, 1'000'000'000);
    EXPECT_EQ(status.st_nlink, 1U);
    if (hasAttributes()) {
        EXPECT_EQ(attribute(world_.at("source"), tagName), "red");
        EXPECT_EQ(attribute(world_.at("source"), "user.other"), "");
    }
    EXPECT_EQ(world_.names(), (std::set<std::string>{"source"}));
    EXPECT_TRUE(world_.notes().empty());
}

TEST_P(ImportTest, aTreeComesWithAllThatIsInIt) {
    makeFolder(source_ + "/inner/empty");
    writeFile(source_ + "/inner/file", "inner");
    writeFile(source_ + "/file", "");
    writeFile(source_ + "/.hidden", "hidden");
    writeFile(world_.outside("target"), "out");
    std::filesystem::create_symlink("../target", source_ + "/link");
    std::filesystem::create_symlink("nowhere", source_ + "/inner/broken");
    ASSERT_EQ(::mkfifo((source_ + "/pipe").c_str(), 0640), 0);
    if (hasAttributes()) {
        setAttribute(source_, tagName, "red");
        setAttribute(source_ + "/inner/file", tagName, "blue");
    }
    ASSERT_EQ(::chmod((source_ + "/inner").c_str(), 0500), 0);
    const std::array times{timespec{1, 0}, timespec{1000, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, source_.c_str(), times.data(), 0), 0);
    const auto imported = world_.import(source_);
    ASSERT_TRUE(imported) << imported.error().description();
    EXPECT_EQ(readFile(world_.at("source/inner/file")), "inner");
    EXPECT_EQ(readFile(world_.at("source/.hidden")), "hidden");
    EXPECT_TRUE(std::filesystem::is_empty(world_.at("source/inner/empty")));
    EXPECT_EQ(std::filesystem::read_symlink(world_.at("source/link")), "../target");
    EXPECT_EQ(std::filesystem::read_symlink(world_.at("source/inner/broken")), "nowhere");
    EXPECT_TRUE(S_ISFIFO(statusOf(world_.at("source/pipe")).st_mode));
    EXPECT_EQ(statusOf(world_.at("source/inner")).st_mode & 0777U, 0500U);
    EXPECT_EQ(statusOf(world_.at("source")).st_mtim.tv_sec, 1000);
    if (hasAttributes()) {
        EXPECT_EQ(attribute(world_.at("source"), tagName), "red");
        EXPECT_EQ(attribute(world_.at("source/inner/file"), tagName), "blue");
    }
    EXPECT_TRUE(world_.notes().empty());
}

TEST_P(ImportTest, aFolderThatMayNotBeWrittenStaysSo) {
    makeFolder(source_);
    writeFile(source_ + "/file", "");
    ASSERT_EQ(::chmod(source_.c_str(), 0555), 0);
    ASSERT_TRUE(world_.import(source_));
    EXPECT_EQ(statusOf(world_.at("source")).st_mode & 0777U, 0555U);
    EXPECT_TRUE(std::filesystem::exists(world_.at("source/file")));
}

TEST_P(ImportTest, aLinkComesAsALink) {
    writeFile(world_.outside("target"), "out");
    std::filesystem::create_symlink(world_.outside("target"), source_);
    ASSERT_TRUE(world_.import(source_));
    EXPECT_TRUE(std::filesystem::is_symlink(world_.at("source")));
    EXPECT_EQ(std::filesystem::read_symlink(world_.at("source")), world_.outside("target"));
    EXPECT_TRUE(world_.notes().empty());
}

TEST_P(ImportTest, aTakenNameIsKnownBeforeAnythingIsCopied) {
    writeFile(source_, "new");
    writeFile(world_.at("source"), "old");
    const auto imported = world_.import(source_);
    ASSERT_FALSE(imported);
    EXPECT_EQ(imported.error().code, taken);
    EXPECT_EQ(collidingURLOf(imported.error()), world_.url("source"));
    EXPECT_EQ(readFile(world_.at("source")), "old");
}

TEST_P(ImportTest, aNameTakenMeanwhileIsNotReplaced) {
    for (const bool isFolder : {false, true}) {
        const std::string source = source_ + (isFolder ? " folder" : " file");
        if (isFolder) {
            makeFolder(source);
            writeFile(source + "/file", "new");
        } else {
            writeFile(source, "new");
        }
        const std::string name = source.substr(source.rfind('/') + 1);
        const auto monitor = std::make_shared<TestMonitor>();
        monitor->cancelWhen = [&](const OperationProgress&) {
            writeFile(world_.at(name), "old");
            return false;
        };
        const ScopedOperationMonitor scope(monitor);
        EXPECT_EQ(codeOf(world_.import(source)), taken);
        EXPECT_EQ(readFile(world_.at(name)), "old");
    }
    EXPECT_EQ(world_.names(), (std::set<std::string>{"source file", "source folder"}));
    EXPECT_TRUE(world_.notes().empty());
}

TEST_P(ImportTest, sparseFilesStaySparse) {
    constexpr off_t tenGiB = off_t{10} << 30;
    {
        const UniqueFD file(::open(source_.c_str(), O_CREAT | O_WRONLY, 0644));
        ASSERT_EQ(::ftruncate(file.get(), tenGiB), 0);
        ASSERT_EQ(::pwrite(file.get(), "middle", 6, tenGiB / 2), 6);
        ASSERT_EQ(::pwrite(file.get(), "end", 3, tenGiB - 3), 3);
    }
    const auto imported = world_.import(source_);
    ASSERT_TRUE(imported) << imported.error().description();
    const auto status = statusOf(world_.at("source"));
    EXPECT_EQ(status.st_size, tenGiB);
    EXPECT_LT(status.st_blocks, 4096);
    const UniqueFD copy(::open(world_.at("source").c_str(), O_RDONLY));
    std::array<char, 6> text{};
    ASSERT_EQ(::pread(copy.get(), text.data(), 6, tenGiB / 2), 6);
    EXPECT_EQ(std::string_view(text.data(), 6), "middle");
}

TEST_P(ImportTest, cancellingLeavesNothing) {
    for (int i = 0; i < 20; ++i) {
        makeFolder(source_ + "/" + std::to_string(i));
        writeFile(source_ + "/" + std::to_string(i) + "/file", "text");
    }
    writeFile(world_.outside("file"), std::string(1 << 20, 'x'));
    for (std::uint64_t at = 1; at <= 41; at += 8) {
        const auto monitor = std::make_shared<TestMonitor>();
        monitor->cancelWhen = [&](const OperationProgress& progress) {
            return progress.entries >= at || progress.bytes >= (1U << 20U);
        };
        const ScopedOperationMonitor scope(monitor);
        EXPECT_EQ(codeOf(world_.import(source_)), ECANCELED) << at;
        if (at == 1) {
            EXPECT_EQ(codeOf(world_.import(world_.outside("file"))), ECANCELED);
        }
        expectNoTraces();
    }
}

TEST_P(ImportTest, aSourceThatChangesIsNoticed) {
    writeFile(source_, "before");
    makeFolder(world_.outside("folder"));
    writeFile(world_.outside("folder/a"), "a");
    writeFile(world_.outside("folder/b"), "b");
    const auto monitor = std::make_shared<TestMonitor>();
    const ScopedOperationMonitor scope(monitor);
    monitor->cancelWhen = [&](const OperationProgress&) {
        writeFile(source_, "something else");
        return false;
    };
    EXPECT_EQ(codeOf(world_.import(source_)), EBUSY);
    monitor->cancelWhen = [&](const OperationProgress&) {
        writeFile(world_.outside("folder/new" + std::to_string(monitor->last.entries)), "");
        return false;
    };
    EXPECT_EQ(codeOf(world_.import(world_.outside("folder"))), EBUSY);
    expectNoTraces();
}

TEST_P(ImportTest, aFolderIsNotImportedIntoItself) {
    makeFolder(world_.at("folder/inner"));
    EXPECT_EQ(codeOf(world_.import(world_.at("folder"), "folder/inner")), EINVAL);
    EXPECT_EQ(codeOf(world_.import(world_.at("folder"), "folder")), EINVAL);
    EXPECT_EQ(codeOf(world_.import(world_.directory.path("tree"), "folder")), EINVAL);
    EXPECT_EQ(codeOf(world_.import("/", "folder")), EINVAL);
    EXPECT_EQ(OperationsWorld::namesIn(world_.at("folder")), (std::set<std::string>{"inner"}));
}

TEST_P(ImportTest, whatIsMissingOrCanNotBeReadIsSaid) {
    EXPECT_EQ(codeOf(world_.import(source_)), ENOENT);
    writeFile(source_, "");
    EXPECT_EQ(codeOf(world_.import(source_, "none")), ENOENT);
    if (!runsAsRoot()) {
        ASSERT_EQ(::chmod(source_.c_str(), 0), 0);
        EXPECT_EQ(codeOf(world_.import(source_)), EACCES);
        makeFolder(world_.outside("folder"));
        writeFile(world_.outside("folder/locked"), "");
        ASSERT_EQ(::chmod(world_.outside("folder/locked").c_str(), 0), 0);
        const auto imported = world_.import(world_.outside("folder"));
        ASSERT_FALSE(imported);
        EXPECT_EQ(imported.error().code, EACCES);
        EXPECT_EQ(imported.error().subject, world_.outside("folder/locked"));
    }
    expectNoTraces();
}

TEST_P(ImportTest, treesDeeperThanAnyPathCome) {
    makeFolder(source_);
    UniqueFD folder(::open(source_.c_str(), O_RDONLY | O_DIRECTORY));
    const std::string name(50, 'd');
    constexpr int depth = 200;
    for (int i = 0; i < depth; ++i) {
        ASSERT_EQ(::mkdirat(folder.get(), name.c_str(), 0755), 0);
        folder = UniqueFD(::openat(folder.get(), name.c_str(), O_RDONLY | O_DIRECTORY));
    }
    const UniqueFD file(::openat(folder.get(), "bottom", O_CREAT | O_WRONLY, 0644));
    const auto imported = world_.import(source_);
    ASSERT_TRUE(imported) << imported.error().description();
    UniqueFD copy(::open(world_.at("source").c_str(), O_RDONLY | O_DIRECTORY));
    for (int i = 0; i < depth; ++i) {
        copy = UniqueFD(::openat(copy.get(), name.c_str(), O_RDONLY | O_DIRECTORY));
        ASSERT_TRUE(copy) << i;
    }
    EXPECT_EQ(::faccessat(copy.get(), "bottom", F_OK, 0), 0);
}

TEST_P(ImportTest, fromAnotherFileSystem) {
    if (!runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    makeFolder(world_.outside("mount"));
    const auto mount = ScopedMount::memory(world_.outside("mount"));
    ASSERT_TRUE(mount);
    writeFile(world_.outside("mount/file"), "text");
    makeFolder(world_.outside("mount/folder"));
    writeFile(world_.outside("mount/folder/file"), "text");
    EXPECT_TRUE(world_.import(world_.outside("mount/file")));
    EXPECT_TRUE(world_.import(world_.outside("mount/folder")));
    EXPECT_EQ(readFile(world_.at("file")) + readFile(world_.at("folder/file")), "texttext");
}

TEST_P(ImportTest, aFullDiskLeavesNothing) {
    if (!runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    TemporaryDirectory small;
    ASSERT_EQ(::mount("none", small.path().c_str(), "tmpfs", 0, "size=1m"), 0);
    {
        OperationsWorld world(small.path(), NoReplaceMethod::rename, std::get<1>(GetParam()));
        writeFile(source_, std::string(2 << 20, 'x'));
        makeFolder(world_.outside("folder"));
        for (int i = 0; i < 20; ++i) {
            writeFile(world_.outside("folder/" + std::to_string(i)), std::string(100'000, 'x'));
        }
        EXPECT_EQ(codeOf(world.import(source_)), ENOSPC);
        EXPECT_EQ(codeOf(world.import(world_.outside("folder"))), ENOSPC);
        EXPECT_TRUE(world.names().empty());
        EXPECT_TRUE(world.notes().empty());
    }
    EXPECT_EQ(::umount2(small.path().c_str(), MNT_DETACH), 0);
}

TEST_P(ImportTest, aReadOnlyMountIsSaid) {
    if (!runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    writeFile(source_, "");
    writeFile(world_.at("a"), "a");
    const std::string tree = world_.directory.path("tree");
    const auto mount = ScopedMount::bind(tree, tree);
    ASSERT_TRUE(mount);
    ASSERT_EQ(::mount("none", tree.c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr), 0);
    const ServedTrees trees({tree}, {});
    LinuxFileOperations operations({trees, world_.packages, *world_.temporaries}, nullptr);
    std::promise<Expected<URL>> imported;
    operations.importIntoFolder(URL::fileURL(source_), URL::fileURL(tree),
                                [&](Expected<URL> url) { imported.set_value(std::move(url)); });
    EXPECT_EQ(codeOf(imported.get_future().get()), EROFS);
    std::promise<Expected<URL>> renamed;
    operations.renameInPlace(URL::fileURL(world_.at("a")), "b",
                             [&](Expected<URL> url) { renamed.set_value(std::move(url)); });
    EXPECT_EQ(codeOf(renamed.get_future().get()), EROFS);
}

// What the target can't keep is said, and the contents come nevertheless.
TEST_P(ImportTest, attributesThatDoNotFitAreSaid) {
    if (!runsAsRoot() || !hasAttributes()) {
        MARROWDALE_SKIP_FOR_USER("needs a mount that keeps large attributes");
    }
    makeFolder(world_.outside("mount"));
    const auto mount = ScopedMount::memory(world_.outside("mount"));
    ASSERT_TRUE(mount);
    if (!keepsUserAttributes(world_.outside("mount"))) {
        MARROWDALE_SKIP("file systems in memory keep no user attributes here");
    }
    const std::string source = world_.outside("mount/source");
    writeFile(source, "text");
    setAttribute(source, "user.large", std::string(60'000, 'x'));
    setAttribute(source, "user.small", "y");
    const auto monitor = std::make_shared<TestMonitor>();
    const ScopedOperationMonitor scope(monitor);
    const auto imported = world_.import(source);
    ASSERT_TRUE(imported) << imported.error().description();
    EXPECT_EQ(readFile(world_.at("source")), "text");
    EXPECT_EQ(attribute(world_.at("source"), "user.small"), "y");
    if (!attribute(world_.at("source"), "user.large")) {
        ASSERT_EQ(monitor->warnings.size(), 1U);
        EXPECT_TRUE(monitor->warnings.front().starts_with(
            "the copy of \"" + source + "\" is without the attribute \"large\": "));
        EXPECT_EQ(world_.sink->count("[ERROR] " + monitor->warnings.front()), 1U);
    } else {
        EXPECT_TRUE(monitor->warnings.empty());
    }
}

TEST_P(ImportTest, progressIsTold) {
    writeFile(source_, std::string(3 << 20, 'x'));
    const auto monitor = std::make_shared<TestMonitor>();
    const ScopedOperationMonitor scope(monitor);
    ASSERT_TRUE(world_.import(source_));
    EXPECT_EQ(monitor->last.kind, OperationProgress::Kind::importing);
    EXPECT_EQ(monitor->last.bytes, 3U << 20U);
    EXPECT_EQ(monitor->last.entries, 1U);
    if (std::get<1>(GetParam()) == ImportMethod::unnamedFile) {
        EXPECT_EQ(monitor->last.totalBytes, 3U << 20U);
    }
}

}  // namespace
}  // namespace marrowdale::native
