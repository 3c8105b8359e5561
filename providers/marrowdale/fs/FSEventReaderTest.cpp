#include <thread>

#include "platform/foundation/Semaphore.h"
#include "providers/marrowdale/fs/FSEventReaderTestWorld.h"

namespace marrowdale {
namespace {

// The reader and its stream; what becomes of events is in FSEventReaderEventsTest.
class FSEventReaderTest : public FSEventReaderTestWorld {};

INSTANTIATE_TEST_SUITE_P(OnEach, FSEventReaderTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(FSEventReaderTest, aPathBasedStreamWatchesTheFoldersSinceTheEvent) {
    auto asked = options();
    asked.urls.push_back(URL::fileURL("/other \xff"));
    startReader(asked);
    EXPECT_EQ(stream()->paths, (Lines{world_.root(), "/other \xff"}));
    EXPECT_EQ(stream()->device, std::nullopt);
    EXPECT_EQ(stream()->since, EventID{10});
    EXPECT_EQ(stream()->latency, std::chrono::milliseconds(500));
    EXPECT_EQ(stream()->creationFlags, 0x51U);
    EXPECT_EQ(stream()->queueLabel, "marrowdale.fsevents-stream");
    EXPECT_EQ(stream()->calls(), Lines{"start"});
}

TEST_P(FSEventReaderTest, aDocIDBasedStreamWatchesTheFeedOfTheStorageRootsVolume) {
    startReader(FSEventReaderMode::docIDBased);
    EXPECT_EQ(stream()->paths, Lines{"/.docid"});
    const auto file = world_.realFileSystem.openForEvents(world_.manager.documentStorageURL());
    EXPECT_EQ(stream()->device, world_.realFileSystem.commonAttributes(**file)->device);
    EXPECT_EQ(stream()->since, EventID{10});
    EXPECT_EQ(stream()->latency, std::chrono::milliseconds(500));
    EXPECT_EQ(stream()->creationFlags, 0x51U);
    EXPECT_EQ(stream()->queueLabel, "marrowdale.fsevents-stream");
}

TEST_P(FSEventReaderTest, aStorageRootWithoutAVolumeIsLeftToTheService) {
    world_.fileSystem.openFault = [](const URL&) { return errorWithPOSIXCode(ENOENT); };
    startReader(FSEventReaderMode::docIDBased);
    EXPECT_EQ(stream()->device, DeviceID{});
}

TEST_P(FSEventReaderTest, aStreamThatCannotBeMadeEndsTheProcess) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_DEATH(
        {
            events_.hasStreams = false;
            startReader();
        },
        "fatal: can't create an event stream for <FSEventReader:");
}

TEST_P(FSEventReaderTest, theDescriptionShowsWhereItStands) {
    startReader();
    const std::string text = reader_->description();
    EXPECT_TRUE(text.starts_with("<FSEventReader:0x")) << text;
    EXPECT_TRUE(text.ends_with(" since:10 urls:[" +
                               world_.manager.documentStorageURL().absoluteString() +
                               "] mode:pathBased>"))
        << text;
    auto asked = options(FSEventReaderMode::docIDBased);
    asked.urls = {URL::fileURL("/a"), URL::fileURL("/b c")};
    EXPECT_TRUE(FSEventReader::make(platform_, asked)
                    ->description()
                    .ends_with(" urls:[file:///a, file:///b%20c] mode:docIDBased>"));
}

TEST_P(FSEventReaderTest, aVerboseReaderLogsItsStartAndStop) {
    startReader();
    const std::string before = reader_->description();
    tell({streamEvent(0)});
    reader_->stop();
    EXPECT_EQ(logged("[DEBUG] starting " + before), 1U);
    EXPECT_EQ(logged("[DEBUG] stopped " + reader_->description()), 1U);
    EXPECT_NE(before, reader_->description());
}

TEST_P(FSEventReaderTest, aQuietReaderLogsNeitherStartsNorDecisions) {
    auto asked = options();
    asked.verbose = false;
    startReader(asked);
    writeFile(world_.path("a"), "");
    tell({event("a", FileEventFlag::changed), event("none", FileEventFlag::changed),
          event(".h", FileEventFlag::changed), gone("b", FileID{5}),
          streamEvent(FileEventFlag::historyDone), streamEvent(FileEventFlag::eventIDsWrapped)});
    reader_->stop();
    EXPECT_EQ(delegate_->told.size(), 4U);
    EXPECT_EQ(world_.sink->lines(), Lines{});
}

TEST_P(FSEventReaderTest, stopStopsInvalidatesAndReleasesTheStream) {
    startReader();
    EXPECT_TRUE(reader_->isRunning());
    const auto first = stream();
    reader_->stop();
    EXPECT_FALSE(reader_->isRunning());
    EXPECT_EQ(first->calls(), (Lines{"start", "stop", "invalidate", "release"}));
    reader_->stop();
    EXPECT_EQ(first->calls().size(), 4U);
    EXPECT_EQ(world_.sink->countContaining("[DEBUG] stopped "), 1U);
}

TEST_P(FSEventReaderTest, aReaderThatRunsIsNotStartedTwice) {
    startReader();
    reader_->start();
    EXPECT_EQ(events_.streams().size(), 1U);
}

TEST_P(FSEventReaderTest, aRestartGoesOnBehindTheLastEventThatWasHandled) {
    startReader();
    writeFile(world_.path("a"), "");
    tell({event("a", FileEventFlag::changed), event("a", FileEventFlag::changed)});
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{12});
    reader_->stop();
    reader_->start();
    ASSERT_EQ(events_.streams().size(), 2U);
    EXPECT_EQ(stream()->since, EventID{12});
    tell({event("a", FileEventFlag::changed)});
    EXPECT_EQ(delegate_->told, (Lines{"change a 11", "change a 12", "change a 13"}));
}

TEST_P(FSEventReaderTest, aReaderThatIsReleasedWhileItRunsSaysSoAndEndsItsStream) {
    startReader();
    const std::string text = reader_->description();
    const auto left = stream();
    reader_.reset();
    EXPECT_EQ(logged("[ERROR] stream deleted without being stopped; " + text), 1U);
    EXPECT_EQ(left->calls(), (Lines{"start", "stop", "invalidate", "release"}));
}

TEST_P(FSEventReaderTest, aReaderThatWasStoppedIsReleasedInSilence) {
    startReader();
    reader_->stop();
    reader_.reset();
    FSEventReader::make(platform_, options()).reset();
    EXPECT_EQ(world_.sink->countOfLevel(LogLevel::error), 0U);
}

TEST_P(FSEventReaderTest, eventsAreDiscardedOnceTheDelegateIsGone) {
    startReader();
    std::weak_ptr<RecordingDelegate> weak = delegate_;
    delegate_.reset();
    EXPECT_TRUE(weak.expired());
    writeFile(world_.path("a"), "");
    tell({event("a", FileEventFlag::changed), streamEvent(FileEventFlag::userDropped)});
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{10});
    EXPECT_EQ(world_.sink->countContaining("did change"), 0U);
}

