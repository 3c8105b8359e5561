#include <filesystem>

#include "platform/linux/applications/ApplicationTestWorld.h"
#include "platform/linux/applications/DesktopEntryFolders.h"

namespace marrowdale::native {
namespace {

class DesktopEntryFoldersTest : public ApplicationTestWorld {
  protected:
    DesktopEntryFolders folders_{""};
    std::vector<ApplicationFolder> places_ = places().folders;
};

TEST_F(DesktopEntryFoldersTest, filesThatStayTheSameAreReadOnce) {
    for (int i = 0; i < 100; ++i) {
        writeFile(userEntry("org.example.A" + std::to_string(i)), entry("A"));
    }
    // Until their change times are old enough to tell one change from the next.
    EXPECT_TRUE(waitUntil([&] {
        const auto before = folders_.filesRead();
        EXPECT_EQ(folders_.read(places_).size(), 100U);
        return folders_.filesRead() == before;
    }));
    const auto before = folders_.filesRead();
    writeFile(userEntry("org.example.A7"), entry("B"));
    EXPECT_EQ(folders_.read(places_).at("org.example.A7").entry->name, "B");
    EXPECT_EQ(folders_.filesRead(), before + 1);
}

TEST_F(DesktopEntryFoldersTest, aFileWrittenAgainAtOnceIsReadAgain) {
    for (int i = 0; i < 200; ++i) {
        const std::string name = "N" + std::to_string(i % 10);
        writeFile(userEntry("org.example.A"), entry(name));
        ASSERT_EQ(folders_.read(places_).at("org.example.A").entry->name, name);
    }
}

TEST_F(DesktopEntryFoldersTest, foldersThatNestTooDeeplyAreLeft) {
    std::string path = home(".local/share/applications");
    for (unsigned depth = 1; depth <= DesktopEntryFolders::deepest + 1; ++depth) {
        path += "/d";
        makeFolder(path);
        writeFile(path + "/e.desktop", entry("A"));
    }
    std::filesystem::create_directory_symlink(".", home(".local/share/applications/loop"));
    EXPECT_EQ(folders_.read(places_).size(), DesktopEntryFolders::deepest);
}

}  // namespace
}  // namespace marrowdale::native
