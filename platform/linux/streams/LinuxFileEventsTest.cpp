#include <algorithm>
#include <array>
#include <atomic>
#include <filesystem>
#include <latch>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/StoreDamage.h"
#include "platform/linux/streams/LinuxFileEvents.h"
#include "platform/linux/streams/StreamsTestWorld.h"

namespace marrowdale::native {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class LinuxFileEventsTest : public testing::Test {
  protected:
    using Callback = std::function<void(std::span<const FileEvent>)>;

    void serve() { service_ = std::make_unique<LinuxFileEvents>(history_); }
    [[nodiscard]] std::unique_ptr<FileEventStream> stream(FileEventStreamRequest request) {
        auto made = service_->makeStream(std::move(request));
        EXPECT_NE(made, nullptr);
        return made;
    }
    // By path, for the whole root.
    [[nodiscard]] FileEventStreamRequest request(std::uint64_t since, Callback callback) {
        return {{history_.root}, {},      EventID{since}, std::chrono::milliseconds(0), 0x51,
                queue_,          callback};
    }
    [[nodiscard]] FileEventStreamRequest request(std::uint64_t since) {
        return request(since, [this](std::span<const FileEvent> batch) { got_.take(batch); });
    }
    [[nodiscard]] std::unique_ptr<FileEventStream> started(FileEventStreamRequest request) {
        auto made = stream(std::move(request));
        made->start();
        return made;
    }
    void waitForHistory() {
        ASSERT_TRUE(waitUntil([this] { return got_.isHistoryDone(); }));
    }
    void waitForCount(std::size_t count) {
        ASSERT_TRUE(waitUntil([&] { return got_.count() >= count; })) << got_.count();
    }
    // All blocks that were on the queue ran.
    void drainQueue() {
        queue_.sync([] {});
    }

