#include <filesystem>
#include <optional>
#include <tuple>

#include "tests/system/ApplicationHome.h"
#include "tests/system/Service.h"
#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

namespace fs = std::filesystem;

// Who does the work: the command itself, or the service that it asks.
enum class By : std::uint8_t { command, service };

class ActionsTest : public ::testing::TestWithParam<std::tuple<TestFileSystem, By>> {
  protected:
    void SetUp() override {
        makeFolder(home_.document("folder"));
        if (std::get<1>(GetParam()) == By::service) {
            serve();
        }
    }
    void serve() { service_.emplace(home_); }
    [[nodiscard]] std::string made(const std::string& name, std::string_view contents = "x") {
        writeFile(home_.document(name), contents);
        return home_.identifierOf(name);
    }
    ApplicationHome home_{std::get<0>(GetParam()).dir};

  private:
    std::optional<Service> service_;
};

INSTANTIATE_TEST_SUITE_P(OnEach, ActionsTest,
                         ::testing::Combine(::testing::ValuesIn(testFileSystems()),
                                            ::testing::Values(By::command, By::service)),
                         [](const auto& given) {
                             return std::get<0>(given.param).name +
                                    (std::get<1>(given.param) == By::service ? "_service"
                                                                             : "_command");
                         });

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

TEST_P(ActionsTest, aNameThatADeletionFreedGoesToAnotherDocument) {
    const std::string deleted = made("folder/a");
    const std::string renamed = made("folder/b");
    EXPECT_TRUE(home_.lines({"delete", deleted}).empty());
    EXPECT_EQ(home_.line({"rename", renamed, "a"})["itemIdentifier"], renamed);
    EXPECT_EQ(home_.identifierOf("folder/a"), renamed);
    EXPECT_EQ(home_.error({"info", deleted}, 1)["name"], "noSuchItem");
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

TEST_P(ActionsTest, anAppLibraryAllowsNothingButMetadataAndWhatItTakesIn) {
    home_.install("org.example.Notes", "Notes");
    writeFile(home_.library("org.example.Notes") + "/note", "note");
    ASSERT_EQ(home_.run({"refresh"}).exitCode, 0);
    const std::string library = "#org.example.Notes";
    ASSERT_EQ(home_.line({"info", library})["itemIdentifier"], library);
    for (const Arguments& arguments :
         {Arguments{"delete", library}, Arguments{"trash", library},
          Arguments{"rename", library, "x"},
          Arguments{"move", library, "--to", home_.document("folder")}}) {
        EXPECT_EQ(home_.error(arguments, 1)["name"], "writeNoPermission") << arguments.front();
    }
    EXPECT_EQ(readFile(home_.library("org.example.Notes") + "/note"), "note");
    EXPECT_FALSE(fs::exists(home_.library("org.example.Notes") + "/.Trash"));
    EXPECT_EQ(text(home_.line({"mkdir", "new", "--in", library}), "path"),
              home_.library("org.example.Notes") + "/new");
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

// Whoever does the work, a refusal is told in the same words.
class RefusedActionsTest : public SystemTest {};

MARROWDALE_ON_EACH_FILE_SYSTEM(RefusedActionsTest);

// A folder's number may be given to a document once the folder is gone.
TEST_P(RefusedActionsTest, aNumberIsNotAnotherNameOfADocument) {
    writeFile(home_.document("mine"), "x");
    const Json item = home_.line({"info", home_.document("mine")});
    const std::string number = "fid=" + std::to_string(item.at("fileID").get<std::uint64_t>());
    for (const Arguments& arguments :
         {Arguments{"trash", number}, Arguments{"delete", number},
          Arguments{"rename", number, "other"}, Arguments{"tag", number, "red"}}) {
        EXPECT_EQ(home_.error(arguments, 1).at("name"), "noSuchItem") << arguments.front();
    }
    EXPECT_EQ(home_.line({"info", home_.document("mine")}), item);
}

TEST_P(RefusedActionsTest, errorsAreTheSameWithAndWithoutAService) {
    makeFolder(home_.document("folder/inner"));
    writeFile(home_.document("folder/a"), "a");
    writeFile(home_.document("folder/b"), "b");
    writeFile(home_.path("b"), "outside");
    const std::string item = home_.identifierOf("folder/a");
    const std::string folder = home_.identifierOf("folder");
    const std::string inner = home_.identifierOf("folder/inner");
    const std::vector<Arguments> refused{{"delete", "root"},
                                         {"trash", "root"},
                                         {"delete", "#org.example.None"},
                                         {"trash", "did=4294967295"},
                                         {"rename", item, "b"},
                                         {"rename", item, std::string(256, 'x')},
                                         {"rename", item, "x/y"},
                                         {"rename", "did=4294967295", "x"},
                                         {"move", item, "--to", "root"},
                                         {"move", item, "--to", folder, "--name", "b"},
                                         {"move", folder, "--to", inner},
                                         {"move", "did=4294967295", "--to", folder},
                                         {"import", home_.path("b"), "--into", folder},
                                         {"import", home_.path("none"), "--into", folder},
                                         {"mkdir", "b", "--in", folder},
                                         {"mkdir", "new", "--in", "root"},
                                         {"untrash", item},
                                         {"tag", "did=4294967295", "red"},
                                         {"favorite", "did=4294967295", "1"},
                                         {"used", "#org.example.None", "2026-01-31T00:00:00Z"}};
    std::vector<Json> errors;
    for (const Arguments& arguments : refused) {
        errors.push_back(home_.error(arguments, 1));
    }
    const Service service(home_);
    for (std::size_t i = 0; i < refused.size(); ++i) {
        EXPECT_EQ(home_.error(refused[i], 1), errors[i]) << refused[i].front();
    }
    EXPECT_EQ(readFile(home_.document("folder/a")) + readFile(home_.document("folder/b")), "ab");
}

}  // namespace
}  // namespace marrowdale::tests
