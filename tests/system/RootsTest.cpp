#include <filesystem>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

// One state folder, several storage roots.
class RootsTest : public SystemTest {
  protected:
    RootsTest() {
        for (const char* name : {"Documents/a.txt", "Papers/a.txt", "Papers/sub/b.txt"}) {
            makeFolder(std::filesystem::path(home_.path(name)).parent_path());
            writeFile(home_.path(name), name);
        }
    }
    [[nodiscard]] std::string identifierAt(std::string_view root, std::string_view name) const {
        const std::string folder = home_.path(root);
        return text(home_.line({"--root", folder, "id", folder + "/" + std::string(name)}),
                    "itemIdentifier");
    }
    [[nodiscard]] std::string pathUnder(std::string_view root,
                                        const std::string& identifier) const {
        return text(home_.line({"--root", home_.path(root), "path", identifier}), "path");
    }
};

MARROWDALE_ON_EACH_FILE_SYSTEM(RootsTest);

TEST_P(RootsTest, identifiersOutliveATurnToAnotherRootAndBack) {
    const std::string document = identifierAt("Documents", "a.txt");
    for (int turn = 0; turn < 3; ++turn) {
        const std::string paper = identifierAt("Papers", "a.txt");
        const std::string deeper = identifierAt("Papers", "sub/b.txt");
        EXPECT_EQ(identifierAt("Documents", "a.txt"), document);
        EXPECT_EQ(pathUnder("Documents", document), home_.path("Documents/a.txt"));
        EXPECT_EQ(pathUnder("Papers", paper), home_.path("Papers/a.txt"));
        EXPECT_EQ(pathUnder("Papers", deeper), home_.path("Papers/sub/b.txt"));
    }
}

TEST_P(RootsTest, anIdentifierOfOneRootNamesNothingUnderTheOther) {
    const std::string document = identifierAt("Documents", "a.txt");
    const std::string paper = identifierAt("Papers", "a.txt");
    ASSERT_NE(document, paper);
    EXPECT_EQ(home_.error({"--root", home_.path("Papers"), "path", document}, 1)["name"],
              "noSuchItem");
    EXPECT_EQ(home_.error({"--root", home_.path("Documents"), "path", paper}, 1)["name"],
              "noSuchItem");
}

TEST_P(RootsTest, whatIsRenamedWhileAnotherRootIsServedKeepsItsIdentifier) {
    const std::string document = identifierAt("Documents", "a.txt");
    const std::string paper = identifierAt("Papers", "a.txt");
    std::filesystem::rename(home_.document("a.txt"), home_.document("b.txt"));
    EXPECT_EQ(identifierAt("Papers", "a.txt"), paper);
    EXPECT_EQ(pathUnder("Documents", document), home_.document("b.txt"));
}

TEST_P(RootsTest, identifiersOutliveARenamingOfTheRoot) {
    const std::string paper = identifierAt("Papers", "a.txt");
    const std::string folder = identifierAt("Papers", "sub");
    std::filesystem::rename(home_.path("Papers"), home_.path("Letters"));
    EXPECT_EQ(identifierAt("Letters", "a.txt"), paper);
    EXPECT_EQ(pathUnder("Letters", paper), home_.path("Letters/a.txt"));
    EXPECT_EQ(pathUnder("Letters", folder), home_.path("Letters/sub"));
    // And back, with another root in between.
    EXPECT_FALSE(identifierAt("Documents", "a.txt").empty());
    std::filesystem::rename(home_.path("Letters"), home_.path("Papers"));
    EXPECT_EQ(identifierAt("Papers", "a.txt"), paper);
}

TEST_P(RootsTest, anotherFolderOfTheSameNameIsAnotherRoot) {
    const std::string paper = identifierAt("Papers", "a.txt");
    std::filesystem::rename(home_.path("Papers"), home_.path("Letters"));
    makeFolder(home_.path("Papers"));
    writeFile(home_.path("Papers/a.txt"), "new");
    EXPECT_NE(identifierAt("Papers", "a.txt"), paper);
    EXPECT_EQ(identifierAt("Letters", "a.txt"), paper);
}

}  // namespace
}  // namespace marrowdale::tests
