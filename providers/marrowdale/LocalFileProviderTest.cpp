#include <cerrno>
#include <filesystem>

#include <gtest/gtest.h>

#include "platform/foundation/Semaphore.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/linux/icons/CachedBitmap.h"
#include "platform/testing/CollectingChangeObserver.h"
#include "platform/testing/CollectingObserver.h"
#include "platform/testing/PlatformVariants.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "providers/marrowdale/LocalFileEnumerator.h"
#include "providers/marrowdale/LocalFileProvider.h"
#include "providers/marrowdale/LocalRootEnumerator.h"
#include "providers/marrowdale/apps/LocalAppLibraryManager.h"
#include "providers/marrowdale/items/ProviderError.h"
#include "tests/support/TestWorld.h"

namespace marrowdale {
namespace {

class LocalFileProviderTest : public ::testing::TestWithParam<TestFileSystem> {
  protected:
    // An application's library, as a refresh finds it.
    void addLibrary() {
        makeFolder(directory_.path("app/Documents"));
        world_.applications.add("org.example.Notes", "Notes", directory_.path("app"));
        // Handlers are called after every refresh for as long as the provider lives.
        const auto done = std::make_shared<Semaphore>();
        provider_._refreshInstalledAppsWithCompletionHandler([done] { done->signal(); });
        done->wait();
    }
    std::string identifierOf(std::string_view name) {
        return provider_.persistentIdentifierForItemAtURL(world_.url(name)).value_or("none");
    }
    std::size_t count(const std::string& line) const { return world_.sink->count(line); }
    std::size_t countContaining(const std::string& text) const {
        return world_.sink->countContaining(text);
    }

