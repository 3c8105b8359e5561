#include <algorithm>
#include <filesystem>
#include <iterator>
#include <map>

#include "platform/foundation/KeyedArchive.h"
#include "platform/testing/TestSkip.h"
#include "providers/marrowdale/LocalFileEnumeratorTestWorld.h"
#include "providers/marrowdale/items/LocalItem.h"
#include "providers/marrowdale/items/ProviderError.h"
#include "tests/support/ItemComparison.h"

namespace marrowdale {
namespace {

// What a listing holds.
class LocalFileEnumeratorTest : public LocalFileEnumeratorTestWorld {};

INSTANTIATE_TEST_SUITE_P(OnEach, LocalFileEnumeratorTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(LocalFileEnumeratorTest, anEmptyFolderYieldsOneEmptyBatchAndNoPage) {
    const auto observer = page(byName);
    EXPECT_EQ(observer.batches, 1);
    EXPECT_TRUE(observer.pageItems.empty());
    EXPECT_EQ(observer.nextPage, std::nullopt);
    EXPECT_EQ(observer.error, std::nullopt);
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

TEST_P(LocalFileEnumeratorTest, aPageOfTheWorkingSetGoesOnInTheNextTrash) {
    makeFolder(world_.path("one/.Trash"));
    makeFolder(world_.path("two/.Trash"));
    makeFiles("one/.Trash/a", 150);
    makeFiles("two/.Trash/b", 150);
    LocalFileEnumerator both(platform_, std::string(VantrelWorkingSetContainerItemIdentifier),
                             {world_.url("one"), world_.url("two")});
    CollectingObserver first;
    both.enumerateItemsForObserver(first, byName);
    CollectingObserver second;
    both.enumerateItemsForObserver(second, first.nextPage.value());
    EXPECT_EQ(first.pageItems.size(), 200U);
    EXPECT_EQ(second.pageItems.size(), 100U);
    EXPECT_EQ(second.nextPage, std::nullopt);
    const auto isOfFirst = [](const std::string& name) { return name.starts_with("a"); };
    EXPECT_EQ(std::ranges::count_if(first.filenames(), isOfFirst), 150);
    EXPECT_EQ(world_.sink->count("[DEBUG] gather phase finished for " + world_.path("one/.Trash") +
                                 ", " + world_.path("two/.Trash")),
              1U);
    std::vector<std::string> names = first.filenames();
    std::ranges::copy(second.filenames(), std::back_inserter(names));
    std::ranges::sort(names);
    EXPECT_EQ(std::ranges::unique(names).begin(), names.end()) << "each came once";
}

TEST_P(LocalFileEnumeratorTest, thePageIsMadeInASectionThatNamesContainerAndPage) {
    (void)page(byName);
    (void)page(VantrelInitialPageSortedByDate());
    const std::string title =
        " enumerate items for " + std::string(VantrelRootContainerItemIdentifier) + " with page ";
    EXPECT_EQ(world_.sink->count("[DEBUG] ┏0" + title + "initialPageSortedByName"), 1U);
    EXPECT_EQ(world_.sink->count("[DEBUG] ┗0"), 1U);
    EXPECT_EQ(world_.sink->count("[DEBUG] ┏1" + title + "initialPageSortedByDate"), 1U);
    EXPECT_EQ(world_.sink->count("[DEBUG] ┗1"), 1U);
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
    world_.addLibrary("org.example.Notes", "Notes", world_.path("app"));
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

TEST_P(LocalFileEnumeratorTest, aCurrentAnchorIsTheCurrentEventOfTheVolumesHistory) {
    events_.script.eventID = EventID{77};
    std::optional<Data> anchor;
    enumerator().currentSyncAnchorWithCompletionHandler([&](const auto& data) { anchor = data; });
    ASSERT_TRUE(anchor);
    EXPECT_EQ(FSChangeToken::decode(*anchor),
              (FSChangeToken{.version = 0,
                             .deviceUUID = *world_.fileEvents.volumeUUID(world_.url("")),
                             .streamEventID = 77,
                             .offset = 0,
                             .appLibraryVersionToken = 0}));
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

}  // namespace
}  // namespace marrowdale
