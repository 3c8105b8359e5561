#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <map>
#include <set>

#include <gtest/gtest.h>

#include "platform/foundation/KeyedArchive.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/CollectingObserver.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"
#include "providers/marrowdale/LocalFileEnumerator.h"
#include "providers/marrowdale/items/LocalItem.h"
#include "providers/marrowdale/items/ProviderError.h"
#include "tests/support/ItemComparison.h"
#include "tests/support/TestWorld.h"

namespace marrowdale {
namespace {

const Data& byName = VantrelInitialPageSortedByName();

class LocalFileEnumeratorTest : public ::testing::TestWithParam<TestFileSystem> {
  protected:
    LocalFileEnumerator enumerator(
        std::string_view container = VantrelRootContainerItemIdentifier) {
        return {world_.platform, std::string(container), {world_.manager.documentStorageURL()}};
    }
    CollectingObserver page(const Data& data,
                            std::string_view container = VantrelRootContainerItemIdentifier) {
        CollectingObserver observer;
        enumerator(container).enumerateItemsForObserver(observer, data);
        EXPECT_EQ(observer.finishes, 1);
        return observer;
    }
    // Every page, each from a fresh enumerator.
    std::vector<CollectingObserver> allPages(
        std::string_view container = VantrelRootContainerItemIdentifier) {
        std::vector<CollectingObserver> pages{page(byName, container)};
        while (pages.back().nextPage) {
            pages.push_back(page(*pages.back().nextPage, container));
        }
        return pages;
    }
    static std::vector<std::string> sorted(std::vector<std::string> names) {
        std::ranges::sort(names);
        return names;
    }
    void makeFiles(std::string_view prefix, int count) {
        for (int i = 0; i < count; ++i) {
            writeFile(world_.path(std::string(prefix) + std::to_string(i)), "");
        }
    }
    static FSChangeToken tokenOf(const Data& data) { return *FSChangeToken::decode(data); }

