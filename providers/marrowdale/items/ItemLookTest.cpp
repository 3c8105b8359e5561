#include <array>
#include <cerrno>
#include <chrono>
#include <filesystem>
#include <sys/stat.h>

#include <gtest/gtest.h>

#include "platform/foundation/KeyedArchive.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/PlatformVariants.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"
#include "providers/marrowdale/items/ItemLook.h"
#include "providers/marrowdale/items/ItemLookup.h"
#include "tests/support/ItemComparison.h"
#include "tests/support/TestWorld.h"

namespace marrowdale {
namespace {

// Counts the questions that are put to a file system about items, from the outside.
class CountingFileSystem : public ForwardingFileSystem {
  public:
    using ForwardingFileSystem::ForwardingFileSystem;
    int looks = 0;
    int questions = 0;  // that no look answered

    Expected<FileStatus> status(const URL& url) override {
        const PrefetchedValues* known = url.prefetched();
        questions += known != nullptr && known->hasStatus ? 0 : 1;
        return ForwardingFileSystem::status(url);
    }
    Expected<ResourceValue> resourceValue(const URL& url, ResourceKey key) override {
        questions += url.cachedResourceValue(key) ? 0 : 1;
        return ForwardingFileSystem::resourceValue(url, key);
    }
    std::vector<Expected<URL>> lookAt(std::span<const URL> urls,
                                      const LookRequest& request) override {
        looks += static_cast<int>(urls.size());
        return ForwardingFileSystem::lookAt(urls, request);
    }
};

class ItemLookTest : public ::testing::TestWithParam<TestFileSystem> {
  protected:
    std::shared_ptr<LocalItem> lookedAtItem(std::string_view name) {
        return LocalItem::initWithURL(platform_, lookedAt(platform_, world_.url(name)));
    }
    void makeOneOfEachKind() {
        makeFolder(world_.path("plain/sub"));
        makeFolder(world_.path("book.bundle"));
        writeFile(world_.path("plain/odd \n\xff.txt"), "12345");
        std::filesystem::create_hard_link(world_.path("plain/odd \n\xff.txt"), world_.path("b"));
        std::filesystem::create_directory_symlink("plain", world_.path("link"));
        ASSERT_EQ(::mkfifo(world_.path("pipe").c_str(), 0600), 0);
        if (keepsUserAttributes(world_.root())) {
            setAttribute(world_.path("b"), "user." + std::string(LocalItem::xattrTagDataName),
                         archive(ArchivedArray{std::string("Work")})->text());
            setAttribute(world_.path("plain"),
                         "user." + std::string(LocalItem::xattrFavoriteRankName),
                         archive(Number(std::uint64_t{7}))->text());
        }
    }
    static constexpr std::array kinds{"plain", "plain/sub", "plain/odd \n\xff.txt", "b",
                                      "link",  "pipe",      "book.bundle"};

    TemporaryDirectory directory_{GetParam().dir};
    TestWorld world_{directory_};
    CountingFileSystem fileSystem_{world_.fileSystem};
    const Platform platform_ = withFileSystem(world_.platform, fileSystem_);
};
INSTANTIATE_TEST_SUITE_P(OnEach, ItemLookTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(ItemLookTest, anItemThatWasLookedAtIsTheSameAsOneThatWasAskedValueByValue) {
    makeOneOfEachKind();
    for (const char* name : kinds) {
        const auto asked = LocalItem::initWithURL(platform_, world_.url(name));
        fileSystem_.questions = 0;
        const auto looked = lookedAtItem(name);
        ASSERT_TRUE(asked && looked) << name;
        EXPECT_EQ(allFields(*looked), allFields(*asked));
        EXPECT_EQ(fileSystem_.questions, 0) << name;
    }
}

TEST_P(ItemLookTest, whatCannotBeLookedAtIsAskedForAndSaysWhy) {
    writeFile(world_.path("a"), "1");
    world_.fileSystem.lookFault = [](const URL&) { return std::optional(errorWithPOSIXCode(EIO)); };
    const auto item = lookedAtItem("a");
    ASSERT_TRUE(item);
    EXPECT_EQ(item->documentSize, 1U);
    EXPECT_FALSE(lookedAtItem("none"));
    EXPECT_EQ(world_.sink->countContaining("can't get resource value for "), 1U);
}

TEST_P(ItemLookTest, anItemOfAnActionIsMadeOfOneLook) {
    writeFile(world_.path("a"), "1");
    const auto item = itemAtURL(platform_, world_.url("a"));
    ASSERT_TRUE(item);
    EXPECT_EQ(fileSystem_.looks, 1);
    EXPECT_EQ(fileSystem_.questions, 0);
    EXPECT_EQ(world_.sink->count("[DEBUG] found " + (*item)->itemIdentifier), 1U);
}

TEST_P(ItemLookTest, anIdentifierLeadsToWhatStandsThereNow) {
    writeFile(world_.path("a"), "1");
    const std::string identifier = lookedAtItem("a")->itemIdentifier;
    const auto before = fetchItem(platform_, identifier);
    ASSERT_TRUE(before);
    EXPECT_EQ((*before)->documentSize, 1U);
    writeFile(world_.path("a"), "123");
    EXPECT_EQ((*fetchItem(platform_, identifier))->documentSize, 3U);
    std::filesystem::rename(world_.path("a"), world_.path("b"));
    EXPECT_EQ((*fetchItem(platform_, identifier))->filename, "b");
}

// It is a place, where something else may stand by the time somebody goes there.
TEST_P(ItemLookTest, theURLOfAnIdentifierKeepsNothingOfTheLook) {
    writeFile(world_.path("a"), "1");
    const auto url = urlOfItem(platform_, lookedAtItem("a")->itemIdentifier);
    ASSERT_TRUE(url);
    EXPECT_EQ(*url, world_.url("a"));
    EXPECT_EQ(url->prefetched(), nullptr);
    EXPECT_EQ(url->cachedResourceValue(ResourceKey::fileSize), std::nullopt);
}

TEST_P(ItemLookTest, theRootIsLookedAtAnewEachTime) {
    const auto before = fetchItem(platform_, VantrelRootContainerItemIdentifier);
    ASSERT_TRUE(before);
    std::filesystem::last_write_time(
        world_.root(), std::filesystem::file_time_type::clock::now() - std::chrono::hours(1));
    const auto after = fetchItem(platform_, VantrelRootContainerItemIdentifier);
    ASSERT_TRUE(after);
    EXPECT_LT((*after)->contentModificationDate.value(),
              (*before)->contentModificationDate.value());
}

}  // namespace
}  // namespace marrowdale