    TemporaryDirectory directory_{GetParam().dir};
    TestWorld world_{directory_};
    LocalFileProvider provider_{world_.platform};
};

INSTANTIATE_TEST_SUITE_P(OnEach, LocalFileProviderTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(LocalFileProviderTest, initSignalsTheWorkingSet) {
    EXPECT_EQ(world_.manager.signalled(),
              std::vector<std::string>{std::string(VantrelWorkingSetContainerItemIdentifier)});
    EXPECT_EQ(count("[INFO] auto notify changes on VantrelWorkingSetContainerItemIdentifier at "
                    "startup"),
              1U);
}

TEST_P(LocalFileProviderTest, librariesOfTheCacheAreKnownBeforeTheFirstRefresh) {
    addLibrary();
    const URL library = URL::fileURL(directory_.path("app/Documents"));
    // As the working set's enumerator leaves it for the next process.
    LocalRootEnumerator workingSet(world_.platform,
                                   std::string(VantrelWorkingSetContainerItemIdentifier));
    const auto observer = std::make_shared<CollectingChangeObserver>();
    workingSet.currentSyncAnchorWithCompletionHandler([&](const std::optional<Data>& anchor) {
        workingSet.enumerateChangesForObserver(observer, *anchor);
    });
    ASSERT_TRUE(waitUntil(
        [&] { return world_.sink->countContaining(" saving bundle proxies to ~/") >= 2; }));
    // A process that begins anew, in which no refresh comes to its turn.
    SharedObjects shared;
    const Platform platform = withServices(world_.platform, {.shared = &shared});
    const auto looked = std::make_shared<Semaphore>();
    LocalAppLibraryManager::backgroundQueue(platform).async([looked] { looked->wait(); });
    {
        LocalFileProvider fresh(platform);
        EXPECT_EQ(fresh.persistentIdentifierForItemAtURL(library), "#org.example.Notes");
        looked->signal();
    }
}

TEST_P(LocalFileProviderTest, bothThumbnailRequestsAndTheBestIconAreOfTheApplication) {
    addLibrary();
    const auto image = native::cachedBitmapWithImage(
        {.width = 1, .height = 1, .pixels = Data(Bytes{1, 2, 3, 255})});
    const auto record =
        std::const_pointer_cast<FakeBundleRecord>(std::dynamic_pointer_cast<const FakeBundleRecord>(
            world_.applications.bundleRecordForIdentifier("org.example.Notes")));
    record->icons.emplace(0, *image);
    world_.device.scale = Number(1.0);
    world_.device.deviceClass = Number(std::int64_t{1});
    EXPECT_EQ(provider_.bestIconData(*record), *image);
    std::vector<std::string> calls;
    const auto done = [&](const std::optional<Error>& error) {
        EXPECT_EQ(error, std::nullopt);
        calls.emplace_back("done");
    };
    const FileProviderApplications::TypedThumbnailHandler typed =
        [&](std::string_view identifier, const auto& data, const auto& format, const auto& error) {
            EXPECT_EQ(data, *image);
            EXPECT_EQ(format, VantrelThumbnailFormatCachedBitmap);
            EXPECT_EQ(error, std::nullopt);
            calls.emplace_back(identifier);
        };
    EXPECT_TRUE(
        provider_.fetchThumbnailsForItemIdentifiers({"#org.example.Notes"}, {9, 9}, typed, done));
    const FileProviderApplications::ThumbnailHandler plain =
        [&](std::string_view identifier, const auto& data, const auto& error) {
            EXPECT_TRUE(data && data->text().starts_with("\x89PNG"));
            EXPECT_EQ(error, std::nullopt);
            calls.emplace_back(identifier);
        };
    EXPECT_TRUE(
        provider_.fetchThumbnailsForItemIdentifiers({"#org.example.Notes"}, {9, 9}, plain, done));
    EXPECT_EQ(calls, (std::vector<std::string>{"#org.example.Notes", "done", "#org.example.Notes",
                                               "done"}));
}

TEST_P(LocalFileProviderTest, anIdentifierAndAURLLeadToEachOther) {
    writeFile(world_.path("a.txt"), "");
    const std::string identifier = identifierOf("a.txt");
    EXPECT_TRUE(identifier.starts_with("did="));
    EXPECT_EQ(provider_.URLForItemWithPersistentIdentifier(identifier), world_.url("a.txt"));
    EXPECT_EQ(count("[DEBUG] found " + identifier), 2U);
    EXPECT_EQ(countContaining(" fetching URL for \"" + identifier + "\""), 1U);
    EXPECT_EQ(countContaining(" fetching item identifier for \"file://"), 1U);
}

TEST_P(LocalFileProviderTest, anUnknownIdentifierYieldsNoURLAndOneLine) {
    EXPECT_EQ(provider_.URLForItemWithPersistentIdentifier("did=4294967295"), std::nullopt);
    EXPECT_EQ(count("[ERROR] can't find URL matching identifier did=4294967295; " +
                    errorForNonExistentItem("did=4294967295").description()),
              1U);
}

TEST_P(LocalFileProviderTest, anIdentifierWithoutAnItemFailsWithTheNonExistentItemError) {
    for (const std::string_view identifier : {"did=4294967295", "fid=0", "nonsense", "", "#none"}) {
        const auto item = provider_.itemForIdentifier(identifier);
        ASSERT_FALSE(item);
        EXPECT_EQ(item.error(), errorForNonExistentItem(identifier));
        EXPECT_EQ(item.error().subject, identifier);
        EXPECT_EQ(
            count("[ERROR] item lookup failed for identifier \"" + std::string(identifier) + "\""),
            1U);
    }
}

TEST_P(LocalFileProviderTest, itemLookupLogsWhatItFound) {
    writeFile(world_.path("a.txt"), "");
    const std::string identifier = identifierOf("a.txt");
    const auto item = provider_.itemForIdentifier(identifier);
    ASSERT_TRUE(item);
    EXPECT_EQ((*item)->filename, "a.txt");
    EXPECT_EQ(count("[DEBUG] found " + (*item)->description()), 1U);
    EXPECT_EQ(countContaining(" fetching item's properties for \"" + identifier + "\""), 1U);
}

TEST_P(LocalFileProviderTest, theRootAndTheTemporaryFolderHaveItems) {
    EXPECT_EQ((*provider_.itemForIdentifier(VantrelRootContainerItemIdentifier))->fileURL,
              world_.manager.documentStorageURL());
    const auto temporary = provider_.itemForIdentifier(VantrelTemporaryLocalFolderItemIdentifier);
    ASSERT_TRUE(temporary);
    EXPECT_EQ((*temporary)->fileURL, world_.url(".TemporaryLocalFolder"));
    EXPECT_TRUE(std::filesystem::is_directory(world_.path(".TemporaryLocalFolder")));
    EXPECT_TRUE(provider_.itemForIdentifier(VantrelTemporaryLocalFolderItemIdentifier));
}

TEST_P(LocalFileProviderTest, aTemporaryFolderThatCannotBeMadeIsLogged) {
    const Error error = errorWithPOSIXCode(ENOSPC);
    world_.fileSystem.createFault = [&](const URL&) { return error; };
    EXPECT_FALSE(provider_.itemForIdentifier(VantrelTemporaryLocalFolderItemIdentifier));
    EXPECT_EQ(count("[ERROR] can't create temporary directory; " + error.description()), 1U);
}

TEST_P(LocalFileProviderTest, anAppLibraryIsFoundByItsIdentifier) {
    addLibrary();
    const auto item = provider_.itemForIdentifier("#org.example.Notes");
    ASSERT_TRUE(item);
    EXPECT_TRUE((*item)->hx_isContainer());
    EXPECT_EQ((*item)->filename, "Notes");
}

TEST_P(LocalFileProviderTest, aDocumentsFolderIsIdentifiedOnlyThroughItsAppLibrary) {
    addLibrary();
    makeFolder(world_.path("sub/Documents"));
    EXPECT_EQ(
        provider_.persistentIdentifierForItemAtURL(URL::fileURL(directory_.path("app/Documents"))),
        "#org.example.Notes");
    EXPECT_EQ(identifierOf("sub/Documents"), "none");
    EXPECT_EQ(countContaining("[ERROR] can't find bundle proxy at file://"), 1U);
}

TEST_P(LocalFileProviderTest, anItemForAURLIsItsRecord) {
    addLibrary();
    writeFile(world_.path("a.txt"), "");
    EXPECT_EQ((*provider_.itemForURL(world_.url("a.txt")))->filename, "a.txt");
    const auto library = provider_.itemForURL(URL::fileURL(directory_.path("app/Documents")));
    ASSERT_TRUE(library);
    EXPECT_TRUE((*library)->hx_isContainer());
}

TEST_P(LocalFileProviderTest, aURLWithoutAnIdentifierHasNoItem) {
    const auto item = provider_.itemForURL(world_.url("missing"));
    ASSERT_FALSE(item);
    EXPECT_EQ(item.error(), errorWithProviderCode(ProviderErrorCode::invalidItemURL, ""));
    EXPECT_EQ(count("[ERROR] identifier lookup failed for URL \"" +
                    world_.url("missing").absoluteString() + "\""),
              1U);
}

TEST_P(LocalFileProviderTest, aURLWhoseItemGoesBetweenTheLooksHasNoItem) {
    writeFile(world_.path("a.txt"), "");
    int looks = 0;
    world_.fileSystem.statusAnswer = [&](const URL&) -> std::optional<Expected<FileStatus>> {
        if (++looks == 1) {
            return std::nullopt;
        }
        return Expected<FileStatus>(Unexpected(errorWithPOSIXCode(ENOENT)));
    };
    const auto item = provider_.itemForURL(world_.url("a.txt"));
    ASSERT_FALSE(item);
    EXPECT_EQ(item.error(), errorWithProviderCode(ProviderErrorCode::itemNotFound, ""));
    EXPECT_EQ(
        count("[ERROR] can't create item for URL \"" + world_.url("a.txt").absoluteString() + "\""),
        1U);
}

TEST_P(LocalFileProviderTest, theContainersOfSeveralTreesAlwaysGetAnEnumerator) {
    for (const std::string_view container :
         {VantrelRootContainerItemIdentifier, VantrelWorkingSetContainerItemIdentifier,
          VantrelAllDirectoriesContainerItemIdentifier}) {
        const auto enumerator = provider_.enumeratorForContainerItemIdentifier(container);
        ASSERT_TRUE(enumerator);
        const auto* gathering = dynamic_cast<const LocalRootEnumerator*>(enumerator->get());
        ASSERT_NE(gathering, nullptr);
        EXPECT_EQ(gathering->container(), container);
        EXPECT_EQ(gathering->localFileEnumerator()->enumeratedItemURL(),
                  world_.manager.documentStorageURL());
        EXPECT_EQ(countContaining(" enumerator for " + std::string(container)), 1U);
    }
}

TEST_P(LocalFileProviderTest, aRefreshMakesALibraryKnownAndSignalsTheHost) {
    addLibrary();
    EXPECT_TRUE(waitUntil([&] { return world_.manager.signalled().size() == 3; }));
    EXPECT_EQ(world_.manager.signalled(),
              (std::vector<std::string>{std::string(VantrelWorkingSetContainerItemIdentifier),
                                        std::string(VantrelRootContainerItemIdentifier),
                                        std::string(VantrelWorkingSetContainerItemIdentifier)}));
    EXPECT_EQ(
        provider_.persistentIdentifierForItemAtURL(URL::fileURL(directory_.path("app/Documents"))),
        "#org.example.Notes");
}

TEST_P(LocalFileProviderTest, theDefaultContainerOfAnApplicationIsItsLibrary) {
    addLibrary();
    std::vector<Expected<FileProviderItemPtr>> answers;
    for (const char* identifier : {"org.example.Notes", "org.example.None"}) {
        provider_._defaultApplicationContainerForBundleIdentifier(
            identifier, [&](auto answer) { answers.push_back(std::move(answer)); });
    }
    ASSERT_EQ(answers.size(), 2U);
    EXPECT_EQ((*answers[0])->itemIdentifier, "#org.example.Notes");
    EXPECT_EQ(answers[1].error(), errorInvalidParameter("bundleIdentifier", "org.example.None"));
}

TEST_P(LocalFileProviderTest, anOrdinaryFolderGetsAnEnumeratorOverItsURL) {
    makeFolder(world_.path("f"));
    const std::string identifier = identifierOf("f");
    const auto enumerator = provider_.enumeratorForContainerItemIdentifier(identifier);
    ASSERT_TRUE(enumerator);
    writeFile(world_.path("f/inside"), "");
    CollectingObserver observer;
    (*enumerator)->enumerateItemsForObserver(observer, VantrelInitialPageSortedByName());
    ASSERT_EQ(observer.filenames(), std::vector<std::string>{"inside"});
    EXPECT_EQ(observer.pageItems.front()->parentItemIdentifier, identifier);
    (*enumerator)->invalidate();
}

TEST_P(LocalFileProviderTest, aContainerThatDoesNotResolveGetsNoEnumerator) {
    const auto enumerator = provider_.enumeratorForContainerItemIdentifier("fid=0");
    ASSERT_FALSE(enumerator);
    EXPECT_EQ(enumerator.error(), errorForNonExistentItem("fid=0"));
}

TEST_P(LocalFileProviderTest, thereIsNothingToProvide) {
    const URL nowhere = URL::fileURL("/nowhere");
    int calls = 0;
    const auto handler = [&](const std::optional<Error>& error) {
        ++calls;
        EXPECT_EQ(error, std::nullopt);
    };
    provider_.providePlaceholderAtURL(nowhere, handler);
    EXPECT_EQ(calls, 1);
    provider_.startProvidingItemAtURL(nowhere, handler);
    EXPECT_EQ(calls, 2);
    const auto linesBefore = world_.sink->lines();
    provider_.stopProvidingItemAtURL(nowhere);
    provider_.itemChangedAtURL(nowhere);
    EXPECT_EQ(world_.sink->lines(), linesBefore);
}

}  // namespace
}  // namespace marrowdale
