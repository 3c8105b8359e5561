#include <atomic>
#include <cerrno>
#include <cstdio>
#include <fcntl.h>
#include <filesystem>
#include <thread>

#include "platform/linux/files/WalkTest.h"
#include "platform/testing/ScopedMount.h"

namespace marrowdale::native {
namespace {

class WalkContainmentTest : public WalkTest {
  protected:
    // From within the world's folder to one beside it, without the file system's root on the way.
    static std::string besides(const TemporaryDirectory& other) {
        return "../" + std::filesystem::path(other.path()).filename().string();
    }
};
INSTANTIATE_TEST_SUITE_P(OnEach, WalkContainmentTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(WalkContainmentTest, linksAreEntriesAndNeverFollowed) {
    TemporaryDirectory outside;
    writeFile(outside.path("secret"), "x");
    std::filesystem::create_directory_symlink(outside.path(), world_.at("out"));
    std::filesystem::create_directory_symlink(".", world_.at("loop"));
    std::filesystem::create_symlink("self", world_.at("self"));
    std::filesystem::create_symlink("nowhere", world_.at("dangling"));
    EXPECT_EQ(list({}), (Names{"out", "loop", "self", "dangling"}));
    // Their status is that of what they lead to.
    EXPECT_TRUE(listed("loop").prefetched()->status.isDirectory);
    EXPECT_FALSE(listed("dangling").prefetched()->hasStatus);
    EXPECT_EQ(world_.files.status(listed("dangling")).error().code, ENOENT);
    EXPECT_EQ(world_.files.status(listed("self")).error().code, ELOOP);
    EXPECT_TRUE(errors_.empty());
}

TEST_P(WalkContainmentTest, rootMustBeARealFolder) {
    folder("real");
    file("file");
    std::filesystem::create_directory_symlink("real", world_.at("link"));
    for (const char* name : {"link", "file", "none"}) {
        auto wanted = request(flat);
        wanted.url = world_.url(name);
        EXPECT_FALSE(world_.files.enumerateDirectory(wanted)) << name;
    }
    auto wanted = request(flat);
    wanted.url = *URL::fromAbsoluteString("https://example.org/");
    EXPECT_EQ(world_.files.enumerateDirectory(wanted).error().code, EINVAL);
}

TEST_P(WalkContainmentTest, folderThatTurnsIntoALinkUnderTheWalkIsNotFollowed) {
    TemporaryDirectory outside(GetParam().dir);
    writeFile(outside.path("secret"), "x");
    folder("sub");
    file("sub/file");
    std::vector<URL> urls;
    const auto walking = walk(request({}));
    ASSERT_EQ(*walking->next(1, urls), 1U);
    std::filesystem::rename(world_.at("sub"), outside.path("sub"));
    std::filesystem::create_directory_symlink(outside.path(), world_.at("sub"));
    ASSERT_TRUE(walking->next(100, urls));
    for (const URL& url : urls) {
        EXPECT_EQ(relative(url), "sub");
    }
}

TEST_P(WalkContainmentTest, otherFileSystemsAreCountedAndNeitherShownNorEntered) {
    folder("mounted");
    file("mounted/below");
    file("after");
    const ScopedMount mounted = ScopedMount::memory(world_.at("mounted"));
    if (!mounted) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    writeFile(world_.at("mounted/foreign"), "x");
    std::vector<URL> urls;
    EXPECT_EQ(*walk(request(deep))->next(100, urls), 2U);
    EXPECT_EQ(namesOf(urls), (Names{"after"}));
    EXPECT_EQ(*walk(request(deep))->skip(100), 2U);
}

TEST_P(WalkContainmentTest, folderBoundToAnotherPlaceIsNotEnteredTwice) {
    folder("real");
    file("real/file");
    folder("bound");
    const ScopedMount bound = ScopedMount::bind(world_.at("real"), world_.at("bound"));
    if (!bound) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    std::vector<URL> urls;
    EXPECT_EQ(*walk(request(deep))->next(100, urls), 3U);
    EXPECT_EQ(namesOf(urls), (Names{"real", "real/file"}));
    EXPECT_EQ(*walk(request(deep))->skip(100), 3U);
}

TEST_P(WalkContainmentTest, folderBehindAFolderThatWasExchangedForALinkIsNotListed) {
    const TemporaryDirectory outside(GetParam().dir);
    makeFolder(outside.path("q/leak"));
    folder("p/q/own");
    auto wanted = request(deep);
    wanted.url = listed("p/q", deep);
    ASSERT_TRUE(world_.files.enumerateDirectory(wanted));
    std::filesystem::rename(world_.at("p"), world_.at("old"));
    std::filesystem::create_directory_symlink(besides(outside), world_.at("p"));
    EXPECT_EQ(world_.files.enumerateDirectory(wanted).error().code, ENOENT);
}

TEST_P(WalkContainmentTest, restingWalkIsNotTakenUpWhereItsFolderStandsBehindALink) {
    const TemporaryDirectory outside(GetParam().dir);
    folder("p/q");
    file("p/q/a");
    file("p/q/b");
    auto wanted = request(flat);
    wanted.url = world_.url("p/q");
    std::vector<URL> urls;
    // Once the folder's change time is old enough to be sure of, a walk is taken up.
    std::unique_ptr<DirectoryEnumerator> walking;
    ASSERT_TRUE(waitUntil([&] {
        walking = walk(wanted);
        return walking->next(1, urls) && walking->takeUp({});
    }));
    std::filesystem::rename(world_.at("p"), outside.path("p"));
    std::filesystem::create_directory_symlink(besides(outside) + "/p", world_.at("p"));
    EXPECT_FALSE(walking->takeUp({}));
}

TEST_P(WalkContainmentTest, folderExchangedForALinkAgainAndAgainNeverLeaks) {
    const TemporaryDirectory outside(GetParam().dir);
    makeFolder(outside.path("q/leak"));
    folder("p/q/own");
    std::filesystem::create_directory_symlink(besides(outside), world_.at("link"));
    const std::string folderPath = world_.at("p");
    const std::string linkPath = world_.at("link");
    std::atomic<bool> done = false;
    std::thread exchanging([&] {
        while (!done) {
            ::renameat2(AT_FDCWD, folderPath.c_str(), AT_FDCWD, linkPath.c_str(), RENAME_EXCHANGE);
        }
    });
    auto wanted = request(deep);
    wanted.url = world_.url("p/q");
    wanted.keys = {ResourceKey::fileID};
    int listings = 0;
    int refusals = 0;
    std::vector<URL> urls;
    const bool sawBoth = waitUntil([&] {
        for (int i = 0; i < 2000; ++i) {
            const auto walking = world_.files.enumerateDirectory(wanted);
            ++(walking && (*walking)->next(10, urls) ? listings : refusals);
        }
        return listings > 0 && refusals > 0;
    });
    done = true;
    exchanging.join();
    EXPECT_TRUE(sawBoth) << listings << " listings, " << refusals << " refusals";
    for (const URL& url : urls) {
        ASSERT_EQ(url.lastPathComponent(), "own");
    }
}

TEST_P(WalkContainmentTest, otherFileSystemBelowTheRootIsNotListedByItsURL) {
    folder("p/mounted");
    const ScopedMount mounted = ScopedMount::memory(world_.at("p/mounted"));
    if (!mounted) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    makeFolder(world_.at("p/mounted/below"));
    for (const char* name : {"p/mounted", "p/mounted/below"}) {
        auto wanted = request(flat);
        wanted.url = world_.url(name);
        EXPECT_EQ(world_.files.enumerateDirectory(wanted).error().code, ENOENT) << name;
    }
}

TEST_P(WalkContainmentTest, privateFoldersAreCountedAndNeitherShownNorEntered) {
    folder("a/state/store");
    file("a/state/head");
    folder("cache");
    file("cache/witness");
    file("b");
    LinuxFilesServices services(world_, {world_.folder.path()},
                                {world_.at("a/state"), world_.at("cache")});
    std::vector<URL> urls;
    EXPECT_EQ(*(*services.files.enumerateDirectory(request(deep)))->next(100, urls), 4U);
    EXPECT_EQ(namesOf(urls), (Names{"a", "b"}));
    EXPECT_EQ(*(*services.files.enumerateDirectory(request(deep)))->skip(100), 4U);
    ASSERT_EQ(world_.documents.told().size(), 1U);
    EXPECT_EQ(world_.documents.told()[0].name, "b");
    EXPECT_TRUE(errors_.empty());
}

}  // namespace
}  // namespace marrowdale::native
