#include <cerrno>

#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/fs/FSChangesNotifier.h"
#include "providers/marrowdale/fs/FSEventReaderTestWorld.h"
#include "providers/marrowdale/fs/FSRetiredReaders.h"

namespace marrowdale {
namespace {

class FSChangesNotifierTest : public FSEventReaderTestWorld {
  protected:
    static constexpr std::string_view root = VantrelRootContainerItemIdentifier;
    static constexpr std::string_view workingSet = VantrelWorkingSetContainerItemIdentifier;

    void make(std::string_view container) {
        events_.eventID = EventID{10};
        notifier_ = FSChangesNotifier::make(platform_, std::string(container),
                                            {world_.manager.documentStorageURL()});
    }
    void settle() {
        notifier_.reset();
        FSRetiredReaders::of(platform_).waitUntilGone();
    }
    void TearDown() override { settle(); }
    Lines signalled() { return world_.manager.signalled(); }

    std::shared_ptr<FSChangesNotifier> notifier_;
};

INSTANTIATE_TEST_SUITE_P(OnEach, FSChangesNotifierTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(FSChangesNotifierTest, anEmptyListOfURLsEndsTheProcess) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_DEATH((void)FSChangesNotifier::make(platform_, "fid=1", {}),
                 "require at least one URL to init a change notifier");
}

TEST_P(FSChangesNotifierTest, withoutAVolumeUUIDThereIsNone) {
    events_.uuidError = errorWithPOSIXCode(ENXIO);
    make("fid=1");
    EXPECT_EQ(notifier_, nullptr);
    EXPECT_EQ(world_.sink->lines(),
              Lines{"[ERROR] can't get volume UUID for \"" + world_.root() + "\""});
}

TEST_P(FSChangesNotifierTest, withoutACurrentEventThereIsNone) {
    events_.eventIDError = errorWithPOSIXCode(EIO);
    make("fid=1");
    EXPECT_EQ(notifier_, nullptr);
}

TEST_P(FSChangesNotifierTest, itReadsThePathsVerboselyFromTheEventAtWhichItWasMade) {
    make("fid=1");
    EXPECT_EQ(notifier_->deviceUUID(), events_.uuid);
    EXPECT_TRUE(notifier_->reader().verbose());
    EXPECT_EQ(notifier_->reader().mode(), FSEventReaderMode::pathBased);
    events_.eventID = EventID{20};
    EXPECT_TRUE(events_.streams().empty());
    notifier_->start();
    EXPECT_EQ(stream()->since, EventID{10});
    EXPECT_EQ(stream()->paths, Lines{world_.root()});
}

TEST_P(FSChangesNotifierTest, aFoldersNotifierSignalsTheRootAndThenTheWorkingSet) {
    writeFile(world_.path("a"), "");
    make("fid=1");
    notifier_->start();
    tell({event("a", FileEventFlag::changed, fileIDOf("a"))});
    EXPECT_EQ(signalled(), (Lines{std::string(root), std::string(workingSet)}));
    EXPECT_EQ(logged("[INFO] notify changes on " + std::string(root)), 1U);
    EXPECT_EQ(logged("[INFO] notify changes on " + std::string(workingSet)), 1U);
}

TEST_P(FSChangesNotifierTest, theWorkingSetsNotifierSignalsTheWorkingSetAlone) {
    make(workingSet);
    notifier_->start();
    tell({gone("a", FileID{5})});
    EXPECT_EQ(signalled(), Lines{std::string(workingSet)});
}

TEST_P(FSChangesNotifierTest, itNeverSignalsItsOwnContainer) {
    for (const auto container : {root, VantrelAllDirectoriesContainerItemIdentifier}) {
        make(container);
        notifier_->start();
        tell({gone("a", FileID{5})});
        EXPECT_EQ(signalled().size() % 2, 0U);
        EXPECT_EQ(signalled().back(), workingSet);
        settle();
    }
}

TEST_P(FSChangesNotifierTest, lostEventsAreSignalled) {
    make(workingSet);
    notifier_->start();
    tell({streamEvent(FileEventFlag::userDropped)});
    EXPECT_EQ(signalled(), Lines{std::string(workingSet)});
}

TEST_P(FSChangesNotifierTest, theEndOfTheHistoryAndWhatIsDroppedAreNotSignalled) {
    make(workingSet);
    notifier_->start();
    tell({streamEvent(FileEventFlag::historyDone), event(".hidden", FileEventFlag::changed)});
    EXPECT_EQ(signalled(), Lines{});
}

TEST_P(FSChangesNotifierTest, whileStoppedItSignalsNothing) {
    make(workingSet);
    EXPECT_TRUE(events_.streams().empty());
    notifier_->start();
    const auto first = stream();
    notifier_->stop();
    first->tell({gone("a", FileID{5})});
    EXPECT_EQ(signalled(), Lines{});
    EXPECT_EQ(first->calls(), (Lines{"start", "stop", "invalidate", "release"}));
}

// An event may be on its way to the notifier when it is stopped.
TEST_P(FSChangesNotifierTest, whatArrivesWhileItIsNotStartedIsNotSignalled) {
    make("fid=1");
    const auto arrive = [&] {
        notifier_->reader().streamQueue().sync(
            [&] { notifier_->fsEventReaderDidDeleteItem("fid=5", "/a", gone("a", FileID{5})); });
    };
    arrive();
    notifier_->start();
    notifier_->stop();
    arrive();
    EXPECT_EQ(signalled(), Lines{});
    notifier_->start();
    arrive();
    EXPECT_EQ(signalled().size(), 2U);
}

TEST_P(FSChangesNotifierTest, startedAgainItGoesOnWhereItWasStopped) {
    make(workingSet);
    notifier_->start();
    tell({gone("a", FileID{5})});
    notifier_->stop();
    notifier_->start();
    EXPECT_EQ(events_.streams().size(), 2U);
    EXPECT_EQ(stream()->since, EventID{11});
}

TEST_P(FSChangesNotifierTest, startingAndStoppingTwiceIsOnce) {
    make(workingSet);
    notifier_->stop();
    notifier_->start();
    notifier_->start();
    EXPECT_EQ(events_.streams().size(), 1U);
    notifier_->stop();
    notifier_->stop();
    EXPECT_EQ(stream()->calls(), (Lines{"start", "stop", "invalidate", "release"}));
}

TEST_P(FSChangesNotifierTest, releasedWhileItRunsItStopsItsReader) {
    make(workingSet);
    notifier_->start();
    const std::weak_ptr<FSChangesNotifier> weak = notifier_;
    settle();
    EXPECT_TRUE(weak.expired());
    EXPECT_EQ(events_.streams().back()->calls(), (Lines{"start", "stop", "invalidate", "release"}));
    EXPECT_EQ(world_.sink->countContaining("stream deleted without being stopped"), 0U);
}

}  // namespace
}  // namespace marrowdale
