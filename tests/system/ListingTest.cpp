#include <algorithm>
#include <array>
#include <fcntl.h>
#include <filesystem>
#include <set>
#include <sys/stat.h>
#include <unistd.h>

#include <gmock/gmock.h>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

class ListingTest : public SystemTest {
  protected:
    [[nodiscard]] std::vector<std::string> names(const Arguments& arguments) const {
        return field(home_.lines(arguments), "filename");
    }
};

MARROWDALE_ON_EACH_FILE_SYSTEM(ListingTest);

TEST_P(ListingTest, theRootIsListedWithoutBeingNamed) {
    writeFile(home_.document("a.txt"), "a");
    makeFolder(home_.document("sub/deeper"));
    writeFile(home_.document("sub/b.txt"), "b");
    EXPECT_THAT(names({"ls"}), UnorderedElementsAre("a.txt", "sub"));
    EXPECT_THAT(names({"ls", "root"}), UnorderedElementsAre("a.txt", "sub"));
    EXPECT_THAT(names({"ls", home_.root()}), UnorderedElementsAre("a.txt", "sub"));
}

TEST_P(ListingTest, aFolderIsListedByPathAndByIdentifier) {
    makeFolder(home_.document("sub/deeper"));
    writeFile(home_.document("sub/b.txt"), "b");
    EXPECT_THAT(names({"ls", "./sub"}), UnorderedElementsAre("b.txt", "deeper"));
    EXPECT_THAT(names({"ls", home_.identifierOf("sub")}), UnorderedElementsAre("b.txt", "deeper"));
}

TEST_P(ListingTest, allDirectoriesGoesAllTheWayDown) {
    makeFolder(home_.document("sub/deeper/deepest"));
    writeFile(home_.document("sub/deeper/c.txt"), "c");
    EXPECT_THAT(names({"ls", "all-directories"}),
                UnorderedElementsAre("sub", "deeper", "deepest", "c.txt"));
}

TEST_P(ListingTest, theWorkingSetIsWhatLiesInTheTrash) {
    makeFolder(home_.document(".Trash/folder"));
    writeFile(home_.document(".Trash/thrown.txt"), "x");
    writeFile(home_.document(".Trash/.hidden"), "x");
    writeFile(home_.document(".Trash/folder/inside.txt"), "x");
    writeFile(home_.document("kept.txt"), "x");
    const auto items = home_.lines({"ls", "working-set"});
    EXPECT_THAT(field(items, "filename"), UnorderedElementsAre("thrown.txt", "folder"));
    for (const Json& item : items) {
        EXPECT_EQ(item["isTrashed"], true);
    }
}

TEST_P(ListingTest, anEmptyFolderPrintsNothing) {
    EXPECT_THAT(home_.lines({"ls"}), IsEmpty());
    EXPECT_THAT(home_.lines({"ls", "working-set"}), IsEmpty());
}

TEST_P(ListingTest, hiddenEntriesAndTheInsideOfPackagesAreNotListed) {
    writeFile(home_.document(".hidden"), "x");
    makeFolder(home_.document("book.bundle/chapter"));
    writeFile(home_.document("book.bundle/text"), "x");
    const auto items = home_.lines({"ls", "all-directories"});
    ASSERT_THAT(field(items, "filename"), ElementsAre("book.bundle"));
    EXPECT_EQ(items[0]["isFolder"], false);
    EXPECT_TRUE(items[0]["itemIdentifier"].get<std::string>().starts_with("did="));
}

TEST_P(ListingTest, aFileHasTheFieldsOfItsRecord) {
    writeFile(home_.document("a.txt"), "12345");
    const Json item = home_.line({"ls"});
    struct stat status{};
    ASSERT_EQ(::lstat(home_.document("a.txt").c_str(), &status), 0);
    EXPECT_EQ(item["filename"], "a.txt");
    EXPECT_EQ(item["path"], home_.document("a.txt"));
    EXPECT_EQ(item["typeIdentifier"], "text/plain");
    EXPECT_EQ(item["documentSize"], 5);
    EXPECT_EQ(item["fileID"], status.st_ino);
    EXPECT_EQ(item["itemIdentifier"], "did=" + std::to_string(item["docID"].get<unsigned>()));
    EXPECT_EQ(item["parentItemIdentifier"], "VantrelRootContainerItemIdentifier");
    EXPECT_EQ(item["capabilities"], 63);
    EXPECT_EQ(item["isTrashed"], false);
    EXPECT_EQ(item["isFolder"], false);
    EXPECT_EQ(item["isContainer"], false);
    EXPECT_THAT(item["contentModificationDate"].get<std::string>(),
                ::testing::MatchesRegex(
                    "....-..-..T..:..:..[.][0-9][0-9][0-9][0-9][0-9][0-9][0-9][0-9][0-9]Z"));
    EXPECT_TRUE(item.contains("versionIdentifier"));
    for (const char* absent : {"childItemCount", "lastUsedDate", "tags", "favoriteRank",
                               "appContainerBundleIdentifier"}) {
        EXPECT_FALSE(item.contains(absent)) << absent;
    }
}

