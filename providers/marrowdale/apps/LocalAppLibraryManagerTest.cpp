#include <cerrno>
#include <filesystem>
#include <mutex>
#include <thread>

#include "platform/foundation/Semaphore.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/apps/AppsTestWorld.h"
#include "providers/marrowdale/items/MRWAppLibraryManager.h"

namespace marrowdale {
namespace {

class LocalAppLibraryManagerTest : public AppsTestWorld {
  protected:
    LocalAppLibraryManager& shared() { return LocalAppLibraryManager::shared(world_.platform); }
    // Whether the texts are found in the lines of the log, in this order.
    bool logTells(const Lines& texts) const {
        const auto lines = world_.sink->lines();
        auto at = lines.begin();
        for (const std::string& text : texts) {
            at = std::find_if(at, lines.end(),
                              [&](const auto& line) { return line.contains(text); });
            if (at == lines.end()) {
                return false;
            }
            ++at;
        }
        return true;
    }
};

TEST_F(LocalAppLibraryManagerTest, withoutACacheItKnowsNothing) {
    const LocalAppLibraryManager manager(world_.platform, Source::workingSet);
    EXPECT_EQ(manager.versionToken(), 0U);
    EXPECT_TRUE(manager.items().empty());
    EXPECT_EQ(manager.cacheSource(), Source::workingSet);
    EXPECT_EQ(countContaining(" loading bundle proxies from ~/"), 1U);
    EXPECT_EQ(countContaining("searchable-app-libraries.plist"), 1U);
}

TEST_F(LocalAppLibraryManagerTest, itLoadsTheCacheOfItsSource) {
    add("A");
    ASSERT_EQ(refresh(), Changed::yes);
    const LocalAppLibraryManager manager(world_.platform, Source::main);
    EXPECT_EQ(manager.versionToken(), 1U);
    EXPECT_EQ(identifiers(manager), Lines{"#org.example.A"});
    EXPECT_EQ(manager.rootURLs(), std::vector<URL>{URL::fileURL(library("A"))});
    EXPECT_EQ(manager.records().size(), 1U);
    EXPECT_TRUE(identifiers(LocalAppLibraryManager(world_.platform, Source::workingSet)).empty());
}

TEST_F(LocalAppLibraryManagerTest, itsDescriptionNamesEverything) {
    add("A");
    (void)refresh();
    const LocalAppLibraryManager manager(world_.platform, Source::main);
    const std::string own = manager.description();
    EXPECT_TRUE(own.starts_with("<LocalAppLibraryManager:0x"));
    EXPECT_TRUE(
        own.contains(" versionToken:1 cache-source:main cache app-libraries:"
                     "[<LocalAppLibraryItem:0x"));
    EXPECT_FALSE(own.contains("SHARED"));
    EXPECT_TRUE(own.ends_with("]>"));
    EXPECT_TRUE(shared().description().contains(
        " SHARED versionToken:0 cache-source:working-set cache app-libraries:[]>"));
}

TEST_F(LocalAppLibraryManagerTest, aRecordWithoutAnItemIsSkippedWithALine) {
    add("A");
    add("B");
    (void)refresh();
    std::filesystem::remove(library("A"));
    const LocalAppLibraryManager manager(world_.platform, Source::main);
    EXPECT_EQ(identifiers(manager), Lines{"#org.example.B"});
    EXPECT_EQ(count("[DEBUG] can't create app library from bundle proxy "
                    "<BundleRecord org.example.A>"),
              1U);
}

TEST_F(LocalAppLibraryManagerTest, anUpgradeWithEqualTokensSendsNothing) {
    add("A");
    (void)refresh();
    LocalAppLibraryManager manager(world_.platform, Source::main);
    RecordingChangeObserver observer;
    EXPECT_EQ(manager.upgradeFromMainCache(&observer, Searchable::yes), Changed::no);
    EXPECT_TRUE(observer.calls().empty());
    EXPECT_TRUE(world_.manager.deletedDomains().empty());
}

TEST_F(LocalAppLibraryManagerTest, anUpgradeTellsAllItemsAndThenWhatIsGone) {
    add("A");
    add("B");
    (void)refresh();
    LocalAppLibraryManager manager(world_.platform, Source::main);
    add("C");
    remove("A");
    (void)refresh();
    world_.sink->clear();
    RecordingChangeObserver observer;
    EXPECT_EQ(manager.upgradeFromMainCache(&observer, Searchable::no), Changed::yes);
    EXPECT_EQ(observer.calls(),
              (Lines{"update #org.example.B #org.example.C", "delete #org.example.A"}));
    EXPECT_EQ(manager.versionToken(), 2U);
    EXPECT_EQ(identifiers(manager), (Lines{"#org.example.B", "#org.example.C"}));
    EXPECT_TRUE(world_.manager.deletedDomains().empty());
    EXPECT_TRUE(logTells({" upgrading content from main cache",
                          "[DEBUG] upgraded manager <LocalAppLibraryManager:"}));
}

TEST_F(LocalAppLibraryManagerTest, anUpgradeToNothingTellsDeletionsAlone) {
    add("A");
    (void)refresh();
    LocalAppLibraryManager manager(world_.platform, Source::main);
    remove("A");
    (void)refresh();
    RecordingChangeObserver observer;
    EXPECT_EQ(manager.upgradeFromMainCache(&observer, Searchable::no), Changed::yes);
    EXPECT_EQ(observer.calls(), Lines{"delete #org.example.A"});
}

TEST_F(LocalAppLibraryManagerTest, aRecordWithoutAnItemIsSkippedByAnUpgrade) {
    LocalAppLibraryManager manager(world_.platform, Source::main);
    add("A");
    (void)refresh();
    std::filesystem::remove(library("A"));
    EXPECT_EQ(manager.upgradeFromMainCache(nullptr, Searchable::no), Changed::yes);
    EXPECT_EQ(manager.versionToken(), 1U);
    EXPECT_TRUE(manager.items().empty());
    EXPECT_EQ(count("[DEBUG] can't create app library for <BundleRecord org.example.A>"), 1U);
}

TEST_F(LocalAppLibraryManagerTest, aSearchableUpgradeTakesWhatIsGoneOutOfTheIndex) {
    add("A");
    add("B");
    (void)refresh();
    LocalAppLibraryManager manager(world_.platform, Source::main);
    remove("A");
    remove("B");
    (void)refresh();
    EXPECT_EQ(manager.upgradeFromMainCache(nullptr, Searchable::yes), Changed::yes);
    EXPECT_EQ(world_.manager.deletedDomains(),
              (std::vector<Lines>{{"#org.example.A", "#org.example.B"}}));
    EXPECT_TRUE(
        logTells({"[DEBUG] asking provider manager to delete index from deleted domains",
                  "[DEBUG] items from domains [#org.example.A, #org.example.B] removed from index",
                  "[DEBUG] upgraded manager "}));
}

// A host whose index takes its time.
class WaitingManager : public FakeManager {
  public:
    using FakeManager::FakeManager;
    void deleteIndexedItemsInDomains(
        std::vector<std::string> /*domainIdentifiers*/,
        std::function<void(const std::optional<Error>&)> completionHandler) override {
        {
            const std::lock_guard lock(mutex_);
            answer_ = std::move(completionHandler);
        }
        asked.signal();
    }
    void answer() {
        std::function<void(const std::optional<Error>&)> answer;
        {
            const std::lock_guard lock(mutex_);
            std::swap(answer, answer_);
        }
        answer(std::nullopt);
    }
    Semaphore asked;

