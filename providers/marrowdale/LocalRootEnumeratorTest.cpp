#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <functional>
#include <utility>

#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/CollectingObserver.h"
#include "platform/testing/ForwardingFileEventService.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/LocalRootEnumerator.h"
#include "providers/marrowdale/apps/AppsTestWorld.h"

namespace marrowdale {
namespace {

const std::string root(VantrelRootContainerItemIdentifier);
const std::string workingSet(VantrelWorkingSetContainerItemIdentifier);
const std::string allDirectories(VantrelAllDirectoriesContainerItemIdentifier);

constexpr std::string_view zeroLine =
    "[DEBUG] change token version is zero, let's send all the app-libraries known";
constexpr std::string_view matchesLine = "[DEBUG] change token version matches local version";
constexpr std::string_view nothingLine =
    "[ERROR] change token version matches nothing, need to restart from scratch ";

class LocalRootEnumeratorTest : public AppsTestWorld {
  protected:
    using Calls = std::vector<std::string>;

    // What a refresh of the provider does.
    void refreshAll() {
        (void)refresh();
        (void)LocalAppLibraryManager::shared(world_.platform)
            .upgradeFromMainCache(nullptr, Searchable::no);
    }
    std::shared_ptr<LocalRootEnumerator> enumerator(const std::string& container = root) {
        return std::make_shared<LocalRootEnumerator>(world_.platform, container);
    }
    // An anchor of this moment, with another version of the libraries.
    Data anchorWithVersion(std::uint64_t version) {
        Data anchor;
        enumerator()->currentSyncAnchorWithCompletionHandler(
            [&](const std::optional<Data>& current) { anchor = current.value_or(Data()); });
        FSChangeToken token = *FSChangeToken::decode(anchor);
        token.appLibraryVersionToken = version;
        return token.encode();
    }
    static std::uint64_t versionIn(const std::optional<Data>& anchor) {
        return anchor ? FSChangeToken::decode(*anchor)->appLibraryVersionToken : ~std::uint64_t{0};
    }
    // What one request brings; the anchor that follows in `next_`.
    // What is recorded while it is being made is told twice; here once.
    Calls changes(LocalRootEnumerator& enumerator, const Data& anchor) {
        const auto observer = std::make_shared<RecordingChangeObserver>();
        enumerator.enumerateChangesForObserver(observer, anchor);
        EXPECT_TRUE(waitUntil([&] { return observer->isFinished(); }));
        next_ = observer->anchor();
        Calls calls = observer->calls();
        calls.erase(std::ranges::unique(calls).begin(), calls.end());
        return calls;
    }
    CollectingObserver page(LocalRootEnumerator& enumerator, const Data& page) {
        CollectingObserver observer;
        enumerator.enumerateItemsForObserver(observer, page);
        EXPECT_EQ(observer.finishes, 1);
        return observer;
    }
    static std::vector<std::string> monitored(const LocalRootEnumerator& enumerator) {
        std::vector<std::string> paths;
        for (const URL& url : enumerator.localFileEnumerator()->urls()) {
            paths.push_back(url.path());
        }
        return paths;
    }
    // Returns when the enumerator's notifier is in no call any more: this world may end then.
    static void drain(const LocalFileEnumerator& stopped) {
        stopped.notifier()->reader().streamQueue().sync([] {});
    }
    static const std::string expired;

