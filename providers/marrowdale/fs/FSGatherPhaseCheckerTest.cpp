#include <thread>

#include "providers/marrowdale/fs/FSEventReaderTestWorld.h"

namespace marrowdale {
namespace {

using Status = FSEventReaderGatherPhaseResumeStatus;

// Whether a listing may go on, for each kind of history.
class FSGatherPhaseCheckerTest : public FSEventReaderTestWorld {
  protected:
    Status statusAfter(std::vector<std::vector<FileEvent>> history) {
        events_.history = std::move(history);
        const auto resume =
            FSEventReader::canResumeGatherPhase(platform_, {world_.url("")}, EventID{10});
        EXPECT_TRUE(resume);
        return resume ? resume->status : Status{};
    }
    FileEvent done() { return streamEvent(FileEventFlag::historyDone); }
};

INSTANTIATE_TEST_SUITE_P(OnEach, FSGatherPhaseCheckerTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(FSGatherPhaseCheckerTest, aHistoryWithoutDeletionsLetsTheListingGoOn) {
    writeFile(world_.path("a"), "");
    EXPECT_EQ(statusAfter({{event("a", FileEventFlag::changed, fileIDOf("a"))}, {done()}}),
              Status::canResume());
}

TEST_P(FSGatherPhaseCheckerTest, theReaderIsByPathAndQuietAndStoppedInTheEnd) {
    events_.eventID = EventID{99};
    events_.history = {{gone("a", FileID{5})}, {done()}};
    const auto resume = FSEventReader::canResumeGatherPhase(
        platform_, {world_.url("x"), world_.url("")}, EventID{10});
    ASSERT_TRUE(resume);
    EXPECT_EQ(resume->eventID, EventID{99});
    EXPECT_EQ(stream()->paths, (Lines{world_.path("x"), world_.root()}));
    EXPECT_EQ(stream()->device, std::nullopt);
    EXPECT_EQ(stream()->since, EventID{10});
    EXPECT_EQ(stream()->calls(), (Lines{"start", "stop", "invalidate", "release"}));
    EXPECT_EQ(world_.sink->lines(), Lines{});
}

TEST_P(FSGatherPhaseCheckerTest, aDeletionForbidsItAndSaysWhere) {
    EXPECT_EQ(statusAfter({{gone("a", FileID{5}, 7)}, {done()}}),
              Status::deletionOccurred(world_.path("a")));
    EXPECT_EQ(statusAfter({{gone("a", FileID{5}), gone("b", FileID{6}), done()}}),
              Status::deletionOccurred(world_.path("a")));
}

TEST_P(FSGatherPhaseCheckerTest, aDeletionOutOfSightDoesNot) {
    FileEvent outside = gone("", FileID{5});
    outside.path = directory_.path("none");
    EXPECT_EQ(statusAfter({{gone(".Trash/a", FileID{5}), outside}, {done()}}), Status::canResume());
}

TEST_P(FSGatherPhaseCheckerTest, lostOrWrappedEventsForbidItWhateverElseHappened) {
    for (const std::uint32_t lost : {FileEventFlag::userDropped, FileEventFlag::kernelDropped,
                                     FileEventFlag::eventIDsWrapped}) {
        EXPECT_EQ(statusAfter({{streamEvent(lost)}, {done()}}),
                  Status::cantReplayHistoricalFSEvents());
        EXPECT_EQ(statusAfter(
                      {{gone("a", FileID{5}), streamEvent(lost), gone("b", FileID{6})}, {done()}}),
                  Status::cantReplayHistoricalFSEvents());
        EXPECT_EQ(statusAfter({{streamEvent(lost | FileEventFlag::historyDone)}}),
                  Status::cantReplayHistoricalFSEvents());
    }
}

TEST_P(FSGatherPhaseCheckerTest, aDeletionOnTheEventThatEndsTheHistoryCounts) {
    FileEvent last = gone("a", FileID{5});
    last.flags |= FileEventFlag::historyDone;
    for (int round = 0; round < 50; ++round) {
        ASSERT_EQ(statusAfter({{last}}), Status::deletionOccurred(world_.path("a")));
    }
}

TEST_P(FSGatherPhaseCheckerTest, theCheckWaitsForTheEndOfTheHistory) {
    events_.history = {};
    std::optional<Status> status;
    std::jthread checking([&] {
        status =
            FSEventReader::canResumeGatherPhase(platform_, {world_.url("")}, EventID{10})->status;
    });
    ASSERT_TRUE(waitUntil([&] {
        const auto streams = events_.streams();
        return !streams.empty() && streams.front()->calls() == Lines{"start"};
    }));
    tell({gone("a", FileID{5})});
    EXPECT_EQ(stream()->calls(), Lines{"start"}) << "it did not wait";
    stream()->hand({done()});
    checking.join();
    EXPECT_EQ(status, Status::deletionOccurred(world_.path("a")));
}

TEST_P(FSGatherPhaseCheckerTest, theEventIsReadBeforeTheHistory) {
    class LateEvents : public FakeFileEventService {
      public:
        std::unique_ptr<FileEventStream> makeStream(FileEventStreamRequest request) override {
            eventID = EventID{50};
            return FakeFileEventService::makeStream(std::move(request));
        }
    } late;
    late.eventID = EventID{40};
    late.history = FakeFileEventService::emptyHistory();
    const Platform platform = withFileEvents(world_.platform, late);
    EXPECT_EQ(FSEventReader::canResumeGatherPhase(platform, {world_.url("")}, EventID{10})->eventID,
              EventID{40});
}

TEST_P(FSGatherPhaseCheckerTest, anEventIdentifierThatCannotBeReadIsTheError) {
    events_.eventIDError = errorWithPOSIXCode(EIO);
    const auto resume =
        FSEventReader::canResumeGatherPhase(platform_, {world_.url("")}, EventID{10});
    ASSERT_FALSE(resume);
    EXPECT_EQ(resume.error(), errorWithPOSIXCode(EIO));
    EXPECT_TRUE(events_.streams().empty());
}

}  // namespace
}  // namespace marrowdale
