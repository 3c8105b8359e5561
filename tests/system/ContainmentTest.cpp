#include <filesystem>

#include <gmock/gmock.h>

#include "platform/testing/ScopedMount.h"
#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

using ::testing::UnorderedElementsAre;

// What lies below the root by name, and is not served.
class ContainmentTest : public SystemTest {
  protected:
    static constexpr int noSuchItem = 1;

    // Neither has an identifier nor can be looked at or listed.
    void expectMissing(const std::string& path) const {
        for (const char* command : {"id", "info", "ls"}) {
            const ChildResult result = home_.run({"--json", command, path});
            EXPECT_EQ(result.exitCode, noSuchItem) << command << " " << path << result.output;
            EXPECT_EQ(result.output, "");
        }
    }
    [[nodiscard]] std::vector<std::string> names(const std::string& container) const {
        return field(home_.lines({"ls", container}), "filename");
    }
};

MARROWDALE_ON_EACH_FILE_SYSTEM(ContainmentTest);

TEST_P(ContainmentTest, nothingIsServedFromAFileSystemMountedBelowTheRoot) {
    makeFolder(home_.document("a/mnt"));
    writeFile(home_.document("a/own"), "x");
    const ScopedMount mounted = ScopedMount::memory(home_.document("a/mnt"));
    if (!mounted) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    // On a fresh file system, inode numbers are those of the documents beside it.
    makeFolder(home_.document("a/mnt/x"));
    writeFile(home_.document("a/mnt/x/y"), "y");
    expectMissing(home_.document("a/mnt"));
    expectMissing(home_.document("a/mnt/x"));
    expectMissing(home_.document("a/mnt/x/y"));
    EXPECT_THAT(names(home_.document("a")), UnorderedElementsAre("own"));
    EXPECT_THAT(names("all-directories"), UnorderedElementsAre("a", "own"));
}

TEST_P(ContainmentTest, aFolderBoundToAnotherPlaceIsServedOnce) {
    makeFolder(home_.document("real"));
    makeFolder(home_.document("bound"));
    writeFile(home_.document("real/x"), "x");
    const ScopedMount bound = ScopedMount::bind(home_.document("real"), home_.document("bound"));
    if (!bound) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    expectMissing(home_.document("bound"));
    expectMissing(home_.document("bound/x"));
    EXPECT_THAT(names("root"), UnorderedElementsAre("real"));
    EXPECT_EQ(home_.pathOf(home_.identifierOf("real/x")), home_.document("real/x"));
}

TEST_P(ContainmentTest, theStateFolderBelowTheRootIsNotServed) {
    const std::string state = home_.document("things/state");
    writeFile(home_.document("a"), "a");
    const auto items = home_.lines({"--state", state, "ls", "all-directories"});
    EXPECT_THAT(field(items, "filename"), UnorderedElementsAre("a", "things"));
    for (const Json& item : items) {
        EXPECT_EQ(home_.line({"--state", state, "path", text(item, "itemIdentifier")})["path"],
                  item["path"]);
    }
    std::vector<std::string> kept{state};
    for (const auto& entry : std::filesystem::recursive_directory_iterator(state)) {
        kept.push_back(entry.path());
    }
    ASSERT_GT(kept.size(), 1U);
    for (const std::string& path : kept) {
        EXPECT_EQ(home_.run({"--state", state, "id", path}).exitCode, noSuchItem) << path;
    }
    EXPECT_EQ(home_.run({"--state", state, "info", state}).exitCode, noSuchItem);
    EXPECT_EQ(home_.run({"--state", state, "ls", state}).exitCode, noSuchItem);
}

TEST_P(ContainmentTest, theCacheFolderBelowTheRootIsNotServed) {
    ChildOptions list = home_.command({"--json", "ls", "all-directories"});
    list.variables["XDG_CACHE_HOME"] = home_.document("caches");
    const ChildResult result = runChild(list);
    EXPECT_EQ(result.exitCode, 0) << result.errors;
    ASSERT_TRUE(std::filesystem::exists(home_.document("caches/marrowdale")));
    EXPECT_THAT(field(parsedLines(result.output), "filename"), UnorderedElementsAre("caches"));
}

TEST_P(ContainmentTest, nothingIsServedThroughALinkBelowTheRoot) {
    makeFolder(home_.path("secret/q"));
    writeFile(home_.path("secret/q/leak"), "x");
    std::filesystem::create_directory_symlink("../secret", home_.document("p"));
    const std::string link = home_.identifierOf("p");
    EXPECT_EQ(home_.pathOf(link), home_.document("p"));
    EXPECT_THAT(names("all-directories"), UnorderedElementsAre("p"));
    expectMissing(home_.document("p/q"));
    expectMissing(home_.document("p/q/leak"));
}

}  // namespace
}  // namespace marrowdale::tests
