#include <map>

#include <gtest/gtest.h>

#include "platform/linux/icons/IconTheme.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {
namespace {

class IconThemeTest : public ::testing::Test {
  protected:
    void putTheme(const std::string& folder, const std::string& theme, std::string_view lines) {
        makeFolder(directory_.path(folder + "/" + theme));
        writeFile(directory_.path(folder + "/" + theme + "/index.theme"),
                  "[Icon Theme]\nName=T\n" + std::string(lines));
    }
    void putIcon(const std::string& path) {
        makeFolder(directory_.path(path.substr(0, path.rfind('/'))));
        writeFile(directory_.path(path), "");
    }
    // The icon's path below this test's directory.
    std::string find(std::string_view name, unsigned pixels, const std::string& theme = "T") {
        const IconTheme made({{directory_.path("user"), directory_.path("system")},
                              directory_.path("pixmaps"),
                              theme});
        const auto path = made.find(name, pixels);
        return path ? path->substr(directory_.path().size() + 1) : "none";
    }

    TemporaryDirectory directory_;
};

constexpr std::string_view sizes =
    "Directories=16,48,48@2,s\n[16]\nSize=16\nType=Fixed\n[48]\nSize=48\nThreshold=4\n"
    "[48@2]\nSize=48\nScale=2\n[s]\nSize=128\nMinSize=100\nMaxSize=256\nType=Scalable\n";

TEST_F(IconThemeTest, theNearestSizeIsTaken) {
    putTheme("system", "T", sizes);
    for (const char* name : {"16/a.png", "48/a.png", "48@2/a.png", "s/a.svg"}) {
        putIcon("system/T/" + std::string(name));
    }
    EXPECT_EQ(find("a", 16), "system/T/16/a.png");
    EXPECT_EQ(find("a", 20), "system/T/16/a.png");
    EXPECT_EQ(find("a", 50), "system/T/48/a.png");
    EXPECT_EQ(find("a", 96), "system/T/48@2/a.png");
    EXPECT_EQ(find("a", 180), "system/T/s/a.svg");
    EXPECT_EQ(find("a", 999), "system/T/s/a.svg");
}

TEST_F(IconThemeTest, theUsersFolderComesFirstAndPNGBeforeSVG) {
    putTheme("system", "T", sizes);
    putIcon("system/T/48/a.png");
    putIcon("system/T/48/b.svg");
    putIcon("system/T/48/b.png");
    putIcon("user/T/48/a.svg");
    EXPECT_EQ(find("a", 48), "user/T/48/a.svg");
    EXPECT_EQ(find("b", 48), "system/T/48/b.png");
}

TEST_F(IconThemeTest, inheritedThemesThenHicolorThenPlainPictures) {
    putTheme("system", "T", std::string(sizes) + "[Icon Theme]\nInherits=hicolor, Parent\n");
    putTheme("system", "Parent", "Inherits=T,Grand\nDirectories=48\n[48]\nSize=48\n");
    putTheme("user", "Grand", "Inherits=Parent\nDirectories=48\n[48]\nSize=48\n");
    putTheme("system", "hicolor", "Directories=48\n[48]\nSize=48\n");
    putIcon("pixmaps/a.png");
    EXPECT_EQ(find("a", 48), "pixmaps/a.png");
    putIcon("system/hicolor/48/a.png");
    EXPECT_EQ(find("a", 48), "system/hicolor/48/a.png");
    putIcon("system/Grand/48/a.png");
    EXPECT_EQ(find("a", 48), "system/Grand/48/a.png");
    putIcon("system/Parent/48/a.png");
    EXPECT_EQ(find("a", 48), "system/Parent/48/a.png");
    EXPECT_EQ(find("a", 48, "Missing"), "system/hicolor/48/a.png");
    EXPECT_EQ(find("a", 48, ""), "system/hicolor/48/a.png");
}

TEST_F(IconThemeTest, namesThatLeadElsewhereAreNone) {
    putTheme("system", "T", "Directories=../../secret,48\n[48]\nSize=48\n");
    EXPECT_EQ(find("../48/a", 48), "none");
    EXPECT_EQ(find("", 48), "none");
    EXPECT_EQ(find("..", 48), "none");
    EXPECT_EQ(find("a", 48, "../system/T"), "none");
    EXPECT_EQ(IconTheme({{}, "", ""}).find("/etc/a.png", 48), "/etc/a.png");
}

TEST_F(IconThemeTest, aThemeThatIsJunkHasNoIcons) {
    putTheme("system", "T", "Directories=48\n[48]\nSize=-3\n");
    putIcon("system/T/48/a.png");
    EXPECT_EQ(find("a", 48), "none");
    writeFile(directory_.path("system/T/index.theme"), std::string(100'000, '\xff'));
    EXPECT_EQ(find("a", 48), "none");
}

TEST_F(IconThemeTest, thePlacesComeFromTheEnvironment) {
    std::map<std::string, std::string, std::less<>> variables = {{"HOME", directory_.path()},
                                                                 {"XDG_DATA_DIRS", "/a:/b:rel:/a"}};
    const auto places = [&] {
        return IconTheme::placesFor([&](std::string_view name) -> std::optional<std::string> {
            const auto found = variables.find(name);
            return found == variables.end() ? std::nullopt : std::optional(found->second);
        });
    };
    EXPECT_EQ(
        places().folders,
        (std::vector<std::string>{directory_.path(".icons"), directory_.path(".local/share/icons"),
                                  directory_.path(".local/share/flatpak/exports/share/icons"),
                                  "/a/icons", "/b/icons"}));
    EXPECT_EQ(places().theme, "Adwaita");
    makeFolder(directory_.path(".config/gtk-3.0"));
    writeFile(directory_.path(".config/gtk-3.0/settings.ini"),
              "[Settings]\ngtk-icon-theme-name=Papers\n");
    EXPECT_EQ(places().theme, "Papers");
    variables["MARROWDALE_ICON_THEME"] = "Mine";
    EXPECT_EQ(places().theme, "Mine");
}

}  // namespace
}  // namespace marrowdale::native