    TestHistory history_;
    SerialQueue queue_{"reader"};
    Collected got_;
    std::unique_ptr<LinuxFileEvents> service_;
};

TEST_F(LinuxFileEventsTest, HistoryThenDoneThenLive) {
    history_.appear("a");
    history_.appear("b");
    serve();
    const auto running = started(request(1));
    waitForHistory();
    history_.appear("c");
    waitForCount(3);
    EXPECT_THAT(got_.words(), ElementsAre("2 /served/b", "2 done", "3 /served/c"));
}

TEST_F(LinuxFileEventsTest, AnEmptyHistoryIsDoneAtOnce) {
    serve();
    EXPECT_EQ(raw(*service_->currentEventID()), 0U);
    const auto running = started(request(0));
    waitForHistory();
    EXPECT_THAT(got_.words(), ElementsAre("0 done"));
}

TEST_F(LinuxFileEventsTest, WhatHappenedBeforeTheStartIsHistory) {
    history_.duringBarrier = [this] { history_.appear("noticed late"); };
    serve();
    const auto running = started(request(0));
    waitForHistory();
    EXPECT_THAT(got_.words(), ElementsAre("1 /served/noticed late", "1 done"));
}

TEST_F(LinuxFileEventsTest, AnEventDuringTheStartIsLive) {
    history_.appear("a");
    history_.duringEventsSince = [this] {
        history_.duringEventsSince = nullptr;
        history_.appear("b");
    };
    serve();
    const auto running = started(request(0));
    waitForCount(3);
    EXPECT_THAT(got_.words(), ElementsAre("1 /served/a", "1 done", "2 /served/b"));
}

TEST_F(LinuxFileEventsTest, HistoryComesInBatchesOfBoundedSize) {
    std::vector<StoredEvent> many(1000, {.flags = FileEventFlag::changed, .path = "x"});
    history_.commit(many);
    serve();
    const auto running = started(request(0));
    waitForHistory();
    EXPECT_EQ(got_.count(), 1001U);
    EXPECT_LE(std::ranges::max(got_.batches()), 258U);
    EXPECT_GE(got_.batches().size(), 4U);
    std::uint64_t last = 0;
    for (const FileEvent& event : got_.events()) {
        EXPECT_EQ(raw(event.id), std::min<std::uint64_t>(++last, 1000));
    }
}

TEST_F(LinuxFileEventsTest, StoppingAfterEachBatchAndGoingOnFromTheLastLosesNothing) {
    history_.appearMany(1000);
    serve();
    std::vector<std::string> paths;
    std::uint64_t since = 0;
    int streams = 0;
    for (bool done = false; !done; ++streams) {
        std::atomic<bool> called = false;
        std::unique_ptr<FileEventStream> running;
        running = stream(request(since, [&](std::span<const FileEvent> batch) {
            running->stop();
            EXPECT_FALSE(called);
            for (const FileEvent& event : batch) {
                since = raw(event.id);
                done = done || event.flags == FileEventFlag::historyDone;
                if (event.path) {
                    paths.push_back(*event.path);
                }
            }
            called = true;
        }));
        running->start();
        ASSERT_TRUE(waitUntil([&] { return called.load(); }));
        running->invalidate();
        drainQueue();
    }
    EXPECT_GT(streams, 3);
    ASSERT_EQ(paths.size(), 1000U);
    for (int i = 0; i < 1000; ++i) {
        EXPECT_EQ(paths[static_cast<std::size_t>(i)], "/served/" + std::to_string(i + 1));
    }
}

TEST_F(LinuxFileEventsTest, OnlyWhatLiesBelowThePathsComes) {
    serve();
    auto asked = request(0);
    asked.paths = {"/served/one", "/served/two"};
    const auto running = started(std::move(asked));
    waitForHistory();
    for (const auto* path : {"one/a", "three/b", "two", "oneself", "", "one/c"}) {
        history_.appear(path);
    }
    waitForCount(4);
    EXPECT_THAT(got_.words(),
                ElementsAre("0 done", "1 /served/one/a", "3 /served/two", "6 /served/one/c"));
}

TEST_F(LinuxFileEventsTest, ADevicesFeedHasMovesAndKeepsItsStart) {
    const std::string move = "/.docid/2049/changed/1/src=2,dst=3";
    const auto moved = FileEventFlag::documentMoved;
    history_.appear("a");
    history_.commit({{.flags = moved, .fileID = FileID{3}, .path = move}});
    history_.appear("b");
    serve();
    auto asked = request(1);
    asked.paths = {"/.docid"};
    asked.device = TestHistory::volume;
    const auto running = started(std::move(asked));
    waitForHistory();
    EXPECT_THAT(got_.words(), ElementsAre("2 " + move, "1 done"));
    history_.commit({{.flags = moved, .fileID = FileID{3}, .path = move}});
    waitForCount(3);
    EXPECT_EQ(got_.words().back(), "4 " + move);
}

TEST_F(LinuxFileEventsTest, AStartInTheFutureWrapped) {
    history_.appear("a");
    serve();
    const auto running = started(request(100));
    waitForHistory();
    history_.appear("b");
    waitForCount(3);
    EXPECT_THAT(got_.words(), ElementsAre("1 wrapped", "1 done", "2 /served/b"));
}

TEST_F(LinuxFileEventsTest, AStartInALostRunIsDropped) {
    history_.appear("a");
    history_.world().crash();
    history_.world().open();
    history_.appear("b");
    const auto last = std::to_string(history_.world().journal().lastEvent());
    serve();
    const auto running = started(request(50));
    waitForHistory();
    EXPECT_THAT(got_.words(), ElementsAre(last + " dropped", last + " done"));
}

TEST_F(LinuxFileEventsTest, AStartThatWasPrunedIsDropped) {
    history_.world().options.retention = {std::chrono::seconds(0), 1, 1};
    history_.world().close();
    history_.world().open();
    history_.world().fillSegments(2);
    history_.world().snapshot();
    ASSERT_EQ(history_.standingOf(EventID{0}), EventHistory::Standing::pruned);
    const auto last = std::to_string(history_.world().journal().lastEvent());
    serve();
    const auto running = started(request(0));
    waitForHistory();
    EXPECT_THAT(got_.words(), ElementsAre(last + " dropped", last + " done"));
}

TEST_F(LinuxFileEventsTest, WhatIsNotRecordedIsDropped) {
    history_.appear("a");
    serve();
    auto elsewhere = request(0);
    elsewhere.paths = {"/elsewhere"};
    const auto first = started(std::move(elsewhere));
    waitForHistory();
    EXPECT_THAT(got_.words(), ElementsAre("1 dropped", "1 done"));
    first->stop();
    auto device = request(0);
    device.paths = {"/.docid"};
    device.device = DeviceID{1};
    const auto second = started(std::move(device));
    ASSERT_TRUE(waitUntil([this] { return got_.count() == 4; }));
    EXPECT_THAT(got_.words(), ElementsAre("1 dropped", "1 done", "0 dropped", "0 done"));
}

TEST_F(LinuxFileEventsTest, ABarrierThatFailsIsDropped) {
    history_.appear("a");
    history_.barrierError = errorWithPOSIXCode(ENOSPC, "commit", "here");
    serve();
    const auto running = started(request(0));
    waitForHistory();
    EXPECT_THAT(got_.words(), ElementsAre("1 dropped", "1 /served/a", "1 done"));
}

TEST_F(LinuxFileEventsTest, DamageHalfWayIsDroppedAndDone) {
    history_.appear("a");
    const std::string file = history_.world().folder().segment(1);
    const auto good = std::filesystem::file_size(file);
    history_.appear("b");
    std::string bytes = readFile(file);
    bytes[good + frameHeaderSize + 6] ^= 1;
    writeFile(file, bytes);
    serve();
    const auto running = started(request(0));
    waitForHistory();
    history_.appear("c");
    waitForCount(4);
    EXPECT_THAT(got_.words(), ElementsAre("1 /served/a", "2 dropped", "2 done", "3 /served/c"));
}

TEST_F(LinuxFileEventsTest, ABrokenHistoryIsToldToLiveStreams) {
    serve();
    const auto running = started(request(0));
    waitForHistory();
    history_.appear("a");
    history_.tell(EventHistory::News::broken);
    waitForCount(3);
    EXPECT_THAT(got_.words(), ElementsAre("0 done", "1 /served/a", "1 dropped"));
}

// Live events with a latency are held back, and come together; the history does not wait.
TEST_F(LinuxFileEventsTest, LiveEventsComeTogether) {
    serve();
    auto asked = request(0);
    asked.latency = std::chrono::milliseconds(300);
    const auto running = started(std::move(asked));
    waitForHistory();
    const auto start = std::chrono::steady_clock::now();
    for (int i = 0; i < 10; ++i) {
        history_.appear(std::to_string(i));
    }
    const bool quick = std::chrono::steady_clock::now() - start < std::chrono::milliseconds(200);
    waitForCount(11);
    EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(300));
    if (quick) {
        EXPECT_THAT(got_.batches(), ElementsAre(1, 10));
    }
}