  private:
    std::mutex mutex_;
    std::function<void(const std::optional<Error>&)> answer_;  // guarded by mutex_
};

TEST_F(LocalAppLibraryManagerTest, aSearchableUpgradeWaitsForTheIndex) {
    add("A");
    (void)refresh();
    WaitingManager host(world_.root());
    const Platform platform = withServices(world_.platform, {.manager = &host});
    LocalAppLibraryManager manager(platform, Source::main);
    remove("A");
    (void)refresh();
    std::thread upgrading(
        [&] { EXPECT_EQ(manager.upgradeFromMainCache(nullptr, Searchable::yes), Changed::yes); });
    host.asked.wait();
    // Until the host answers, the manager is what it was.
    EXPECT_EQ(manager.versionToken(), 1U);
    EXPECT_EQ(identifiers(manager), Lines{"#org.example.A"});
    world_.log.debug([] { return "the host answers"; });
    host.answer();
    upgrading.join();
    EXPECT_EQ(manager.versionToken(), 2U);
    EXPECT_TRUE(logTells({"[DEBUG] asking provider manager to delete index", "the host answers",
                          "[DEBUG] items from domains [#org.example.A] removed from index",
                          "[DEBUG] upgraded manager "}));
}

TEST_F(LocalAppLibraryManagerTest, itsQueuesAreNamed) {
    EXPECT_EQ(shared().queue().label(), "marrowdale.app-library-manager");
    EXPECT_EQ(LocalAppLibraryManager::backgroundQueue(world_.platform).label(),
              "marrowdale.app-library.background");
}

TEST_F(LocalAppLibraryManagerTest, aSearchableUpgradeWithoutDeletionsLeavesTheIndexAlone) {
    LocalAppLibraryManager manager(world_.platform, Source::main);
    add("A");
    (void)refresh();
    EXPECT_EQ(manager.upgradeFromMainCache(nullptr, Searchable::yes), Changed::yes);
    EXPECT_TRUE(world_.manager.deletedDomains().empty());
}

TEST_F(LocalAppLibraryManagerTest, anIndexThatRefusesIsLoggedAndTheUpgradeGoesOn) {
    add("A");
    (void)refresh();
    LocalAppLibraryManager manager(world_.platform, Source::main);
    remove("A");
    (void)refresh();
    world_.manager.deletionFault = errorWithPOSIXCode(EIO);
    EXPECT_EQ(manager.upgradeFromMainCache(nullptr, Searchable::yes), Changed::yes);
    EXPECT_EQ(count("[ERROR] can't delete searchable items from [#org.example.A]; " +
                    errorWithPOSIXCode(EIO).description()),
              1U);
    EXPECT_EQ(manager.versionToken(), 2U);
}

TEST_F(LocalAppLibraryManagerTest, aTokenAboveTheMainOneIsResetToTheMainContent) {
    add("A");
    (void)refresh();
    add("B");
    (void)refresh();
    LocalAppLibraryManager manager(world_.platform, Source::main);
    ASSERT_EQ(manager.versionToken(), 2U);
    std::filesystem::remove(mainFile());
    remove("A");
    (void)refresh();  // begins again with 1
    RecordingChangeObserver observer;
    EXPECT_EQ(manager.upgradeFromMainCache(&observer, Searchable::no), Changed::yes);
    EXPECT_EQ(countContaining("[ERROR] version token shouldn't be greater than the main's cache "
                              "version (2 vs 1); <LocalAppLibraryManager:"),
              1U);
    EXPECT_EQ(observer.calls(), (Lines{"update #org.example.B", "delete #org.example.A"}));
    EXPECT_EQ(manager.versionToken(), 1U);
}

TEST_F(LocalAppLibraryManagerTest, theSharedOneIsWhatIdentifiersAndItemsKnow) {
    EXPECT_TRUE(MRWAppLibraryManager::rootURLsForAppLibraries(world_.platform).empty());
    EXPECT_EQ(&shared(), &LocalAppLibraryManager::shared(world_.platform));
    add("A");
    (void)refresh();
    // Another manager's knowledge is its own.
    (void)LocalAppLibraryManager(world_.platform, Source::main);
    EXPECT_TRUE(MRWAppLibraryManager::rootURLsForAppLibraries(world_.platform).empty());
    EXPECT_EQ(shared().upgradeFromMainCache(nullptr, Searchable::no), Changed::yes);
    EXPECT_EQ(MRWAppLibraryManager::rootURLsForAppLibraries(world_.platform), shared().rootURLs());
    EXPECT_EQ(shared().rootURLs().size(), 1U);
}

TEST_F(LocalAppLibraryManagerTest, anotherWorldBeginsWithWhatTheCachesHold) {
    add("A");
    (void)refresh();
    cache(Source::workingSet).queue().sync([&] {
        ASSERT_TRUE(cache(Source::workingSet)
                        .save({world_.applications.bundleRecordForIdentifier("org.example.A")}, 1,
                              Bump::no));
    });
    SharedObjects others;
    const Platform& p = world_.platform;
    const Platform other{p.log,         p.fileSystem,         p.extendedAttributes,
                         p.writeAccess, p.fileOperations,     p.generationStore,
                         p.fileEvents,  p.applications,       p.manager,
                         others,        p.applicationSupport, p.deviceInformation,
                         p.icons,       p.imageEncoder};
    const LocalAppLibraryManager& second = LocalAppLibraryManager::shared(other);
    EXPECT_NE(&second, &shared());
    EXPECT_EQ(second.versionToken(), 1U);
    EXPECT_EQ(identifiers(second), Lines{"#org.example.A"});
}

}  // namespace
}  // namespace marrowdale
