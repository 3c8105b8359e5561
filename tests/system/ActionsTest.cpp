#include <filesystem>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

namespace fs = std::filesystem;

class ActionsTest : public SystemTest {
  protected:
    void SetUp() override { makeFolder(home_.document("folder")); }
    [[nodiscard]] std::string made(const std::string& name, std::string_view contents = "x") {
        writeFile(home_.document(name), contents);
        return home_.identifierOf(name);
    }
};

MARROWDALE_ON_EACH_FILE_SYSTEM(ActionsTest);

TEST_P(ActionsTest, documentsComeMoveAndGo) {
    writeFile(home_.path("source.txt"), "text");
    const Json item =
        home_.line({"import", home_.path("source.txt"), "--into", home_.document("folder")});
    EXPECT_EQ(item["filename"], "source.txt");
    EXPECT_EQ(item["path"], home_.document("folder/source.txt"));
    const std::string identifier = text(item, "itemIdentifier");
    EXPECT_EQ(home_.line({"rename", identifier, "b.txt"})["filename"], "b.txt");
    const Json folder = home_.line({"mkdir", "new", "--in", home_.document("folder")});
    const Json moved =
        home_.line({"move", identifier, "--to", text(folder, "itemIdentifier"), "--name", "c.txt"});
    EXPECT_EQ(moved["path"], home_.document("folder/new/c.txt"));
    EXPECT_EQ(moved["itemIdentifier"], identifier);
    EXPECT_TRUE(home_.lines({"delete", identifier}).empty());
    EXPECT_FALSE(fs::exists(home_.document("folder/new/c.txt")));
    EXPECT_EQ(home_.error({"info", identifier}, 1)["name"], "noSuchItem");
}

TEST_P(ActionsTest, aTakenNameIsTheItemInTheWay) {
    const std::string item = made("folder/a");
    const std::string inTheWay = made("folder/b");
    const Json error = home_.error({"rename", item, "b"}, 1);
    EXPECT_EQ(error["name"], "filenameCollision");
    EXPECT_EQ(error["item"]["itemIdentifier"], inTheWay);
}

TEST_P(ActionsTest, whatIsTrashedGoesBackWhereItWas) {
    const std::string item = made("folder/a");
    EXPECT_EQ(home_.line({"trash", item})["path"], home_.document(".Trash/a"));
    fs::rename(home_.document("folder"), home_.document("renamed"));
    const Json back = home_.line({"untrash", item});
    EXPECT_EQ(back["path"], home_.document("renamed/a"));
    EXPECT_EQ(back["isTrashed"], false);
    EXPECT_EQ(home_.error({"untrash", item}, 1)["name"], "invalidParameter");
}

TEST_P(ActionsTest, withoutItsFolderItGoesToTheRoot) {
    const std::string item = made("folder/a");
    EXPECT_EQ(home_.line({"trash", item})["isTrashed"], true);
    fs::remove_all(home_.document("folder"));
    EXPECT_EQ(home_.line({"untrash", item})["path"], home_.document("a"));
}

TEST_P(ActionsTest, theRootAllowsNothing) {
    static_cast<void>(made("folder/a"));
    for (const Arguments& arguments :
         {Arguments{"delete", "root"}, Arguments{"trash", "root"}, Arguments{"rename", "root", "x"},
          Arguments{"move", "root", "--to", home_.document("folder")},
          Arguments{"mkdir", "new", "--in", "root"},
          Arguments{"import", home_.document("folder/a"), "--into", "root"}}) {
        EXPECT_EQ(home_.error(arguments, 1)["name"], "writeNoPermission") << arguments.front();
    }
    EXPECT_TRUE(fs::exists(home_.document("folder/a")));
    EXPECT_FALSE(fs::exists(home_.document("new")));
}

TEST_P(ActionsTest, metadataIsSetAndCleared) {
    if (!keepsUserAttributes(home_.root())) {
        MARROWDALE_SKIP("the file system keeps no user attributes");
    }
    const std::string item = made("folder/a");
    EXPECT_EQ(home_.line({"tag", item, "red", "blue"})["tags"], (Json{"red", "blue"}));
    // What a listing derives from attributes is kept until the end, and let go of in order.
    const std::vector<Json> listed = home_.lines({"ls", home_.document("folder")});
    ASSERT_EQ(listed.size(), 1U);
    EXPECT_EQ(listed.front()["tags"], (Json{"red", "blue"}));
    EXPECT_EQ(home_.line({"tag", item}).value("tags", Json::array()), Json::array());
    EXPECT_EQ(home_.line({"favorite", item, "18446744073709551615"})["favoriteRank"],
              18446744073709551615ULL);
    EXPECT_EQ(home_.line({"favorite", item, "-5"})["favoriteRank"], -5);
    EXPECT_FALSE(home_.line({"favorite", item, "--clear"}).contains("favoriteRank"));
    EXPECT_EQ(home_.line({"used", item, "2026-01-31T23:59:59+01:00"})["lastUsedDate"],
              "2026-01-31T22:59:59.000000000Z");
    EXPECT_FALSE(home_.line({"used", item, "--clear"}).contains("lastUsedDate"));
}

TEST_P(ActionsTest, aPurgeTakesWhatIsOlder) {
    if (!keepsUserAttributes(home_.root())) {
        MARROWDALE_SKIP("the file system keeps no user attributes");
    }
    const std::string item = made("folder/a");
    EXPECT_EQ(home_.line({"trash", item})["isTrashed"], true);
    EXPECT_TRUE(home_.lines({"purge", "--older-than", "2000-01-01T00:00:00Z"}).empty());
    EXPECT_TRUE(fs::exists(home_.document(".Trash/a")));
    EXPECT_TRUE(home_.lines({"purge", "--older-than", "2999-01-01T00:00:00Z"}).empty());
    EXPECT_FALSE(fs::exists(home_.document(".Trash/a")));
}

TEST_P(ActionsTest, aWrongCommandLineIsRefusedBeforeAnythingIsDone) {
    for (const Arguments& arguments :
         {Arguments{"favorite", "did=1"}, Arguments{"favorite", "did=1", "5", "--clear"},
          Arguments{"favorite", "did=1", "much"}, Arguments{"favorite", "did=1", "nan"},
          Arguments{"used", "did=1", "yesterday"}, Arguments{"used", "did=1"},
          Arguments{"purge", "--older-than", "x"}, Arguments{"purge"}, Arguments{"import", "x"},
          Arguments{"mkdir", "x"}, Arguments{"move", "did=1"}, Arguments{"rename", "did=1"}}) {
        EXPECT_EQ(home_.run(arguments).exitCode, 2) << arguments.front();
    }
}

TEST_P(ActionsTest, namesOfAnyBytesAreTaken) {
    const std::string item = made("folder/a");
    const Json renamed = home_.line({"rename", item, "b\\udcff"});
    EXPECT_EQ(text(renamed, "filename"), "b\xff");
    EXPECT_TRUE(fs::exists(home_.document("folder/b\xff")));
}

}  // namespace
}  // namespace marrowdale::tests
