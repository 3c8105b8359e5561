#include <map>

#include <gtest/gtest.h>

#include "platform/linux/applications/ApplicationPlaces.h"

namespace marrowdale::native {
namespace {

using Variables = std::map<std::string, std::string, std::less<>>;
using Folders = std::vector<ApplicationFolder>;

ApplicationPlaces places(const Variables& variables) {
    return applicationPlacesFor([&](std::string_view name) -> std::optional<std::string> {
        const auto found = variables.find(name);
        return found == variables.end() ? std::nullopt : std::optional(found->second);
    });
}

using enum ApplicationKind;

TEST(ApplicationPlacesTest, aPlainSessionHasTheUsersAndTheSystemsFolders) {
    const auto found = places({{"HOME", "/home/u"}, {"LANG", "de_AT.UTF-8"}});
    EXPECT_EQ(found.folders,
              (Folders{{"/home/u/.local/share/applications", user},
                       {"/home/u/.local/share/flatpak/exports/share/applications", user},
                       {"/usr/local/share/applications", system},
                       {"/usr/share/applications", system},
                       {"/var/lib/flatpak/exports/share/applications", system}}));
    EXPECT_EQ(found.containersFolder, "/home/u/.var/app");
    EXPECT_EQ(found.locale, "de_AT.UTF-8");
}

TEST(ApplicationPlacesTest, theVariablesDecideAndEachFolderCountsOnce) {
    const auto found = places({{"HOME", "/home/u"},
                               {"XDG_DATA_HOME", "/data"},
                               {"XDG_DATA_DIRS", "/data/flatpak/exports/share/:/a::rel:/b/:/a"}});
    EXPECT_EQ(found.folders, (Folders{{"/data/applications", user},
                                      {"/data/flatpak/exports/share/applications", user},
                                      {"/a/applications", system},
                                      {"/b/applications", system}}));
}

TEST(ApplicationPlacesTest, withoutAHomeThereAreTheSystemsAlone) {
    const auto found = places({{"XDG_DATA_HOME", "relative"}, {"XDG_DATA_DIRS", "/a"}});
    EXPECT_EQ(found.folders, (Folders{{"/a/applications", system}}));
    EXPECT_EQ(found.containersFolder, "");
}

TEST(ApplicationPlacesTest, theLanguageComesFromTheUsualVariablesInTheirOrder) {
    EXPECT_EQ(places({}).locale, "");
    EXPECT_EQ(places({{"LANG", "C.UTF-8"}}).locale, "");
    EXPECT_EQ(places({{"LANG", "POSIX"}}).locale, "");
    EXPECT_EQ(places({{"LANG", "de"}, {"LC_MESSAGES", "fr"}}).locale, "fr");
    EXPECT_EQ(places({{"LANG", "de"}, {"LC_MESSAGES", "fr"}, {"LC_ALL", "C"}}).locale, "");
}

}  // namespace
}  // namespace marrowdale::native