TEST_P(FSEventReaderTest, aDelegateThatGoesWithinABatchEndsIt) {
    startReader();
    int calls = 0;
    delegate_->within = [&](const std::string&) {
        ++calls;
        delegate_.reset();
    };
    tell({gone("a", FileID{1}), gone("b", FileID{2})});
    EXPECT_EQ(calls, 1);
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{11});
}

TEST_P(FSEventReaderTest, aStopWithinABatchEndsItThere) {
    startReader();
    delegate_->within = [&](const std::string& line) {
        if (line.starts_with("delete fid=2")) {
            EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{11}) << "counted too early";
            reader_->stop();
        }
    };
    const auto first = stream();
    first->hand({gone("a", FileID{1}), gone("b", FileID{2}), gone("c", FileID{3})});
    first->hand({gone("d", FileID{4})});
    reader_->streamQueue().sync([] {});
    EXPECT_EQ(delegate_->told, (Lines{"delete fid=1 " + world_.path("a") + " 11",
                                      "delete fid=2 " + world_.path("b") + " 12"}));
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{12});
    EXPECT_EQ(first->calls(), (Lines{"start", "stop", "invalidate", "release"}));
}

// Whoever starts again from there is told of the whole event, the first half once more.
TEST_P(FSEventReaderTest, anEventThatWasToldInPartIsNotCounted) {
    startReader();
    delegate_->within = [&](const std::string&) { reader_->stop(); };
    stream()->hand({gone("a", FileID{1}, 77), gone("b", FileID{2})});
    reader_->streamQueue().sync([] {});
    EXPECT_EQ(delegate_->told, Lines{"delete fid=1 " + world_.path("a") + " 11"});
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{10});
}