TEST_P(ListingTest, aFolderHasTheFieldsOfItsRecord) {
    makeFolder(home_.document("sub/x"));
    makeFolder(home_.document("sub/y"));
    writeFile(home_.document("sub/z"), "");
    const Json item = home_.line({"ls"});
    struct stat status{};
    ASSERT_EQ(::lstat(home_.document("sub").c_str(), &status), 0);
    EXPECT_EQ(item["itemIdentifier"], "fid=" + std::to_string(status.st_ino));
    EXPECT_EQ(item["typeIdentifier"], "inode/directory");
    EXPECT_EQ(item["isFolder"], true);
    EXPECT_EQ(item["childItemCount"], 2);
    EXPECT_FALSE(item.contains("docID"));
    EXPECT_FALSE(item.contains("documentSize"));
    // The same one at a time.
    EXPECT_EQ(home_.line({"info", "./sub"}), item);
    EXPECT_EQ(home_.line({"info", item["itemIdentifier"].get<std::string>()}), item);
}

TEST_P(ListingTest, theRootsOwnRecordIsItsOwnParent) {
    const Json item = home_.line({"info", "root"});
    EXPECT_EQ(item["itemIdentifier"], "VantrelRootContainerItemIdentifier");
    EXPECT_EQ(item["parentItemIdentifier"], "VantrelRootContainerItemIdentifier");
    EXPECT_EQ(item["capabilities"], 1);
    EXPECT_EQ(item["path"], home_.root());
}

TEST_P(ListingTest, linksPipesAndSocketsAreItemsAndNeverFollowedOrOpened) {
    makeFolder(home_.path("outside/secret"));
    makeFolder(home_.document("sub"));
    std::filesystem::create_directory_symlink(home_.path("outside"), home_.document("out"));
    std::filesystem::create_directory_symlink(home_.root(), home_.document("loop"));
    std::filesystem::create_symlink("nowhere", home_.document("dangling"));
    ASSERT_EQ(::mkfifo(home_.document("pipe").c_str(), 0600), 0);
    const auto items = home_.lines({"ls", "all-directories"});
    // A link that leads nowhere has no status and is not served.
    EXPECT_THAT(field(items, "filename"), UnorderedElementsAre("sub", "out", "loop", "pipe"));
    EXPECT_EQ(home_.error({"ls", "./out"}, 1)["name"], "invalidParameter");
    EXPECT_EQ(home_.error({"info", home_.document("out/secret")}, 1)["name"], "noSuchItem");
}

TEST_P(ListingTest, aFileCanNotBeListed) {
    writeFile(home_.document("a.txt"), "a");
    const std::string identifier = home_.identifierOf("a.txt");
    for (const char* command : {"ls", "page"}) {
        const Json error = home_.error({command, "./a.txt"}, 1);
        EXPECT_EQ(error["name"], "invalidParameter");
        EXPECT_EQ(error["parameter"], "ITEM");
        EXPECT_EQ(error["value"], identifier);
    }
}

TEST_P(ListingTest, aFolderOfManyPagesIsListedWhole) {
    std::set<std::string> made;
    for (int i = 0; i < 450; ++i) {
        const std::string name = "file " + std::to_string(i);
        writeFile(home_.document(name), "");
        made.insert(name);
    }
    const auto items = home_.lines({"ls"});
    EXPECT_EQ(items.size(), made.size());
    const auto listed = field(items, "filename");
    EXPECT_EQ(std::set<std::string>(listed.begin(), listed.end()), made);
}

TEST_P(ListingTest, anUnreadableFolderDoesNotEndAListing) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permission bits don't bind root");
    }
    makeFolder(home_.document("closed"));
    writeFile(home_.document("closed/x"), "");
    writeFile(home_.document("open"), "");
    ASSERT_EQ(::chmod(home_.document("closed").c_str(), 0), 0);
    EXPECT_THAT(names({"ls", "all-directories"}), UnorderedElementsAre("closed", "open"));
    EXPECT_THAT(names({"ls", "./closed"}), IsEmpty());
}

TEST_P(ListingTest, tagsRanksAndDatesComeFromTheFilesAttributes) {
    if (!keepsUserAttributes(home_.root())) {
        MARROWDALE_SKIP("the file system keeps no extended attributes of users");
    }
    writeFile(home_.document("broken"), "x");
    setAttribute(home_.document("broken"), "user.com.quillory.favorite-rank.number#PS", "garbage");
    const Json item = home_.line({"ls"});
    EXPECT_EQ(item["filename"], "broken");
    EXPECT_FALSE(item.contains("favoriteRank"));
}

TEST_P(ListingTest, aDateAfterTheYear9999IsAbsentFromMachineOutputAndToldPeople) {
    writeFile(home_.document("late"), "");
    const std::array<timespec, 2> times{timespec{0, UTIME_OMIT}, timespec{253'402'300'800, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, home_.document("late").c_str(), times.data(), 0), 0);
    struct stat status{};
    ASSERT_EQ(::lstat(home_.document("late").c_str(), &status), 0);
    // Some file systems end earlier.
    const bool isKept = status.st_mtim.tv_sec == times[1].tv_sec;
    EXPECT_EQ(home_.line({"ls"}).contains("contentModificationDate"), !isKept);
    EXPECT_EQ(home_.run({"ls"}).output.contains("after year 9999"), isKept);
}

TEST_P(ListingTest, peopleGetALineAnItemWithHarmlessNames) {
    writeFile(home_.document("evil\n\x1B[2Jname"), "123");
    const ChildResult result = home_.run({"ls"});
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.errors, "");
    EXPECT_TRUE(result.output.ends_with("  $'evil\\n\\e[2Jname'\n")) << result.output;
    EXPECT_EQ(std::ranges::count(result.output, '\n'), 1);
    EXPECT_EQ(result.output.find('\x1B'), std::string::npos);
}

}  // namespace
}  // namespace marrowdale::tests
