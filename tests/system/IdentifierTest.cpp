#include <filesystem>
#include <unistd.h>

#include <gmock/gmock.h>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

// Every run is another process, so whatever holds here holds across processes.
class IdentifierTest : public SystemTest {
  protected:
    void rename(std::string_view from, std::string_view to) const {
        std::filesystem::rename(home_.document(from), home_.document(to));
    }
};

MARROWDALE_ON_EACH_FILE_SYSTEM(IdentifierTest);

TEST_P(IdentifierTest, anIdentifierLeadsBackToItsPath) {
    makeFolder(home_.document("sub"));
    writeFile(home_.document("sub/a.txt"), "a");
    for (const char* name : {"sub", "sub/a.txt"}) {
        const std::string identifier = home_.identifierOf(name);
        EXPECT_EQ(home_.pathOf(identifier), home_.document(name));
        EXPECT_EQ(home_.line({"info", identifier})["path"], home_.document(name));
        EXPECT_EQ(home_.identifierOf(name), identifier);
    }
    EXPECT_EQ(home_.pathOf("root"), home_.root());
    EXPECT_EQ(home_.line({"id", home_.root()})["itemIdentifier"],
              "VantrelRootContainerItemIdentifier");
}

TEST_P(IdentifierTest, aDocumentKeepsItsIdentifierThroughRenamesAndMoves) {
    makeFolder(home_.document("one/two"));
    makeFolder(home_.document("three"));
    writeFile(home_.document("one/two/a.txt"), "a");
    const std::string document = home_.identifierOf("one/two/a.txt");
    const std::string folder = home_.identifierOf("one/two");
    rename("one/two/a.txt", "one/two/b.txt");
    EXPECT_EQ(home_.pathOf(document), home_.document("one/two/b.txt"));
    rename("one/two/b.txt", "three/b.txt");
    EXPECT_EQ(home_.pathOf(document), home_.document("three/b.txt"));
    rename("three/b.txt", "one/two/b.txt");
    rename("one/two", "three/four");
    EXPECT_EQ(home_.pathOf(document), home_.document("three/four/b.txt"));
    EXPECT_EQ(home_.pathOf(folder), home_.document("three/four"));
    EXPECT_EQ(home_.identifierOf("three/four/b.txt"), document);
}

TEST_P(IdentifierTest, everyItemOfAListingResolvesInAnotherProcess) {
    for (int i = 0; i < 20; ++i) {
        const std::string folder = "folder " + std::to_string(i);
        makeFolder(home_.document(folder));
        writeFile(home_.document(folder + "/file"), "x");
    }
    const auto items = home_.lines({"ls", "all-directories"});
    ASSERT_EQ(items.size(), 40U);
    rename("folder 3", "renamed");
    for (const Json& item : items) {
        std::string expected = item.at("path");
        if (const auto at = expected.find("/folder 3");
            at != std::string::npos && (expected.size() == at + 9 || expected[at + 9] == '/')) {
            expected.replace(at, 9, "/renamed");
        }
        EXPECT_EQ(home_.pathOf(item.at("itemIdentifier")), expected);
    }
}

TEST_P(IdentifierTest, aDeletedDocumentIsNoSuchItemAndItsNumberIsNotGivenAgain) {
    writeFile(home_.document("a.txt"), "a");
    const std::string gone = home_.identifierOf("a.txt");
    ASSERT_EQ(::unlink(home_.document("a.txt").c_str()), 0);
    const Json error = home_.error({"path", gone}, 1);
    EXPECT_EQ(error["name"], "noSuchItem");
    EXPECT_EQ(error["itemIdentifier"], gone);
    EXPECT_EQ(home_.error({"info", gone}, 1)["name"], "noSuchItem");
    writeFile(home_.document("a.txt"), "new");
    EXPECT_NE(home_.identifierOf("a.txt"), gone);
    EXPECT_EQ(home_.error({"path", gone}, 1)["name"], "noSuchItem");
}

