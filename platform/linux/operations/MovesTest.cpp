#include <cerrno>
#include <sys/stat.h>
#include <unistd.h>

#include "platform/linux/operations/OperationsTestWorld.h"

namespace marrowdale::native {
namespace {

struct MovesTest : OperationsTest {
    std::optional<std::string> collision(const Expected<URL>& answer) {
        const auto url = answer ? std::nullopt : collidingURLOf(answer.error());
        return url ? std::optional(url->path()) : std::nullopt;
    }
};
INSTANTIATE_TEST_SUITE_P(OnEach, MovesTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(MovesTest, aFolderIsMade) {
    const auto made = world_.create("new");
    ASSERT_TRUE(made);
    EXPECT_EQ(*made, world_.url("new"));
    EXPECT_TRUE(std::filesystem::is_directory(world_.at("new")));
}

TEST_P(MovesTest, aTakenNameIsTheFileErrorWithTheURLInTheWay) {
    writeFile(world_.at("a"), "a");
    writeFile(world_.at("b"), "b");
    makeFolder(world_.at("folder"));
    writeFile(world_.at("folder/a"), "c");
    for (const auto& [answer, path] :
         {std::pair(world_.create("a"), world_.at("a")),
          std::pair(world_.create("folder"), world_.at("folder")),
          std::pair(world_.rename("a", "b"), world_.at("b")),
          std::pair(world_.rename("folder", "b"), world_.at("b")),
          std::pair(world_.rename("a", "folder"), world_.at("folder")),
          std::pair(world_.move("a", "folder"), world_.at("folder/a")),
          std::pair(world_.move("folder/a", "", "b"), world_.at("b"))}) {
        ASSERT_FALSE(answer);
        EXPECT_EQ(answer.error().domain, ErrorDomain::file);
        EXPECT_EQ(answer.error().code, taken);
        EXPECT_EQ(collision(answer), path);
    }
    EXPECT_EQ(readFile(world_.at("a")) + readFile(world_.at("b")) + readFile(world_.at("folder/a")),
              "abc");
}

TEST_P(MovesTest, anItemMovesWithOrWithoutANewName) {
    writeFile(world_.at("a"), "a");
    makeFolder(world_.at("folder/inner"));
    EXPECT_EQ(*world_.rename("a", "b"), world_.url("b"));
    EXPECT_EQ(*world_.move("b", "folder"), world_.url("folder/b"));
    EXPECT_EQ(*world_.move("folder/b", "", "c"), world_.url("c"));
    EXPECT_EQ(*world_.move("folder/inner", ""), world_.url("inner"));
    EXPECT_EQ(readFile(world_.at("c")), "a");
    EXPECT_EQ(world_.names(), (std::set<std::string>{"c", "folder", "inner"}));
}

TEST_P(MovesTest, theNameAndPlaceThatAnItemHasAreNoCollision) {
    writeFile(world_.at("a"), "a");
    EXPECT_EQ(*world_.rename("a", "a"), world_.url("a"));
    EXPECT_EQ(*world_.move("a", ""), world_.url("a"));
    EXPECT_EQ(*world_.avoid("a", ""), world_.url("a"));
    // Another name of the same file is in the way.
    ASSERT_EQ(::link(world_.at("a").c_str(), world_.at("b").c_str()), 0);
    EXPECT_EQ(codeOf(world_.rename("a", "b")), taken);
    EXPECT_EQ(world_.names(), (std::set<std::string>{"a", "b"}));
}

TEST_P(MovesTest, namesAreChecked) {
    writeFile(world_.at("a"), "");
    for (const std::string_view name : {"", ".", "..", "x/y"}) {
        EXPECT_EQ(codeOf(world_.create(name)), EINVAL);
        EXPECT_EQ(codeOf(world_.rename("a", name)), EINVAL);
        EXPECT_EQ(codeOf(world_.move("a", "", std::string(name))), EINVAL);
    }
    const std::string tooLong(256, 'x');
    EXPECT_EQ(codeOf(world_.create(tooLong)), ENAMETOOLONG);
    EXPECT_EQ(codeOf(world_.rename("a", tooLong)), ENAMETOOLONG);
    EXPECT_EQ(codeOf(world_.move("a", "", tooLong)), ENAMETOOLONG);
    EXPECT_EQ(world_.rename("a", std::string(255, 'x'))->lastPathComponent().size(), 255U);
    EXPECT_EQ(world_.names(), (std::set<std::string>{std::string(255, 'x')}));
}

TEST_P(MovesTest, aFolderDoesNotMoveIntoItself) {
    makeFolder(world_.at("folder/inner"));
    const auto moved = world_.move("folder", "folder/inner");
    ASSERT_FALSE(moved);
    EXPECT_EQ(moved.error().code, EINVAL);
    EXPECT_EQ(moved.error().subject, world_.at("folder"));
    EXPECT_EQ(codeOf(world_.move("folder", "folder")), EINVAL);
}

TEST_P(MovesTest, whatIsMissingIsSaid) {
    writeFile(world_.at("file"), "");
    EXPECT_EQ(codeOf(world_.rename("none", "a")), ENOENT);
    EXPECT_EQ(codeOf(world_.move("none", "")), ENOENT);
    EXPECT_EQ(codeOf(world_.move("file", "none")), ENOENT);
    EXPECT_EQ(codeOf(world_.move("file", "file")), ENOTDIR);
    EXPECT_EQ(codeOf(world_.create("a", "none")), ENOENT);
    EXPECT_EQ(codeOf(world_.create("a", "file")), ENOTDIR);
    EXPECT_EQ(codeOf(world_.rename("", "other")), EBUSY);  // the root has no folder that is served
}

TEST_P(MovesTest, linksAreMovedAndNeverFollowed) {
    writeFile(world_.outside("file"), "out");
    makeFolder(world_.outside("folder"));
    std::filesystem::create_symlink(world_.outside("file"), world_.at("link"));
    std::filesystem::create_directory_symlink(world_.outside("folder"), world_.at("way out"));
    makeFolder(world_.at("folder"));
    writeFile(world_.at("a"), "");
    EXPECT_TRUE(world_.rename("link", "renamed"));
    EXPECT_TRUE(world_.trash("renamed", "folder"));
    EXPECT_TRUE(std::filesystem::is_symlink(world_.at("folder/renamed")));
    EXPECT_FALSE(world_.move("a", "way out"));
    EXPECT_FALSE(world_.create("new", "way out"));
    EXPECT_FALSE(world_.trash("a", "way out"));
    EXPECT_FALSE(world_.rename("way out/none", "b"));
    EXPECT_TRUE(std::filesystem::is_empty(world_.outside("folder")));
    EXPECT_EQ(readFile(world_.outside("file")), "out");
}

TEST_P(MovesTest, theTrashTakesAFreeName) {
    makeFolder(world_.at("trash"));
    for (int i = 0; i < 30; ++i) {
        writeFile(world_.at("a.txt"), std::to_string(i));
        const std::string expected = i == 0 ? "a.txt" : "a " + std::to_string(i + 1) + ".txt";
        EXPECT_EQ(*world_.trash("a.txt", "trash"), world_.url("trash/" + expected));
        EXPECT_EQ(readFile(world_.at("trash/" + expected)), std::to_string(i));
    }
    // A number that became free is used again.
    ASSERT_EQ(::unlink(world_.at("trash/a 20.txt").c_str()), 0);
    writeFile(world_.at("a.txt"), "again");
    EXPECT_EQ(*world_.avoid("a.txt", "trash"), world_.url("trash/a 20.txt"));
}

TEST_P(MovesTest, foldersAndPackagesAreNumberedAsWhatTheyAre) {
    const std::string extension(PackageTypes::shipped().front());
    makeFolder(world_.at("trash"));
    for (const std::string& expected : {std::string("v1.2"), std::string("v1.2 2")}) {
        makeFolder(world_.at("v1.2"));
        EXPECT_EQ(*world_.trash("v1.2", "trash"), world_.url("trash/" + expected));
    }
    for (const std::string& expected : {"p." + extension, "p 2." + extension}) {
        makeFolder(world_.at("p." + extension));
        EXPECT_EQ(*world_.trash("p." + extension, "trash"), world_.url("trash/" + expected));
    }
}

TEST_P(MovesTest, theLongestNamesAreAvoidedToo) {
    makeFolder(world_.at("trash"));
    std::string name;
    for (int i = 0; i < 125; ++i) {
        name += "ß";
    }
    name += ".text";
    for (int i = 0; i < 12; ++i) {
        writeFile(world_.at(name), "");
        EXPECT_TRUE(world_.trash(name, "trash"));
    }
    EXPECT_EQ(OperationsWorld::namesIn(world_.at("trash")).size(), 12U);
}

TEST_P(MovesTest, aTrashThatIsNoFolderIsRefused) {
    writeFile(world_.at("a"), "");
    writeFile(world_.at(".Trash"), "");
    EXPECT_EQ(codeOf(world_.trash("a", ".Trash")), ENOTDIR);
    EXPECT_EQ(codeOf(world_.trash("a", "none")), ENOENT);
    EXPECT_EQ(world_.names(), (std::set<std::string>{"a", ".Trash"}));
}

TEST_P(MovesTest, permissionThatIsMissingIsSaid) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    makeFolder(world_.at("locked"));
    writeFile(world_.at("locked/a"), "");
    writeFile(world_.at("b"), "");
    ASSERT_EQ(::chmod(world_.at("locked").c_str(), 0555), 0);
    EXPECT_EQ(codeOf(world_.create("new", "locked")), EACCES);
    EXPECT_EQ(codeOf(world_.rename("locked/a", "c")), EACCES);
    EXPECT_EQ(codeOf(world_.move("b", "locked")), EACCES);
    EXPECT_EQ(codeOf(world_.move("locked/a", "")), EACCES);
    EXPECT_EQ(world_.remove("locked/a")->code, EACCES);
    EXPECT_EQ(codeOf(world_.import(world_.at("b"), "locked")), EACCES);
}

TEST_P(MovesTest, withoutTheKernelsRefusalFilesAreLinkedAndFoldersRefused) {
    OperationsWorld world(GetParam().dir, NoReplaceMethod::linkAndUnlink);
    writeFile(world.at("a"), "a");
    writeFile(world.at("b"), "b");
    makeFolder(world.at("folder/inner"));
    EXPECT_EQ(codeOf(world.rename("a", "b")), taken);
    EXPECT_EQ(*world.rename("a", "c"), world.url("c"));
    EXPECT_EQ(*world.move("c", "folder"), world.url("folder/c"));
    EXPECT_EQ(codeOf(world.rename("folder", "other")), ENOTSUP);
    EXPECT_EQ(codeOf(world.rename("folder", "b")), taken);
    EXPECT_EQ(codeOf(world.move("folder", "folder/inner")), EINVAL);
    EXPECT_EQ(readFile(world.at("folder/c")) + readFile(world.at("b")), "ab");
    EXPECT_EQ(world.names(), (std::set<std::string>{"b", "folder"}));
    // A folder that can't leave its place is taken apart in it.
    EXPECT_EQ(world.remove("folder"), std::nullopt);
    EXPECT_EQ(world.names(), (std::set<std::string>{"b"}));
}

TEST_P(MovesTest, namesAreBytes) {
    const std::string name = "\xff\n\x1b[31m 'x'";
    writeFile(world_.at("a"), "a");
    EXPECT_EQ(world_.rename("a", name)->path(), world_.at(name));
    makeFolder(world_.at("trash"));
    EXPECT_TRUE(world_.trash(name, "trash"));
    EXPECT_EQ(readFile(world_.at("trash/" + name)), "a");
}

TEST_P(MovesTest, afterTheEndOperationsAreStillAnswered) {
    writeFile(world_.at("a"), "");
    world_.operations.finish();
    EXPECT_EQ(codeOf(world_.import(world_.at("a"))), ECANCELED);
    EXPECT_EQ(world_.remove("a")->code, ECANCELED);
    EXPECT_TRUE(std::filesystem::exists(world_.at("a")));
}

}  // namespace
}  // namespace marrowdale::native