    TemporaryDirectory directory_{GetParam().dir};
    TestWorld world_{directory_};
};

using Names = std::vector<std::string>;

INSTANTIATE_TEST_SUITE_P(OnEach, LocalFileEnumeratorTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(LocalFileEnumeratorTest, anEmptyFolderYieldsOneEmptyBatchAndNoPage) {
    const auto observer = page(byName);
    EXPECT_EQ(observer.batches, 1);
    EXPECT_TRUE(observer.pageItems.empty());
    EXPECT_EQ(observer.nextPage, std::nullopt);
    EXPECT_EQ(observer.error, std::nullopt);
}

TEST_P(LocalFileEnumeratorTest, exactly200EntriesYieldAFullPageAndThenAnEmptyOne) {
    makeFiles("f", 200);
    const auto pages = allPages();
    ASSERT_EQ(pages.size(), 2U);
    EXPECT_EQ(pages[0].pageItems.size(), 200U);
    EXPECT_EQ(pages[1].batches, 1);
    EXPECT_TRUE(pages[1].pageItems.empty());
    EXPECT_EQ(world_.sink->count("[DEBUG] gather phase finished for " + world_.root()), 1U);
}

TEST_P(LocalFileEnumeratorTest, everyEntryComesOnceWhateverTheNumberOfPages) {
    makeFiles("f", 650);
    std::set<std::string> names;
    const auto pages = allPages();
    EXPECT_EQ(pages.size(), 4U);
    for (const auto& one : pages) {
        for (const auto& item : one.pageItems) {
            EXPECT_TRUE(names.insert(item->filename).second) << item->filename;
        }
    }
    EXPECT_EQ(names.size(), 650U);
}

TEST_P(LocalFileEnumeratorTest, aPageWhoseCursorIsGoneIsFoundByItsOffset) {
    makeFiles("f", 450);
    const auto first = page(byName);
    const auto second = page(*first.nextPage);
    auto& cursors = world_.shared.get<FSWalkCursors>("marrowdale.walk-cursors");
    for (std::uint64_t other = 0; other < FSWalkCursors::capacity; ++other) {
        cursors.remember(
            {.deviceUUID = {}, .streamEventID = 0, .offset = other, .container = {}, .roots = {}},
            {});
    }
    const auto again = page(*first.nextPage);
    EXPECT_EQ(again.filenames(), second.filenames());
    EXPECT_EQ(again.nextPage, second.nextPage);
}

TEST_P(LocalFileEnumeratorTest, aPageThatIsAskedForTwiceIsTheSameTwice) {
    makeFiles("f", 300);
    const auto first = page(byName);
    EXPECT_EQ(page(*first.nextPage).filenames(), page(*first.nextPage).filenames());
}

TEST_P(LocalFileEnumeratorTest, hiddenEntriesNeverAppear) {
    makeFolder(world_.path(".Trash"));
    writeFile(world_.path(".hidden"), "");
    writeFile(world_.path("seen"), "");
    EXPECT_EQ(page(byName).filenames(), Names{"seen"});
}

TEST_P(LocalFileEnumeratorTest, aPlainFolderNeverShowsItsSubfoldersContents) {
    makeFolder(world_.path("sub/deeper"));
    writeFile(world_.path("sub/a"), "");
    EXPECT_EQ(page(byName).filenames(), Names{"sub"});
}

TEST_P(LocalFileEnumeratorTest, allDirectoriesAreWalkedRecursivelyAndPackageContentsNeverAppear) {
    makeFolder(world_.path("sub/deeper"));
    writeFile(world_.path("sub/deeper/a"), "");
    makeFolder(world_.path(".hidden/x"));
    const std::string package = "doc." + native::PackageTypes().extensions().front();
    makeFolder(world_.path(package));
    writeFile(world_.path(package + "/inside"), "");
    const auto observer = page(byName, VantrelAllDirectoriesContainerItemIdentifier);
    EXPECT_EQ(sorted(observer.filenames()), sorted({"sub", "deeper", "a", package}));
}

TEST_P(LocalFileEnumeratorTest, theWorkingSetListsOnlyTheDirectContentsOfTheTrash) {
    makeFolder(world_.path(".Trash/folder"));
    writeFile(world_.path(".Trash/folder/inside"), "");
    writeFile(world_.path(".Trash/a"), "");
    writeFile(world_.path(".Trash/.hidden"), "");
    writeFile(world_.path("b"), "");
    const auto observer = page(byName, VantrelWorkingSetContainerItemIdentifier);
    EXPECT_EQ(sorted(observer.filenames()), (Names{"a", "folder"}));
    for (const auto& item : observer.pageItems) {
        EXPECT_TRUE(item->isTrashed);
    }
}

TEST_P(LocalFileEnumeratorTest, aWorkingSetWithoutATrashFolderIsEmptyAndSaysSo) {
    const auto observer = page(byName, VantrelWorkingSetContainerItemIdentifier);
    EXPECT_EQ(observer.batches, 1);
    EXPECT_TRUE(observer.pageItems.empty());
    EXPECT_EQ(
        world_.sink->count("[ERROR] can't create file enumerator at " + world_.path(".Trash")), 1U);
}

TEST_P(LocalFileEnumeratorTest, aTrashThatIsALinkIsNeverListed) {
    makeFolder(directory_.path("elsewhere"));
    writeFile(directory_.path("elsewhere/secret"), "");
    std::filesystem::create_directory_symlink(directory_.path("elsewhere"), world_.path(".Trash"));
    EXPECT_TRUE(page(byName, VantrelWorkingSetContainerItemIdentifier).pageItems.empty());
}

TEST_P(LocalFileEnumeratorTest, bothInitialPagesGiveTheSameOrder) {
    makeFiles("f", 50);
    const auto named = page(VantrelInitialPageSortedByName());
    const auto dated = page(VantrelInitialPageSortedByDate());
    EXPECT_EQ(named.filenames(), dated.filenames());
    EXPECT_EQ(world_.sink->countContaining(
                  " enumerate items for VantrelRootContainerItemIdentifier with page "
                  "initialPageSortedByName"),
              1U);
    EXPECT_EQ(world_.sink->countContaining(" with page initialPageSortedByDate"), 1U);
}

TEST_P(LocalFileEnumeratorTest, aPageOfExactly48BytesIsExpiredWithoutBeingDecoded) {
    const auto observer = page(Data(Bytes(48, 'x')));
    EXPECT_EQ(observer.error, errorSyncAnchorExpired());
    EXPECT_EQ(observer.batches, 0);
    EXPECT_EQ(world_.sink->lines(),
              Names{"[ERROR] can't create change token from anchor data, resetting"});
}

TEST_P(LocalFileEnumeratorTest, anUndecodablePageIsExpired) {
    for (const Data& data : {Data(), Data::fromText("garbage")}) {
        const auto observer = page(data);
        EXPECT_EQ(observer.error, errorSyncAnchorExpired());
    }
    EXPECT_EQ(world_.sink->count("[ERROR] can't create change token from anchor data, resetting"),
              2U);
}

TEST_P(LocalFileEnumeratorTest, aTokenFromAnotherVolumeIsExpired) {
    makeFiles("f", 200);
    FSChangeToken token = tokenOf(*page(byName).nextPage);
    const UUID current = token.deviceUUID;
    token.deviceUUID = *UUID::fromText("00000000-0000-4000-8000-000000000000");
    const auto observer = page(token.encode());
    EXPECT_EQ(observer.error, errorSyncAnchorExpired());
    EXPECT_EQ(world_.sink->count("[DEBUG] device UUID changed (" + token.deviceUUID.text() +
                                 " -> " + current.text() + ")"),
              1U);
}

TEST_P(LocalFileEnumeratorTest, theEventNeverMovesWithinAGatherPhase) {
    makeFiles("f", 450);
    const auto first = page(byName);
    const FSChangeToken start = tokenOf(*first.nextPage);
    EXPECT_EQ(start.version, 0U);
    EXPECT_EQ(start.offset, 200U);
    EXPECT_EQ(start.appLibraryVersionToken, 0U);
    EXPECT_EQ(start.deviceUUID, *world_.store->volumeUUID(world_.manager.documentStorageURL()));
    writeFile(world_.path("later"), "");
    const FSChangeToken next = tokenOf(*page(*first.nextPage).nextPage);
    EXPECT_EQ(next.streamEventID, start.streamEventID);
    EXPECT_EQ(next.offset, 400U);
    EXPECT_EQ(world_.sink->count("[DEBUG] start gather phase"), 1U);
    EXPECT_EQ(world_.sink->count("[DEBUG] resume gather phase at offset 200"), 1U);
    EXPECT_EQ(world_.sink->count("[DEBUG] discovered 200 items"), 2U);
}

TEST_P(LocalFileEnumeratorTest, anOffsetPastTheEndEndsTheListing) {
    makeFiles("f", 3);
    const FSChangeToken token{.deviceUUID = *world_.store->volumeUUID(world_.url("")),
                              .offset = ~std::uint64_t{0} - 100};
    const auto observer = page(token.encode());
    EXPECT_TRUE(observer.pageItems.empty());
    EXPECT_EQ(observer.nextPage, std::nullopt);
    EXPECT_EQ(observer.error, std::nullopt);
}

TEST_P(LocalFileEnumeratorTest, aURLThatCannotBecomeAnItemIsDroppedAndCounts) {
    makeFiles("f", 199);
    std::filesystem::create_symlink("nowhere", world_.path("link"));
    const auto first = page(byName);
    EXPECT_EQ(first.pageItems.size(), 199U);
    ASSERT_TRUE(first.nextPage);
    EXPECT_EQ(tokenOf(*first.nextPage).offset, 200U);
}

TEST_P(LocalFileEnumeratorTest, itemsOfAListingEqualItemsOfABareURL) {
    makeFolder(world_.path("folder/sub"));
    writeFile(world_.path("a.txt"), "hello");
    writeFile(world_.path("weird\n\xff"), "");
    std::filesystem::create_symlink("a.txt", world_.path("link"));
    std::filesystem::create_hard_link(world_.path("a.txt"), world_.path("hard"));
    makeFolder(world_.path("doc." + native::PackageTypes().extensions().front()));
    if (keepsUserAttributes(world_.root())) {
        const auto attribute = [&](std::string_view name, const ArchivedObject& object) {
            setAttribute(world_.path("a.txt"), "user." + std::string(name),
                         archive(object)->text());
            setAttribute(world_.path("folder"), "user." + std::string(name), "garbage");
        };
        attribute(LocalItem::xattrLastUsedDateName, ArchivedObject(Date{7, 8}));
        attribute(LocalItem::xattrFavoriteRankName, ArchivedObject(Number(2.5)));
        attribute(LocalItem::xattrTagDataName,
                  ArchivedObject(ArchivedArray{ArchivedObject(std::string("red"))}));
    }
    ASSERT_TRUE(world_.store->reconcile());
    for (int round = 0; round < 2; ++round) {  // the second with whatever the first left cached
        const auto observer = page(byName);
        EXPECT_EQ(observer.pageItems.size(), 6U);
        for (const auto& item : observer.pageItems) {
            const auto bare =
                LocalItem::initWithURL(world_.platform, URL::fileURL(item->fileURL.path()));
            ASSERT_TRUE(bare) << item->filename;
            EXPECT_EQ(allFields(*item), allFields(*bare));
        }
    }
}

TEST_P(LocalFileEnumeratorTest, undecodableAttributesAreLoggedAtEachListing) {
    if (!keepsUserAttributes(world_.root())) {
        MARROWDALE_SKIP("the file system keeps no user attributes");
    }
    writeFile(world_.path("a"), "");
    setAttribute(world_.path("a"), "user." + std::string(LocalItem::xattrFavoriteRankName), "no");
    EXPECT_EQ(page(byName).pageItems.size(), 1U);
    EXPECT_EQ(page(byName).pageItems.size(), 1U);
    EXPECT_EQ(world_.sink->countContaining("[ERROR] got nil while unarchiving object from "), 2U);
}

TEST_P(LocalFileEnumeratorTest, itemsOfAnAppLibraryCarryItsBundleIdentifier) {
    makeFolder(world_.path("app/Documents"));
    writeFile(world_.path("app/Documents/a"), "");
    writeFile(world_.path("app/b"), "");
    world_.applications.add("org.example.Notes", "Notes", world_.path("app"));
    const auto bundleIdentifiers = [&](std::string_view folder) {
        CollectingObserver observer;
        LocalFileEnumerator(world_.platform, "fid=1", {world_.url(folder)})
            .enumerateItemsForObserver(observer, byName);
        std::map<std::string, std::optional<std::string>> found;
        for (const auto& item : observer.pageItems) {
            EXPECT_EQ(item->hx_lumenoDomainIdentifier, item->hx_appContainerBundleIdentifier);
            found[item->filename] = item->hx_appContainerBundleIdentifier;
        }
        return found;
    };
    using Found = std::map<std::string, std::optional<std::string>>;
    EXPECT_EQ(bundleIdentifiers("app/Documents"), (Found{{"a", "org.example.Notes"}}));
    EXPECT_EQ(bundleIdentifiers("app"),
              (Found{{"Documents", "org.example.Notes"}, {"b", std::nullopt}}));
}

TEST_P(LocalFileEnumeratorTest, aFolderThatVanishedHasNoVolume) {
    makeFolder(world_.path("f"));
    LocalFileEnumerator folder(world_.platform, "fid=1", {world_.url("f")});
    std::filesystem::remove(world_.path("f"));
    CollectingObserver observer;
    folder.enumerateItemsForObserver(observer, byName);
    EXPECT_EQ(observer.batches, 0);
    EXPECT_EQ(observer.error,
              errorWithProviderCode(ProviderErrorCode::unableToGetDeviceUUID, world_.path("f")));
    EXPECT_EQ(world_.sink->count("[ERROR] can't get volume UUID for " + world_.path("f")), 1U);
}

TEST_P(LocalFileEnumeratorTest, aFolderThatIsAFileGivesAnEmptyPageAndALine) {
    writeFile(world_.path("f"), "");
    LocalFileEnumerator folder(world_.platform, "did=1", {world_.url("f")});
    CollectingObserver observer;
    folder.enumerateItemsForObserver(observer, byName);
    EXPECT_EQ(observer.batches, 1);
    EXPECT_TRUE(observer.pageItems.empty());
    EXPECT_EQ(observer.error, std::nullopt);
    EXPECT_EQ(world_.sink->count("[ERROR] can't create file enumerator at " + world_.path("f")),
              1U);
}

TEST_P(LocalFileEnumeratorTest, anUnreadableSubfolderIsLoggedAndSkipped) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    makeFolder(world_.path("closed"));
    writeFile(world_.path("open"), "");
    std::filesystem::permissions(world_.path("closed"), std::filesystem::perms::none);
    const auto observer = page(byName, VantrelAllDirectoriesContainerItemIdentifier);
    std::filesystem::permissions(world_.path("closed"), std::filesystem::perms::owner_all);
    EXPECT_EQ(sorted(observer.filenames()), (Names{"closed", "open"}));
    EXPECT_EQ(
        world_.sink->countContaining("[ERROR] can't enumerate " + world_.path("closed") + "; "),
        1U);
}

TEST_P(LocalFileEnumeratorTest, withoutANotifierThereIsNoCurrentAnchor) {
    int calls = 0;
    enumerator().currentSyncAnchorWithCompletionHandler([&](const std::optional<Data>& anchor) {
        ++calls;
        EXPECT_EQ(anchor, std::nullopt);
    });
    EXPECT_EQ(calls, 1);
}

TEST_P(LocalFileEnumeratorTest, itemsResolveBackInANewProcessAfterRenames) {
    makeFolder(world_.path("folder"));
    writeFile(world_.path("a"), "");
    TemporaryDirectory other(GetParam().dir);
    std::map<std::string, std::string> identifiers;
    {
        TestWorld before(other);
        writeFile(before.path("a"), "");
        makeFolder(before.path("b"));
        CollectingObserver observer;
        LocalFileEnumerator root(before.platform, std::string(VantrelRootContainerItemIdentifier),
                                 {before.manager.documentStorageURL()});
        root.enumerateItemsForObserver(observer, byName);
        for (const auto& item : observer.pageItems) {
            identifiers[item->filename] = item->itemIdentifier;
        }
        std::filesystem::rename(before.path("a"), before.path("b/moved"));
    }
    TestWorld after(other);
    const auto file = LocalItem::initWithFileIdentifier(after.platform, identifiers.at("a"));
    ASSERT_TRUE(file);
    EXPECT_EQ(file->fileURL.path(), after.path("b/moved"));
    const auto folder = LocalItem::initWithFileIdentifier(after.platform, identifiers.at("b"));
    ASSERT_TRUE(folder);
    EXPECT_EQ(folder->fileURL.path(), after.path("b"));
}

TEST(LocalFileEnumeratorFaultTest, anEmptyListOfURLsEndsTheProcess) {
    FakePlatform fake;
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_DEATH(LocalFileEnumerator(fake.platform, "fid=1", {}),
                 "can't create enumerator for an empty list of URLs");
}

TEST(LocalFileEnumeratorFaultTest, aVolumeUUIDThatCannotBeReadEndsTheRequest) {
    FakePlatform fake;
    fake.events.uuidError = errorWithPOSIXCode(ENXIO);
    CollectingObserver observer;
    LocalFileEnumerator(fake.platform, "fid=1", {URL::fileURL("/storage")})
        .enumerateItemsForObserver(observer, byName);
    EXPECT_EQ(observer.error,
              errorWithProviderCode(ProviderErrorCode::unableToGetDeviceUUID, "/storage"));
    EXPECT_EQ(observer.batches, 0);
    EXPECT_EQ(fake.sink->count("[ERROR] can't get volume UUID for /storage"), 1U);
}

TEST(LocalFileEnumeratorFaultTest, anEventIdentifierThatCannotBeReadEndsTheRequest) {
    FakePlatform fake;
    fake.events.eventIDError = errorWithPOSIXCode(EIO);
    CollectingObserver observer;
    LocalFileEnumerator(fake.platform, "fid=1", {URL::fileURL("/storage")})
        .enumerateItemsForObserver(observer, byName);
    EXPECT_EQ(observer.error, errorWithPOSIXCode(EIO));
}

TEST(LocalFileEnumeratorFaultTest, theEventIsReadBeforeTheFirstEntryIsListed) {
    FakePlatform fake;
    fake.events.eventID = EventID{5};
    EventID eventAtListing{};
    fake.fileSystem.enumerateFault =
        [&](const DirectoryEnumerationRequest&) -> std::optional<Error> {
        eventAtListing = fake.events.eventID;
        fake.events.eventID = EventID{6};
        return errorWithPOSIXCode(ENOENT);
    };
    CollectingObserver observer;
    LocalFileEnumerator(fake.platform, "fid=1", {URL::fileURL("/storage")})
        .enumerateItemsForObserver(observer, byName);
    EXPECT_EQ(eventAtListing, EventID{5});
}

// A folder in which no identifier can be made durable.
class FullDisk : public DirectoryEnumerator {
  public:
    Expected<std::uint64_t> skip(std::uint64_t count) override { return count; }
    Expected<std::uint64_t> next(std::uint64_t /*limit*/, std::vector<URL>& /*urls*/) override {
        return Unexpected(errorWithPOSIXCode(ENOSPC));
    }
    DirectoryPosition position() const override { return {}; }
};
class FullDiskFileSystem : public EmptyFileSystem {
  public:
    Expected<std::unique_ptr<DirectoryEnumerator>> enumerateDirectory(
        const DirectoryEnumerationRequest& /*request*/) override {
        return std::make_unique<FullDisk>();
    }
};

TEST(LocalFileEnumeratorFaultTest, identifiersThatCantBeMadeDurableEndThePageWithTheError) {
    FakePlatform fake;
    FullDiskFileSystem files;
    const Platform platform{fake.log,          files,        fake.attributes,
                            fake.writeAccess,  fake.store,   fake.events,
                            fake.applications, fake.manager, fake.shared};
    CollectingObserver observer;
    LocalFileEnumerator(platform, "fid=1", {URL::fileURL("/storage")})
        .enumerateItemsForObserver(observer, byName);
    EXPECT_EQ(observer.error, errorWithPOSIXCode(ENOSPC));
    EXPECT_EQ(observer.batches, 0);
    EXPECT_EQ(observer.finishes, 1);
}

}  // namespace
}  // namespace marrowdale