TEST_P(FSEventReaderTest, aResetThatStopsTheReaderLeavesTheRestOfTheEventUntold) {
    startReader();
    delegate_->within = [&](const std::string&) { reader_->stop(); };
    stream()->hand({streamEvent(FileEventFlag::userDropped | FileEventFlag::historyDone)});
    reader_->streamQueue().sync([] {});
    EXPECT_EQ(delegate_->told, Lines{"reset"});
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{10});
}

TEST_P(FSEventReaderTest, aRestartWithinABatchEndsTheOldOne) {
    startReader();
    delegate_->within = [&](const std::string& line) {
        if (line.starts_with("delete fid=1 ")) {
            reader_->stop();
            reader_->start();
        }
    };
    const auto first = stream();
    first->hand({gone("a", FileID{1}), gone("b", FileID{2})});
    reader_->streamQueue().sync([] {});
    EXPECT_EQ(delegate_->told.size(), 1U);
    ASSERT_EQ(events_.streams().size(), 2U);
    EXPECT_EQ(stream()->since, EventID{10});  // the event under way is told again
    EXPECT_TRUE(reader_->isRunning());
}

TEST_P(FSEventReaderTest, aBatchOnTheQueueIsNotToldAfterAStopFromElsewhere) {
    startReader();
    reader_->streamQueue().sync([&] {
        stream()->hand({gone("a", FileID{1})});
        std::thread([&] { reader_->stop(); }).join();
    });
    reader_->streamQueue().sync([] {});
    EXPECT_EQ(delegate_->told, Lines{});
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{10});
}

// The last owner may be the delegate itself, within a call.
TEST_P(FSEventReaderTest, theReaderMayBeReleasedFromWithinACall) {
    startReader();
    std::weak_ptr<FSEventReader> weak = reader_;
    Semaphore released;
    delegate_->within = [&](const std::string&) {
        reader_->stop();
        reader_.reset();
        released.signal();
    };
    stream()->hand({gone("a", FileID{1}), gone("b", FileID{2})});
    released.wait();
    EXPECT_TRUE(waitUntil([&] { return weak.expired(); }));
    EXPECT_EQ(delegate_->told.size(), 1U);
}

TEST_P(FSEventReaderTest, startsAndStopsFromSeveralThreadsLeaveNoStreamBehind) {
    reader_ = FSEventReader::make(platform_, options());
    {
        std::vector<std::jthread> threads;
        for (int thread = 0; thread < 4; ++thread) {
            threads.emplace_back([&] {
                for (int round = 0; round < 50; ++round) {
                    reader_->start();
                    (void)reader_->description();
                    reader_->stop();
                }
            });
        }
    }
    reader_->stop();
    for (const auto& made : events_.streams()) {
        EXPECT_EQ(made->calls(), (Lines{"start", "stop", "invalidate", "release"}));
    }
    EXPECT_EQ(world_.sink->countContaining("] starting "), events_.streams().size());
    EXPECT_EQ(world_.sink->countContaining("] stopped "), events_.streams().size());
}

TEST_P(FSEventReaderTest, theVolumesUUIDIsTheServices) {
    EXPECT_EQ(FSEventReader::volumeUUID(platform_, world_.url("")), events_.uuid);
    events_.uuidError = errorWithPOSIXCode(ENXIO);
    EXPECT_EQ(FSEventReader::volumeUUID(platform_, world_.url("")), std::nullopt);
}

}  // namespace
}  // namespace marrowdale
