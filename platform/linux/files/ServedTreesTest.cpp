#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>

#include <gtest/gtest.h>

#include "platform/linux/files/ServedTrees.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {
namespace {

class ServedTreesTest : public testing::Test {
  protected:
    [[nodiscard]] std::string at(std::string_view name) const { return folder_.path(name); }
    void makeFolders(std::initializer_list<const char*> names) const {
        for (const char* name : names) {
            makeFolder(at(name));
        }
    }
    // Of the place that the trees give; 0 where they give none.
    static std::uint64_t rootNumber(const ServedTrees& trees, const std::string& path) {
        const auto location = trees.locate(path);
        EXPECT_TRUE(location) << path;
        return location && *location ? raw(statEntry((*location)->root, "")->fileID) : 0;
    }
    static std::uint64_t number(const std::string& path) {
        return raw(statEntry(AT_FDCWD, path.c_str())->fileID);
    }
    static int codeOf(const ServedTrees& trees, const std::string& path) {
        const auto location = trees.locate(path);
        return location ? 0 : location.error().code;
    }

    TemporaryDirectory folder_;
};

TEST_F(ServedTreesTest, theInnermostRootThatContainsAPathByNameIsTaken) {
    makeFolders({"root/inner", "root2"});
    const ServedTrees trees({at("root"), at("root/inner/")}, {});
    EXPECT_EQ(rootNumber(trees, at("root")), number(at("root")));
    EXPECT_EQ(rootNumber(trees, at("root/a/b")), number(at("root")));
    EXPECT_EQ((*trees.locate(at("root/a/b")))->relativePath, "a/b");
    EXPECT_EQ((*trees.locate(at("root")))->relativePath, "");
    EXPECT_EQ(rootNumber(trees, at("root/inner")), number(at("root/inner")));
    EXPECT_EQ(rootNumber(trees, at("root/inner/a")), number(at("root/inner")));
    EXPECT_EQ((*trees.locate(at("root/inner/a")))->relativePath, "a");
    EXPECT_EQ(rootNumber(trees, at("root2")), 0U);
    EXPECT_EQ(rootNumber(trees, folder_.path()), 0U);
    EXPECT_EQ(rootNumber(trees, "/"), 0U);
}

TEST_F(ServedTreesTest, theFileSystemsOwnRootCanBeServed) {
    const ServedTrees trees({"/"}, {});
    EXPECT_EQ((*trees.locate("/"))->relativePath, "");
    EXPECT_EQ((*trees.locate("/usr"))->relativePath, "usr");
}

TEST_F(ServedTreesTest, aRootThatIsNotAtItsPathAnyMoreIsNotThere) {
    makeFolders({"root", "other"});
    const ServedTrees trees({at("root")}, {});
    std::filesystem::rename(at("root"), at("moved"));
    EXPECT_EQ(codeOf(trees, at("root")), ENOENT);
    EXPECT_EQ(codeOf(trees, at("root/a")), ENOENT);
    std::filesystem::create_directory_symlink("other", at("root"));
    EXPECT_EQ(codeOf(trees, at("root/a")), ENOENT);
    std::filesystem::remove(at("root"));
    makeFolder(at("root"));
    EXPECT_EQ(codeOf(trees, at("root/a")), ENOENT);
    std::filesystem::remove(at("root"));
    std::filesystem::rename(at("moved"), at("root"));
    EXPECT_EQ(codeOf(trees, at("root/a")), 0);
}

TEST_F(ServedTreesTest, aRootThatWasMissingStaysMissing) {
    const ServedTrees trees({at("root")}, {});
    EXPECT_EQ(codeOf(trees, at("root/a")), ENOENT);
    makeFolder(at("root"));
    EXPECT_EQ(codeOf(trees, at("root/a")), ENOENT);
}

TEST_F(ServedTreesTest, foldersAreHeldWithoutLeavingTheTree) {
    makeFolders({"root/a/b", "outside/b"});
    writeFile(at("root/file"), "");
    std::filesystem::create_directory_symlink("../outside", at("root/link"));
    const ServedTrees trees({at("root")}, {});
    const auto location = *trees.locate(at("root"));
    EXPECT_EQ(raw(statEntry(trees.holdFolder(*location, "a/b")->get(), "")->fileID),
              number(at("root/a/b")));
    EXPECT_EQ(trees.holdFolder(*location, "link").error().code, ENOENT);
    EXPECT_EQ(trees.holdFolder(*location, "link/b").error().code, ENOENT);
    EXPECT_EQ(trees.holdFolder(*location, "none").error().code, ENOENT);
    EXPECT_EQ(trees.holdFolder(*location, "../outside").error().code, ENOENT);
    EXPECT_EQ(trees.holdFolder(*location, "file").error().code, ENOTDIR);
}

TEST_F(ServedTreesTest, privateFoldersAreKnownByIdentityAndGuardWhatIsBelowThem) {
    makeFolders({"root/.state/store/x", "outside", "root/a/b"});
    const ServedTrees trees({at("root")}, {at("root/.state/store"), at("outside"), at("none"), ""});
    const auto isPrivate = [&](const char* name) {
        return trees.isPrivate(*statEntry(AT_FDCWD, at(name).c_str()));
    };
    EXPECT_TRUE(isPrivate("root/.state/store"));
    EXPECT_TRUE(isPrivate("outside"));
    EXPECT_FALSE(isPrivate("root/.state"));
    EXPECT_FALSE(isPrivate("root"));
    const auto location = *trees.locate(at("root"));
    EXPECT_TRUE(location->mayMeetPrivateFolders);
    EXPECT_TRUE(trees.holdFolder(*location, ".state"));
    EXPECT_TRUE(trees.holdFolder(*location, "a/b"));
    EXPECT_EQ(trees.holdFolder(*location, ".state/store").error().code, ENOENT);
    EXPECT_EQ(trees.holdFolder(*location, ".state/store/x").error().code, ENOENT);
    std::filesystem::rename(at("root/.state/store"), at("root/renamed"));
    EXPECT_TRUE(isPrivate("root/renamed"));
    EXPECT_EQ(trees.holdFolder(*location, "renamed/x").error().code, ENOENT);
}

TEST_F(ServedTreesTest, privateFoldersElsewhereCostNothing) {
    makeFolders({"root", "state"});
    const ServedTrees trees({at("root")}, {at("state"), folder_.path()});
    EXPECT_FALSE((*trees.locate(at("root")))->mayMeetPrivateFolders);
}

TEST_F(ServedTreesTest, rootsMayChangeAndWhatWasLocatedStaysGood) {
    makeFolders({"root", "library/in", "state"});
    ServedTrees trees({at("root")}, {at("state")});
    EXPECT_EQ(rootNumber(trees, at("library/in")), 0U);
    const auto inRoot = trees.locate(at("root/a"));
    trees.setRoots({at("root"), at("library")});
    EXPECT_EQ(rootNumber(trees, at("library/in")), number(at("library")));
    EXPECT_EQ((*trees.locate(at("root")))->root, (*inRoot)->root) << "it stays open";
    const auto inLibrary = trees.locate(at("library/in"));
    const auto inode = number(at("library"));
    trees.setRoots({at("root")});
    EXPECT_EQ(rootNumber(trees, at("library/in")), 0U);
    EXPECT_EQ(raw(statEntry((*inLibrary)->root, "")->fileID), inode) << "as long as it is used";
    EXPECT_TRUE(trees.holdFolder(**inLibrary, "in"));
}

TEST_F(ServedTreesTest, aRootThatWasMadeAnewIsFoundWhenRootsAreSet) {
    makeFolders({"root", "library"});
    ServedTrees trees({at("root"), at("library"), at("later")}, {});
    std::filesystem::rename(at("library"), at("away"));
    makeFolders({"library", "later"});
    EXPECT_EQ(codeOf(trees, at("library")), ENOENT);
    EXPECT_EQ(codeOf(trees, at("later")), ENOENT);
    trees.setRoots({at("root"), at("library"), at("later")});
    EXPECT_EQ(rootNumber(trees, at("library")), number(at("library")));
    EXPECT_EQ(rootNumber(trees, at("later")), number(at("later")));
}

}  // namespace
}  // namespace marrowdale::native
