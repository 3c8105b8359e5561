#include <atomic>
#include <filesystem>

#include "platform/linux/applications/ApplicationTestWorld.h"
#include "platform/linux/applications/ApplicationWatch.h"

namespace marrowdale::native {
namespace {

namespace fs = std::filesystem;

class ApplicationWatchTest : public ApplicationTestWorld {
  protected:
    void start() {
        auto watch = ApplicationWatch::start(places(), [this] { ++calls_; });
        ASSERT_TRUE(watch);
        watch_ = std::move(*watch);
    }
    // Whether what `change` does is told.
    bool tells(const std::function<void()>& change) {
        const int before = calls_;
        change();
        const bool told = waitUntil([&] { return calls_ > before; });
        settle();
        return told;
    }
    // Everything that was queued before this has been told when it returns.
    void settle() {
        const std::string path = userEntry("settle" + std::to_string(++settled_));
        const int before = calls_;
        writeFile(path, "");
        EXPECT_TRUE(waitUntil([&] { return calls_ > before; }));
    }

    std::atomic<int> calls_ = 0;
    int settled_ = 0;
    std::unique_ptr<ApplicationWatch> watch_;
};

TEST_F(ApplicationWatchTest, entriesThatComeChangeAndGoAreTold) {
    start();
    EXPECT_TRUE(tells([&] { writeFile(userEntry("a"), entry("A")); }));
    EXPECT_TRUE(tells([&] { writeFile(userEntry("a"), entry("B")); }));
    EXPECT_TRUE(tells([&] { fs::rename(userEntry("a"), userEntry("b")); }));
    EXPECT_TRUE(tells([&] { fs::permissions(userEntry("b"), fs::perms::owner_read); }));
    EXPECT_TRUE(tells([&] { fs::remove(userEntry("b")); }));
    EXPECT_TRUE(tells([&] { writeFile(systemEntry("c"), entry("C")); }));
}

TEST_F(ApplicationWatchTest, foldersThatAreMissingAreWaitedFor) {
    start();
    const std::string exports = home(".local/share/flatpak/exports/share/applications");
    EXPECT_TRUE(tells([&] { makeFolder(exports); }));
    EXPECT_TRUE(tells([&] { writeFile(exports + "/f.desktop", entry("F")); }));
    EXPECT_TRUE(tells([&] { fs::remove_all(home(".local/share/flatpak")); }));
    EXPECT_TRUE(tells([&] { makeFolder(exports); }));
    EXPECT_TRUE(tells([&] { writeFile(exports + "/f.desktop", entry("F")); }));
}

TEST_F(ApplicationWatchTest, foldersInFoldersAreWatchedAsTheyCome) {
    start();
    const std::string sub = home(".local/share/applications/sub");
    EXPECT_TRUE(tells([&] { makeFolder(sub + "/deep"); }));
    EXPECT_TRUE(tells([&] { writeFile(sub + "/deep/x.desktop", entry("X")); }));
}

TEST_F(ApplicationWatchTest, containersAndTheirDocumentsAreTold) {
    start();
    EXPECT_TRUE(tells([&] { makeFolder(home(".var")); }));
    EXPECT_TRUE(tells([&] { makeFolder(home(".var/app")); }));
    EXPECT_TRUE(tells([&] { makeFolder(container("org.example.A")); }));
    EXPECT_TRUE(tells([&] { makeContainer("org.example.A"); }));
    EXPECT_TRUE(tells([&] { fs::remove(container("org.example.A") + "/Documents"); }));
    EXPECT_TRUE(tells([&] { fs::remove_all(home(".var")); }));
    EXPECT_TRUE(tells([&] { makeContainer("org.example.A"); }));
}

TEST_F(ApplicationWatchTest, aFolderOfEntriesMayBeExchanged) {
    start();
    EXPECT_TRUE(tells([&] {
        fs::rename(home(".local/share/applications"), home("elsewhere"));
        makeFolder(home(".local/share/applications"));
    }));
    EXPECT_TRUE(tells([&] { writeFile(userEntry("a"), entry("A")); }));
}

TEST_F(ApplicationWatchTest, whatHappensBesideThemIsNotTold) {
    makeContainer("org.example.A");
    start();
    settle();
    const int before = calls_;
    for (int i = 0; i < 50; ++i) {
        writeFile(home("Documents/" + std::to_string(i)), "");
        writeFile(container("org.example.A") + "/cache" + std::to_string(i), "");
        writeFile(container("org.example.A") + "/Documents/" + std::to_string(i), "");
        writeFile(home(".local/share/other" + std::to_string(i)), "");
    }
    settle();
    // Each settling's file comes and is closed; the first one's closing may have been told late.
    EXPECT_LE(calls_ - before, 3);
}

TEST_F(ApplicationWatchTest, itEndsWhileThingsHappen) {
    for (int round = 0; round < 20; ++round) {
        start();
        writeFile(userEntry("a" + std::to_string(round)), entry("A"));
        watch_.reset();
    }
}

}  // namespace
}  // namespace marrowdale::native