TEST_F(LinuxFileEventsTest, AReaderThatNeverReturnsHoldsNobodyUp) {
    serve();
    std::latch entered(1);
    std::latch release(1);
    SerialQueue stuckQueue("stuck");
    auto asked = request(0, [&](std::span<const FileEvent>) {
        entered.count_down();
        release.wait();
    });
    asked.queue = stuckQueue;
    auto stuck = started(std::move(asked));
    entered.wait();
    const auto running = started(request(0));
    waitForHistory();
    for (int i = 0; i < 300; ++i) {
        history_.appear(std::to_string(i));
    }
    waitForCount(301);
    // Nor does it hold up its own stop, or the end of the service.
    stuck->stop();
    service_.reset();
    release.count_down();
    stuckQueue.sync([] {});
}

TEST_F(LinuxFileEventsTest, NothingComesAfterAStopFromElsewhere) {
    serve();
    for (int round = 0; round < 20; ++round) {
        std::atomic<int> calls = 0;
        const auto running = started(request(0, [&](std::span<const FileEvent>) { ++calls; }));
        history_.appear("x");
        if (round % 2 == 0) {
            ASSERT_TRUE(waitUntil([&] { return calls > 0; }));
        }
        running->stop();
        drainQueue();
        const int before = calls;
        history_.appear("y");
        drainQueue();
        running->invalidate();
        EXPECT_EQ(calls, before);
    }
}