TEST_P(IdentifierTest, aDocumentWithTwoNamesIsOneDocumentServedUnderEach) {
    writeFile(home_.document("first"), "x");
    const std::string identifier = home_.identifierOf("first");
    ASSERT_EQ(::link(home_.document("first").c_str(), home_.document("second").c_str()), 0);
    EXPECT_EQ(home_.identifierOf("second"), identifier);
    EXPECT_EQ(home_.pathOf(identifier), home_.document("first"));
    EXPECT_THAT(field(home_.lines({"ls"}), "filename"),
                ::testing::UnorderedElementsAre("first", "second"));
    ASSERT_EQ(::unlink(home_.document("first").c_str()), 0);
    EXPECT_EQ(home_.pathOf(identifier), home_.document("second"));
}

TEST_P(IdentifierTest, aLinkIsIdentifiedItselfAndNotItsTarget) {
    writeFile(home_.document("target"), "x");
    std::filesystem::create_symlink("target", home_.document("link"));
    const std::string link = home_.identifierOf("link");
    EXPECT_NE(link, home_.identifierOf("target"));
    EXPECT_EQ(home_.pathOf(link), home_.document("link"));
}

TEST_P(IdentifierTest, whatTheProviderDoesNotServeHasNoIdentifier) {
    writeFile(home_.path("outside"), "x");
    for (const std::string& path :
         {home_.document("none"), home_.document("none/deeper"), home_.path("outside"),
          home_.path("."), std::string("/"), std::string("/proc/self/mem"), std::string()}) {
        const Json error = home_.error({"id", "--", path}, 1);
        EXPECT_EQ(error["name"], "noSuchItem") << path;
        EXPECT_EQ(error["path"], path);
        EXPECT_EQ(error["itemIdentifier"], path);
    }
}

TEST_P(IdentifierTest, identifiersThatMakeNoSenseAreRefused) {
    for (const std::string identifier :
         {"", "did=", "did=x", "did=-1", "did=99999999999999999999999", "fid=0", "fid=1",
          "did=4294967296", "#", "#org.example.none", "Did=1", "did=1 ", "did=\n", "\xFF\xFE",
          "a.txt", "."}) {
        for (const char* command : {"info", "path", "ls", "page"}) {
            const Json error = home_.error({command, "--", identifier}, 1);
            EXPECT_EQ(error["name"], "noSuchItem") << command << " " << identifier;
            EXPECT_EQ(error["itemIdentifier"], identifier) << command << " " << identifier;
        }
    }
}

TEST_P(IdentifierTest, aHomeWhoseDocumentsFolderIsALinkIsServedThroughIt) {
    std::filesystem::rename(home_.root(), home_.path("data"));
    makeFolder(home_.path("elsewhere/Documents"));
    std::filesystem::create_directory_symlink(home_.path("elsewhere/Documents"), home_.root());
    writeFile(home_.document("a.txt"), "a");
    const std::string identifier = home_.identifierOf("a.txt");
    EXPECT_TRUE(identifier.starts_with("did="));
    EXPECT_EQ(home_.pathOf(identifier), home_.path("elsewhere/Documents/a.txt"));
    EXPECT_EQ(home_.line({"id", home_.root()})["itemIdentifier"],
              "VantrelRootContainerItemIdentifier");
}

TEST_P(IdentifierTest, aRootMadeAnewGivesNoOldIdentifierToANewDocument) {
    writeFile(home_.document("a.txt"), "a");
    const std::string old = home_.identifierOf("a.txt");
    std::filesystem::remove_all(home_.root());
    makeFolder(home_.root());
    writeFile(home_.document("b.txt"), "b");
    EXPECT_NE(home_.identifierOf("b.txt"), old);
    EXPECT_EQ(home_.error({"path", old}, 1)["name"], "noSuchItem");
}

}  // namespace
}  // namespace marrowdale::tests