    std::optional<Data> next_;
};
const std::string LocalRootEnumeratorTest::expired = "error -1002";

TEST_F(LocalRootEnumeratorTest, eachContainerHasTheManagerOfItsCache) {
    EXPECT_EQ(enumerator(root)->appLibraryManager().cacheSource(), Source::main);
    EXPECT_EQ(enumerator(allDirectories)->appLibraryManager().cacheSource(), Source::main);
    EXPECT_EQ(enumerator(workingSet)->appLibraryManager().cacheSource(), Source::workingSet);
    EXPECT_EQ(enumerator(workingSet)->container(), workingSet);
    EXPECT_EQ(enumerator(workingSet)->localFileEnumerator()->container(), workingSet);
}

TEST_F(LocalRootEnumeratorTest, theStorageRootAndAllLibrariesAreMonitored) {
    add("B");
    add("A");
    refreshAll();
    EXPECT_EQ(monitored(*enumerator()), (Lines{world_.root(), library("A"), library("B")}));
    EXPECT_EQ(monitored(*enumerator(workingSet)), Lines{world_.root()});
}

TEST_F(LocalRootEnumeratorTest, initialPagesBeginWithAllLibraries) {
    add("A");
    add("B");
    refreshAll();
    writeFile(world_.path("a.txt"), "");
    for (const Data& initial :
         {VantrelInitialPageSortedByDate(), VantrelInitialPageSortedByName()}) {
        world_.sink->clear();
        const auto made = enumerator();
        const auto observer = page(*made, initial);
        ASSERT_EQ(observer.pageItems.size(), 4U);
        EXPECT_EQ(observer.batches, 2);
        EXPECT_EQ(observer.pageItems[0]->itemIdentifier, "#org.example.A");
        EXPECT_EQ(observer.pageItems[1]->itemIdentifier, "#org.example.B");
        EXPECT_EQ(count("[DEBUG] discovered 2 app-libraries"), 1U);
        EXPECT_EQ(countContaining(" enumerate root items for 0x"), 1U);
    }
}

TEST_F(LocalRootEnumeratorTest, laterPagesHaveNoLibraries) {
    add("A");
    refreshAll();
    for (int i = 0; i < 250; ++i) {
        writeFile(world_.path("f" + std::to_string(i)), "");
    }
    const auto made = enumerator();
    const auto first = page(*made, VantrelInitialPageSortedByName());
    ASSERT_TRUE(first.nextPage);
    world_.sink->clear();
    const auto second = page(*made, *first.nextPage);
    EXPECT_EQ(second.batches, 1);
    EXPECT_EQ(countContaining("app-libraries"), 0U);
    EXPECT_EQ(first.pageItems.size() + second.pageItems.size(), 252U);  // "apps" among them
}

TEST_F(LocalRootEnumeratorTest, theAnchorCarriesTheManagersVersion) {
    add("A");
    refreshAll();
    std::optional<Data> anchor;
    enumerator()->currentSyncAnchorWithCompletionHandler(
        [&](const std::optional<Data>& current) { anchor = current; });
    EXPECT_EQ(versionIn(anchor), 1U);
    enumerator(workingSet)
        ->currentSyncAnchorWithCompletionHandler(
            [&](const std::optional<Data>& current) { anchor = current; });
    EXPECT_EQ(versionIn(anchor), 0U);
}

TEST_F(LocalRootEnumeratorTest, anAnchorThatCantBeDecodedIsExpired) {
    EXPECT_EQ(changes(*enumerator(), Data::fromText("junk")), Calls{expired});
    EXPECT_EQ(changes(*enumerator(), Data(Bytes(48))), Calls{expired});
    EXPECT_EQ(count("[ERROR] can't create change token from anchor data, resetting"), 2U);
    EXPECT_EQ(countContaining(" enumerate root changes for 0x"), 2U);
    EXPECT_EQ(countContaining("notifying app library changes since "), 0U);
}

TEST_F(LocalRootEnumeratorTest, row1AVersionAheadOfTheMainCacheIsExpiredFirst) {
    add("A");
    refreshAll();
    for (const std::string& container : {root, workingSet, allDirectories}) {
        world_.sink->clear();
        const auto made = enumerator(container);
        EXPECT_EQ(changes(*made, anchorWithVersion(2)), Calls{expired});
        const std::string local = container == workingSet ? "0" : "1";
        EXPECT_EQ(count("[DEBUG] app-library version is in advance, need to restart from scratch "
                        "[changeTokenVersion: 2, localVersion: " +
                        local + ", mainCacheVersion: 1]"),
                  1U);
        EXPECT_EQ(countContaining("[DEBUG] notifying app library changes since <FSChangeToken"),
                  1U);
    }
}

TEST_F(LocalRootEnumeratorTest, row3VersionZeroIsSentAllLibraries) {
    add("A");
    add("B");
    refreshAll();
    const auto made = enumerator();
    EXPECT_EQ(changes(*made, anchorWithVersion(0)),
              (Calls{"update #org.example.A #org.example.B", "finish"}));
    EXPECT_EQ(versionIn(next_), 1U);
    EXPECT_EQ(count(std::string(zeroLine)), 1U);
}

TEST_F(LocalRootEnumeratorTest, row3FilesFollowTheLibraries) {
    add("A");
    refreshAll();
    const auto made = enumerator();
    const Data anchor = anchorWithVersion(0);
    writeFile(world_.path("a.txt"), "");
    const Calls calls = changes(*made, anchor);
    ASSERT_EQ(calls.size(), 3U);
    EXPECT_EQ(calls[0], "update #org.example.A");
    EXPECT_TRUE(calls[1].starts_with("update did="));
    EXPECT_EQ(calls[2], "finish");
}

TEST_F(LocalRootEnumeratorTest, row4AnotherVersionThanTheLocalOneIsExpired) {
    add("A");
    refreshAll();
    add("B");
    refreshAll();
    const auto made = enumerator();  // knows version 2
    EXPECT_EQ(changes(*made, anchorWithVersion(1)), Calls{expired});
    EXPECT_EQ(count(std::string(nothingLine) +
                    "[changeTokenVersion: 1, localVersion: 2, mainCacheVersion: 2]"),
              1U);
}

TEST_F(LocalRootEnumeratorTest, row5TheSameVersionWithoutAChangeSendsNoLibrary) {
    add("A");
    refreshAll();
    const auto made = enumerator();
    EXPECT_EQ(changes(*made, anchorWithVersion(1)), Calls{"finish"});
    EXPECT_EQ(versionIn(next_), 1U);
    EXPECT_EQ(count(std::string(matchesLine)), 1U);
    EXPECT_EQ(countContaining("updated root enumerator to monitor"), 0U);
}

TEST_F(LocalRootEnumeratorTest, row5TheSameVersionIsUpgradedAndMonitorsWhatIsNew) {
    add("A");
    refreshAll();
    for (const std::string& container : {root, allDirectories}) {
        const auto made = enumerator(container);
        const std::uint64_t before = made->appLibraryManager().versionToken();
        const std::string fresh = "B" + std::to_string(before);
        add(fresh);
        remove(before == 1 ? "A" : "B1");
        const Data anchor = anchorWithVersion(before);
        refreshAll();
        EXPECT_EQ(
            changes(*made, anchor),
            (Calls{"update #org.example." + fresh,
                   before == 1 ? "delete #org.example.A" : "delete #org.example.B1", "finish"}));
        EXPECT_EQ(versionIn(next_), before + 1);
        EXPECT_EQ(monitored(*made), (Lines{world_.root(), library(fresh)}));
        EXPECT_EQ(count("[DEBUG] updated root enumerator to monitor [" + world_.root() + ", " +
                        library(fresh) + "]"),
                  1U);
        EXPECT_TRUE(world_.manager.deletedDomains().empty());
    }
}

TEST_F(LocalRootEnumeratorTest, workingSetRow1VersionZeroIsUpgradedAndSentAll) {
    add("A");
    refreshAll();
    const auto made = enumerator(workingSet);
    EXPECT_EQ(changes(*made, anchorWithVersion(0)), (Calls{"update #org.example.A", "finish"}));
    EXPECT_EQ(versionIn(next_), 1U);
    EXPECT_EQ(count(std::string(zeroLine)), 1U);
    EXPECT_EQ(monitored(*made), (Lines{world_.root(), library("A")}));
    EXPECT_EQ(cached(Source::workingSet), Lines{"org.example.A"});
    EXPECT_EQ(token(Source::workingSet), 1U);
    EXPECT_EQ(countContaining(" saving bundle proxies to ~/"), 2U);  // the main one's, and this
}

TEST_F(LocalRootEnumeratorTest, workingSetRow1WithoutAChangeSendsAllAndSavesNothing) {
    const auto made = enumerator(workingSet);
    EXPECT_EQ(changes(*made, anchorWithVersion(0)), (Calls{"update", "finish"}));
    EXPECT_EQ(versionIn(next_), 0U);
    EXPECT_EQ(countContaining("saving bundle proxies"), 0U);
}

TEST_F(LocalRootEnumeratorTest, workingSetRow2AnotherVersionIsExpired) {
    add("A");
    refreshAll();
    add("B");
    refreshAll();
    const auto made = enumerator(workingSet);  // knows nothing yet
    EXPECT_EQ(changes(*made, anchorWithVersion(1)), Calls{expired});
    EXPECT_EQ(count(std::string(nothingLine) +
                    "[changeTokenVersion: 1, localVersion: 0, workingSetVersion: 2, "
                    "mainCacheVersion: 2]"),
              1U);
}

TEST_F(LocalRootEnumeratorTest, workingSetRow3TheSameVersionIsUpgradedSearchable) {
    makeFolder(library("B"));
    add("A");
    refreshAll();
    const auto made = enumerator(workingSet);
    (void)changes(*made, anchorWithVersion(0));
    const Data anchor = *next_;
    add("B");
    remove("A");
    refreshAll();
    EXPECT_EQ(changes(*made, anchor),
              (Calls{"update #org.example.B", "delete #org.example.A", "finish"}));
    EXPECT_EQ(versionIn(next_), 2U);
    EXPECT_EQ(count(std::string(matchesLine)), 1U);
    EXPECT_EQ(world_.manager.deletedDomains(), (std::vector<Lines>{{"#org.example.A"}}));
    EXPECT_EQ(cached(Source::workingSet), Lines{"org.example.B"});
    EXPECT_EQ(token(Source::workingSet), 2U);
    EXPECT_EQ(monitored(*made), (Lines{world_.root(), library("B")}));
    // And once more, with nothing new.
    EXPECT_EQ(changes(*made, *next_), Calls{"finish"});
}

TEST_F(LocalRootEnumeratorTest, aWorkingSetCacheThatCantBeSavedStopsNothing) {
    add("A");
    refreshAll();
    makeFolder(directory_.path("data/Marrowdale/searchable-app-libraries.plist/in the way"));
    const auto made = enumerator(workingSet);
    EXPECT_EQ(changes(*made, anchorWithVersion(0)), (Calls{"update #org.example.A", "finish"}));
    EXPECT_EQ(countContaining("[ERROR] can't save working-set cache to disk; "), 1U);
}

// Does something when it is next asked for the event of now: as a new notifier asks.
class Interrupted : public ForwardingFileEventService {
  public:
    using ForwardingFileEventService::ForwardingFileEventService;
    Expected<EventID> currentEventID() override {
        if (const auto interruption = std::exchange(next, nullptr)) {
            interruption();
        }
        return ForwardingFileEventService::currentEventID();
    }
    std::function<void()> next;
};

TEST_F(LocalRootEnumeratorTest, theWorkingSetCacheDoesNotGoBackWhereTwoAreUpgradedAtOnce) {
    Interrupted events(world_.fileEvents);
    const Platform platform = withFileEvents(world_.platform, events);
    const auto slow = std::make_shared<LocalRootEnumerator>(platform, workingSet);
    const Data first = anchorWithVersion(0);
    add("A");
    refreshAll();
    const auto quick = enumerator(workingSet);
    // Between its upgrade and its save.
    events.next = [&] {
        add("B");
        refreshAll();
        EXPECT_EQ(changes(*quick, first).back(), "finish");
    };
    EXPECT_EQ(changes(*slow, first).front(), "update #org.example.A");
    EXPECT_EQ(versionIn(next_), 1U);
    EXPECT_EQ(cached(Source::workingSet), (Lines{"org.example.A", "org.example.B"}));
    EXPECT_EQ(token(Source::workingSet), 2U);
    // Whoever begins now is at the newest version, and stays there through a restart.
    std::optional<Data> anchor;
    enumerator(workingSet)->currentSyncAnchorWithCompletionHandler([&](const auto& current) {
        anchor = current;
    });
    EXPECT_EQ(versionIn(anchor), 2U);
}

TEST_F(LocalRootEnumeratorTest, aFreshEnumeratorOfTheWorkingSetGoesOnFromTheCache) {
    add("A");
    refreshAll();
    (void)changes(*enumerator(workingSet), anchorWithVersion(0));
    EXPECT_EQ(changes(*enumerator(workingSet), *next_), Calls{"finish"});
}

TEST_F(LocalRootEnumeratorTest, aRunningOneFollowsTheNewFolders) {
    const auto made = enumerator();
    made->start();
    made->start();
    const Data anchor = anchorWithVersion(0);
    add("A");
    refreshAll();
    (void)changes(*made, anchor);  // version 0: all that it knows, which is nothing
    const auto second = enumerator();
    const auto replaced = second->localFileEnumerator();
    second->start();
    add("B");
    const Data known = anchorWithVersion(1);
    refreshAll();
    (void)changes(*second, known);
    EXPECT_EQ(monitored(*second), (Lines{world_.root(), library("A"), library("B")}));
    const std::size_t before = world_.manager.signalled().size();
    writeFile(library("B") + "/new", "");
    EXPECT_TRUE(waitUntil([&] { return world_.manager.signalled().size() > before; }));
    second->stop();
    second->stop();
    second->invalidate();
    second->invalidate();
    made->invalidate();
    drain(*replaced);
    drain(*second->localFileEnumerator());
    drain(*made->localFileEnumerator());
}

TEST_F(LocalRootEnumeratorTest, invalidateIsStopAndDoesNothingToOneThatIsNotStarted) {
    add("A");
    refreshAll();
    const auto made = enumerator();
    made->invalidate();
    made->stop();
    made->invalidate();
    EXPECT_EQ(changes(*made, anchorWithVersion(0)), (Calls{"update #org.example.A", "finish"}));
    // Nor does it close one that was.
    made->start();
    made->invalidate();
    EXPECT_EQ(changes(*made, anchorWithVersion(1)), Calls{"finish"});
    drain(*made->localFileEnumerator());
}

TEST_F(LocalRootEnumeratorTest, row5TellsInItsOrder) {
    add("A");
    refreshAll();
    const auto made = enumerator();
    remove("A");
    add("B");
    const Data anchor = anchorWithVersion(1);
    refreshAll();
    world_.sink->clear();
    writeFile(world_.path("new.txt"), "");
    const Calls calls = changes(*made, anchor);
    // Libraries, those that are gone, files, the end.
    ASSERT_EQ(calls.size(), 4U);
    EXPECT_EQ(calls[0], "update #org.example.B");
    EXPECT_EQ(calls[1], "delete #org.example.A");
    EXPECT_TRUE(calls[2].starts_with("update did="));
    EXPECT_EQ(calls[3], "finish");
    const auto lines = world_.sink->lines();
    const auto placeOf = [&](std::string_view text) {
        const auto found = std::ranges::find_if(
            lines, [&](const std::string& line) { return line.contains(text); });
        EXPECT_NE(found, lines.end()) << text;
        return found - lines.begin();
    };
    const std::vector<std::ptrdiff_t> places{placeOf(" enumerate root changes for "),
                                             placeOf("notifying app library changes since "),
                                             placeOf(matchesLine),
                                             placeOf("upgrading content from main cache"),
                                             placeOf("upgraded manager "),
                                             placeOf("updated root enumerator to monitor [")};
    EXPECT_TRUE(std::ranges::is_sorted(places));
}

TEST_F(LocalRootEnumeratorTest, itsQueueIsNamed) {
    EXPECT_EQ(enumerator()->enumQueue().label(), "marrowdale.root-enumerator.queue");
}

TEST_F(LocalRootEnumeratorTest, whatHappensInALibraryReachesTheWorkingSetsFeed) {
    add("A");
    refreshAll();
    const auto made = enumerator(workingSet);
    (void)changes(*made, anchorWithVersion(0));
    writeFile(library("A") + "/new.txt", "");
    const Calls calls = changes(*made, *next_);
    ASSERT_EQ(calls.size(), 2U);
    EXPECT_TRUE(calls[0].starts_with("update did="));
}

}  // namespace
}  // namespace marrowdale