TEST_F(LinuxFileEventsTest, NothingComesAfterAStopInTheCallback) {
    history_.appearMany(600);
    serve();
    std::atomic<int> calls = 0;
    std::unique_ptr<FileEventStream> running;
    running = stream(request(0, [&](std::span<const FileEvent>) {
        ++calls;
        running->stop();
        running->invalidate();
    }));
    running->start();
    ASSERT_TRUE(waitUntil([&] { return calls > 0; }));
    drainQueue();
    history_.appear("more");
    drainQueue();
    EXPECT_EQ(calls, 1);
}

TEST_F(LinuxFileEventsTest, AStreamMayGoInItsOwnCallback) {
    serve();
    std::atomic<int> calls = 0;
    std::unique_ptr<FileEventStream> running;
    running = stream(request(0, [&](std::span<const FileEvent>) {
        running.reset();
        ++calls;
    }));
    running->start();
    ASSERT_TRUE(waitUntil([&] { return calls > 0; }));
    drainQueue();
    EXPECT_EQ(calls, 1);
}

TEST_F(LinuxFileEventsTest, InvalidatingLetsGoOfTheCallback) {
    serve();
    auto kept = std::make_shared<int>(1);
    const auto running = started(request(0, [kept](std::span<const FileEvent>) {}));
    running->stop();
    running->invalidate();
    drainQueue();
    EXPECT_EQ(kept.use_count(), 1);
}

TEST_F(LinuxFileEventsTest, TheEndOfTheServiceEndsHistories) {
    history_.appearMany(3000);
    serve();
    // A stream in the middle of its history: its first batch is held up until the service is gone.
    std::latch entered(1);
    std::latch release(1);
    std::atomic<bool> first = true;
    const auto running = started(request(0, [&](std::span<const FileEvent> batch) {
        got_.take(batch);
        if (first.exchange(false)) {
            entered.count_down();
            release.wait();
        }
    }));
    entered.wait();
    service_.reset();
    history_.closed = true;
    release.count_down();
    waitForHistory();
    drainQueue();
    EXPECT_LT(got_.count(), 3000U);
    EXPECT_EQ(got_.countOf(FileEventFlag::historyDone), 1U);
    EXPECT_EQ(got_.words().back(), "3000 done");
    history_.closed = false;
}

TEST_F(LinuxFileEventsTest, AHistoryThatClosesIsNotTouchedAgain) {
    history_.appear("a");
    serve();
    const auto live = started(request(0));
    waitForHistory();
    history_.tell(EventHistory::News::closing);
    service_.reset();  // would remove its listener otherwise, which `closed` forbids
    history_.closed = true;
    drainQueue();
    EXPECT_EQ(got_.countOf(FileEventFlag::historyDone), 1U);
    history_.closed = false;
}

TEST_F(LinuxFileEventsTest, AStreamThatStartsAfterTheEndIsDone) {
    serve();
    const auto late = stream(request(5));
    service_.reset();
    EXPECT_EQ(history_.listeners(), 0U);
    late->start();
    waitForHistory();
    EXPECT_THAT(got_.words(), ElementsAre("5 done"));
}

TEST_F(LinuxFileEventsTest, ManyStreamsHearOfTheSame) {
    serve();
    constexpr int count = 20;
    std::array<Collected, count> got;
    std::vector<SerialQueue> queues;
    std::vector<std::unique_ptr<FileEventStream>> running;
    for (int i = 0; i < count; ++i) {
        auto asked = request(0, [&got, i](std::span<const FileEvent> batch) {
            got[static_cast<std::size_t>(i)].take(batch);
        });
        queues.emplace_back("reader " + std::to_string(i));
        asked.queue = queues.back();
        running.push_back(started(std::move(asked)));
    }
    for (int i = 0; i < 100; ++i) {
        history_.appear(std::to_string(i));
    }
    for (const Collected& each : got) {
        ASSERT_TRUE(waitUntil([&] { return each.count() == 101; }));
        std::uint64_t last = 0;
        for (const FileEvent& event : each.events()) {
            EXPECT_EQ(raw(event.id), event.path ? ++last : last);
        }
    }
}

}  // namespace
}  // namespace marrowdale::native
