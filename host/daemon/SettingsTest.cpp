#include <cerrno>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "host/daemon/Settings.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::host {
namespace {

class SettingsTest : public ::testing::Test {
  protected:
    [[nodiscard]] Environment withHome(
        std::map<std::string, std::string, std::less<>> more = {}) const {
        more.emplace("HOME", home_.path());
        return {std::move(more), home_.path()};
    }
    TemporaryDirectory home_;
};

TEST_F(SettingsTest, defaultsLieBelowTheHomeFolder) {
    const auto settings = settingsFor({}, withHome());
    ASSERT_TRUE(settings.has_value()) << settings.error().message;
    EXPECT_EQ(settings->rootPath, home_.path("Documents"));
    EXPECT_EQ(settings->stateFolder, home_.path(".local/state/marrowdale"));
    EXPECT_EQ(settings->cacheFolder, home_.path(".cache/marrowdale"));
    EXPECT_TRUE(hasTrash(settings->rootPath));
}

TEST_F(SettingsTest, theDefaultRootIsMadeAndNothingElse) {
    ASSERT_TRUE(settingsFor({}, withHome()).has_value());
    EXPECT_TRUE(std::filesystem::is_directory(home_.path("Documents")));
    EXPECT_FALSE(std::filesystem::exists(home_.path(".local")));
    EXPECT_FALSE(std::filesystem::exists(home_.path(".cache")));
}

TEST_F(SettingsTest, aRootThatWasAskedForIsNotMade) {
    const auto settings = settingsFor({.root = home_.path("none"), .state = {}}, withHome());
    ASSERT_FALSE(settings.has_value());
    EXPECT_EQ(settings.error().error.code, ENOENT);
    EXPECT_FALSE(std::filesystem::exists(home_.path("none")));
}

TEST_F(SettingsTest, optionsWinOverTheEnvironmentAndThatOverDefaults) {
    makeFolder(home_.path("a"));
    makeFolder(home_.path("b"));
    const Environment environment = withHome({{"MARROWDALE_ROOT", home_.path("a")},
                                              {"MARROWDALE_STATE", home_.path("s")},
                                              {"XDG_STATE_HOME", home_.path("x")},
                                              {"XDG_CACHE_HOME", home_.path("c")}});
    const auto fromEnvironment = settingsFor({}, environment);
    ASSERT_TRUE(fromEnvironment.has_value());
    EXPECT_EQ(fromEnvironment->rootPath, home_.path("a"));
    EXPECT_EQ(fromEnvironment->stateFolder, home_.path("s"));
    EXPECT_EQ(fromEnvironment->cacheFolder, home_.path("c/marrowdale"));
    const auto fromOptions = settingsFor({.root = "b", .state = "t"}, environment);
    ASSERT_TRUE(fromOptions.has_value());
    EXPECT_EQ(fromOptions->rootPath, home_.path("b"));
    EXPECT_EQ(fromOptions->stateFolder, home_.path("t"));
    EXPECT_FALSE(hasTrash(fromOptions->rootPath));
}

TEST_F(SettingsTest, relativeXDGFoldersAreIgnored) {
    const auto settings = settingsFor({}, withHome({{"XDG_STATE_HOME", "x"}}));
    ASSERT_TRUE(settings.has_value());
    EXPECT_EQ(settings->stateFolder, home_.path(".local/state/marrowdale"));
}

TEST_F(SettingsTest, aRootThatIsALinkIsMadeCanonical) {
    makeFolder(home_.path("data/docs"));
    std::filesystem::create_directory_symlink(home_.path("data/docs"), home_.path("Documents"));
    const auto settings = settingsFor({}, withHome());
    ASSERT_TRUE(settings.has_value()) << settings.error().message;
    EXPECT_EQ(settings->rootPath, home_.path("data/docs"));
    EXPECT_FALSE(hasTrash(settings->rootPath));
}

TEST_F(SettingsTest, aRootBelowAnotherDocumentsFolderIsRefused) {
    makeFolder(home_.path("Documents/x/deep/Documents"));
    for (const char* root : {"Documents/x", "Documents/x/deep", "Documents/x/deep/Documents"}) {
        const auto settings = settingsFor({.root = home_.path(root), .state = {}}, withHome());
        ASSERT_FALSE(settings.has_value()) << root;
        EXPECT_TRUE(settings.error().message.contains("\"Documents\"")) << root;
    }
    makeFolder(home_.path("My Documents/x"));
    EXPECT_TRUE(
        settingsFor({.root = home_.path("My Documents/x"), .state = {}}, withHome()).has_value());
}

TEST_F(SettingsTest, aRootThatIsAFileIsRefused) {
    writeFile(home_.path("file"), "x");
    const auto settings = settingsFor({.root = home_.path("file"), .state = {}}, withHome());
    ASSERT_FALSE(settings.has_value());
    EXPECT_EQ(settings.error().error.code, ENOTDIR);
}

TEST_F(SettingsTest, aRootThatCanNotBeReadIsRefused) {
    if (::geteuid() == 0) {
        MARROWDALE_SKIP_FOR_USER("permission bits don't bind root");
    }
    makeFolder(home_.path("closed"));
    for (const mode_t mode : {mode_t{0}, mode_t{0400}, mode_t{0100}}) {
        ASSERT_EQ(::chmod(home_.path("closed").c_str(), mode), 0);
        const auto settings = settingsFor({.root = home_.path("closed"), .state = {}}, withHome());
        ASSERT_FALSE(settings.has_value()) << mode;
        EXPECT_EQ(settings.error().error.code, EACCES) << mode;
    }
}

TEST_F(SettingsTest, withoutAHomeFolderTheRootMustBeNamed) {
    const Environment nothing({}, home_.path());
    EXPECT_TRUE(settingsFor({}, nothing).error().message.contains("--root"));
    EXPECT_TRUE(settingsFor({.root = home_.path(), .state = {}}, nothing)
                    .error()
                    .message.contains("--state"));
    const auto settings = settingsFor({.root = home_.path(), .state = home_.path("s")}, nothing);
    ASSERT_TRUE(settings.has_value());
    EXPECT_EQ(settings->cacheFolder, "");
}

}  // namespace
}  // namespace marrowdale::host
