#include <cerrno>
#include <filesystem>
#include <sys/stat.h>

#include "platform/linux/files/WalkTest.h"

namespace marrowdale::native {
namespace {

class WalkChangesTest : public WalkTest {};
INSTANTIATE_TEST_SUITE_P(OnEach, WalkChangesTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(WalkChangesTest, folderRenamedUnderTheWalkIsReadToItsEnd) {
    folder("sub");
    for (int i = 0; i < 10; ++i) {
        file("sub/file" + std::to_string(i));
    }
    std::vector<URL> urls;
    const auto walking = walk(request(deep));
    ASSERT_EQ(*walking->next(4, urls), 4U);
    std::filesystem::rename(world_.at("sub"), world_.at(".moved"));
    ASSERT_EQ(*walking->next(100, urls), 7U);
    EXPECT_EQ(urls.size(), 11U);
    EXPECT_TRUE(errors_.empty());
}

TEST_P(WalkChangesTest, entriesThatVanishAreCountedAndLeftOut) {
    for (int i = 0; i < 50; ++i) {
        file("file" + std::to_string(i));
    }
    std::vector<URL> urls;
    const auto walking = walk(request(flat));
    ASSERT_EQ(*walking->next(1, urls), 1U);
    // Those that are in the buffer already vanish before they are looked at.
    for (int i = 0; i < 50; ++i) {
        std::filesystem::remove(world_.at("file" + std::to_string(i)));
    }
    const auto walked = walking->next(100, urls);
    ASSERT_TRUE(walked);
    EXPECT_EQ(*walked, 49U);
    EXPECT_EQ(urls.size(), 1U);
    EXPECT_TRUE(errors_.empty());
}

// Whoever is told of it would never hear that it is gone.
TEST_P(WalkChangesTest, folderThatWentBeforeItWasKnownIsCountedAndLeftOut) {
    folder("a");
    folder("b");
    file("c");
    world_.documents.setGone("a");
    for (const auto& options : {flat, deep}) {
        std::vector<URL> urls;
        EXPECT_EQ(*walk(request(options))->next(100, urls), 3U);
        EXPECT_EQ(namesOf(urls), (Names{"b", "c"}));
    }
    world_.documents.failWith(errorWithPOSIXCode(EIO));
    std::vector<URL> urls;
    EXPECT_EQ(walk(request(flat))->next(100, urls).error().code, EIO);
}

TEST_P(WalkChangesTest, folderRemovedUnderTheWalkIsNoError) {
    folder("sub");
    for (int i = 0; i < 5; ++i) {
        file("sub/file" + std::to_string(i));
    }
    std::vector<URL> urls;
    const auto walking = walk(request(deep));
    ASSERT_EQ(*walking->next(2, urls), 2U);
    std::filesystem::remove_all(world_.at("sub"));
    ASSERT_TRUE(walking->next(100, urls));
    EXPECT_EQ(urls.size(), 2U);
    EXPECT_TRUE(errors_.empty());
}

TEST_P(WalkChangesTest, unreadableSubfolderIsToldAndTheWalkGoesOn) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    folder("closed");
    folder("open");
    file("open/file");
    ASSERT_EQ(::chmod(world_.at("closed").c_str(), 0), 0);
    EXPECT_EQ(list(deep), (Names{"closed", "open", "open/file"}));
    ASSERT_EQ(errors_.size(), 1U);
    EXPECT_EQ(errors_[0], std::pair(world_.at("closed"), EACCES));
    goOn_ = false;
    std::vector<URL> urls;
    EXPECT_EQ(walk(request(deep))->next(100, urls).error().code, EACCES);
}

TEST_P(WalkChangesTest, folderThatCannotBeSearchedIsToldOnce) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    folder("names");
    file("names/a");
    file("names/b");
    file("after");
    ASSERT_EQ(::chmod(world_.at("names").c_str(), 0400), 0);
    EXPECT_EQ(list(deep), (Names{"names", "after"}));
    EXPECT_EQ(errors_.size(), 1U);
}

TEST_P(WalkChangesTest, unreadableRootIsAnError) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    folder("closed");
    ASSERT_EQ(::chmod(world_.at("closed").c_str(), 0), 0);
    auto wanted = request(flat);
    wanted.url = world_.url("closed");
    EXPECT_EQ(world_.files.enumerateDirectory(wanted).error().code, EACCES);
}

}  // namespace
}  // namespace marrowdale::native
