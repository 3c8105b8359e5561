#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <sys/mount.h>
#include <unistd.h>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/JournalTestSupport.h"
#include "platform/linux/store/Retention.h"
#include "platform/testing/ScopedMount.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

constexpr std::int64_t day = 86'400;
constexpr std::int64_t start = 20'000 * day;
constexpr Retention usual;

// A segment of a MiB a day, with that many events in each.
std::vector<SegmentAge> daily(std::size_t days, std::uint64_t eventsEach) {
    std::vector<SegmentAge> segments(days);
    for (std::size_t i = 0; i < days; ++i) {
        segments[i] = {start + static_cast<std::int64_t>(i) * day, (days - 1 - i) * eventsEach,
                       1U << 20U};
    }
    return segments;
}

TEST(RetentionTest, WhatIsYoungStays) {
    const auto segments = daily(40, 10'000'000);
    // The last event of a segment is as old as the segment behind it.
    EXPECT_EQ(surplusSegments(segments, 1, usual, start + 39 * day), 8U);
    EXPECT_EQ(surplusSegments(segments, 1, usual, start + 39 * day + 1), 9U);
    EXPECT_EQ(surplusSegments(segments, 1, usual, start + 30 * day), 0U);
}

TEST(RetentionTest, TheNewestEventsStayHoweverOld) {
    const auto segments = daily(400, 100'000);
    EXPECT_EQ(surplusSegments(segments, 1, usual, start + 4000 * day), 390U);
    EXPECT_EQ(surplusSegments(daily(400, 1000), 1, usual, start + 4000 * day), 0U);
}

TEST(RetentionTest, TheBoundInBytesWins) {
    Retention small = usual;
    small.bytes = 5U << 20U;
    EXPECT_EQ(surplusSegments(daily(40, 1), 1, small, start), 35U);
    small.bytes = 0;
    EXPECT_EQ(surplusSegments(daily(40, 1), 1, small, start), 39U);
    EXPECT_EQ(surplusSegments(daily(40, 1), 10, small, start), 30U);
    EXPECT_EQ(surplusSegments(daily(4, 1), 10, small, start), 0U);
    EXPECT_EQ(surplusSegments(daily(1, 1), 0, small, start), 0U);
}

TEST(RetentionTest, AClockSetBackRemovesNothingYoung) {
    const auto segments = daily(40, 10'000'000);
    EXPECT_EQ(surplusSegments(segments, 1, usual, 0), 0U);
    // While ten segments were written the clock stood at 1970.
    auto wrong = daily(60, 10'000'000);
    for (std::size_t i = 20; i < 30; ++i) {
        wrong[i].created = static_cast<std::int64_t>(i);
    }
    EXPECT_EQ(surplusSegments(wrong, 1, usual, start + 59 * day), 19U);
    // Their events are not younger than the first segment with a date that tells.
    EXPECT_EQ(surplusSegments(wrong, 1, usual, start + 60 * day), 19U);
    EXPECT_EQ(surplusSegments(wrong, 1, usual, start + 60 * day + 1), 30U);
}

TEST(RetentionTest, AClockThatWasFarAheadStopsNothingForGood) {
    auto wrong = daily(60, 10'000'000);
    for (std::size_t i = 20; i < 30; ++i) {
        wrong[i].created += 36'500 * day;
    }
    EXPECT_EQ(surplusSegments(wrong, 1, usual, start + 59 * day), 19U);
    EXPECT_EQ(surplusSegments(wrong, 1, usual, start + 60 * day + 1), 30U);
    // One that is ahead now takes nothing of the newest events.
    EXPECT_EQ(surplusSegments(daily(60, 100'000), 1, usual, start + 36'500 * day), 50U);
}

class JournalRetentionTest : public testing::Test {
  protected:
    [[nodiscard]] std::size_t segmentCount() {
        const auto numbers = world_.folder().segments();
        EXPECT_EQ(numbers->size(), world_.journal().log()->segments().size());
        return numbers->size();
    }
    [[nodiscard]] LogView::Extent extent() { return world_.journal().log()->extent(); }

    TestJournal world_;
};

TEST_F(JournalRetentionTest, SnapshotsLeaveTheHistoryThatIsWanted) {
    world_.open();
    world_.fillSegments(2);
    world_.snapshot();
    const auto last = world_.journal().lastEvent();
    EXPECT_EQ(world_.eventsSince(0).size(), last);
    // What a start reads is what lies behind the snapshot.
    EXPECT_EQ(world_.journal().logBytes(), segmentHeaderSize);
    EXPECT_FALSE(world_.journal().wantsSnapshot());
    world_.close();
    world_.open();
    EXPECT_EQ(world_.journal().logBytes(), segmentHeaderSize);
    EXPECT_EQ(world_.eventsSince(0).size(), last);
    world_.commitOne("more");
    EXPECT_EQ(world_.eventsSince(0).size(), last + 1);
    EXPECT_EQ(extent().events, last + 1);
    EXPECT_EQ(extent().lastEventBefore, 0U);
}

TEST_F(JournalRetentionTest, AYearGoesBy) {
    world_.options.retention = {std::chrono::days(30), 500, std::uint64_t{1} << 30U};
    world_.open();
    std::size_t most = 0;
    for (int week = 0; week < 52; ++week) {
        for (int i = 0; i < 100; ++i) {
            world_.add("week " + std::to_string(week));
        }
        world_.commit();
        world_.snapshot();
        world_.now.seconds += 7 * day;
        most = std::max(most, segmentCount());
        if (week % 10 == 9) {
            world_.close();
            world_.open();
        }
    }
    EXPECT_LE(most, 9U);
    const auto first = extent().lastEventBefore;
    EXPECT_GE(first, 4000U);
    EXPECT_LE(first, 4700U);
    EXPECT_EQ(world_.eventsSince(first).size(), 5200 - first);
    EXPECT_GE(extent().events, 500U);
    // The segments that are left hold all of the last 30 days.
    EXPECT_LE(extent().created, world_.now.seconds - 30 * day);
    EXPECT_EQ(world_.journal().standingOf(EventID{first}), EventHistory::Standing::good);
    EXPECT_EQ(world_.journal().standingOf(EventID{first - 1}), EventHistory::Standing::pruned);
    EXPECT_EQ(world_.journal().standingOf(EventID{0}), EventHistory::Standing::pruned);
}

TEST_F(JournalRetentionTest, TheBoundInBytesHoldsWhileSegmentsAreRolled) {
    world_.options.retention.bytes = 30U << 20U;
    world_.open();
    for (int i = 0; i < 12; ++i) {
        world_.fillSegments(1);
        world_.snapshot();
        EXPECT_LE(extent().bytes, 30U << 20U);
    }
    EXPECT_GE(extent().bytes, 15U << 20U);
    // What the next start has to read stays, whatever the bound.
    const auto needed = world_.journal().log()->segments().back()->header.number;
    world_.fillSegments(5);
    EXPECT_GE(extent().bytes, 40U << 20U);
    EXPECT_GE(needed, world_.journal().log()->segments().front()->header.number);
}

TEST_F(JournalRetentionTest, ACursorReadsWhatItHoldsAndThenSaysWhatIsGone) {
    world_.open();
    world_.fillSegments(3);
    auto cursor = *world_.journal().eventsSince(EventID{0});
    ASSERT_EQ(raw((**cursor->next()).id), 1U);
    const auto segments = world_.journal().log()->segments();
    // Everything but the last goes.
    world_.close();
    world_.options.retention = {std::chrono::seconds(0), 0, 0};
    world_.open();
    auto tail = *world_.journal().eventsSince(EventID{world_.journal().lastEvent()});
    auto held = *world_.journal().eventsSince(EventID{0});
    ASSERT_EQ(raw((**held->next()).id), 1U);
    world_.snapshot();
    ASSERT_EQ(segmentCount(), 1U);
    // The rest of the segment that is open, and then an error that stays.
    std::uint64_t last = 1;
    auto event = held->next();
    for (; event && *event; event = held->next()) {
        ASSERT_EQ(raw((**event).id), ++last);
    }
    EXPECT_EQ(last, segments[1]->header.lastEventBefore);
    ASSERT_FALSE(event);
    EXPECT_EQ(event.error().code, ENODATA);
    EXPECT_EQ(held->next().error().code, ENODATA);
    EXPECT_EQ(world_.journal().eventsSince(EventID{0}).error().code, ENODATA);
    // At the tail nothing is lost by it.
    world_.commitOne("new");
    EXPECT_EQ(TestJournal::read(*tail).size(), 1U);
}

TEST_F(JournalRetentionTest, HistoryBeginsBehindASegmentThatIsDamagedOrMissing) {
    for (const bool missing : {false, true}) {
        TestJournal world;
        world.open();
        world.fillSegments(4);
        world.snapshot();
        const auto segments = world.journal().log()->segments();
        const auto last = world.journal().lastEvent();
        world.close();
        const std::string path = world.folder().segment(2);
        if (missing) {
            std::filesystem::remove(path);
        } else {
            std::string bytes = readFile(path);
            bytes[20] ^= 4;
            writeFile(path, bytes);
        }
        world.open();
        const std::uint64_t first = segments[2]->header.lastEventBefore;
        EXPECT_EQ(world.journal().standingOf(EventID{first - 1}), EventHistory::Standing::pruned);
        EXPECT_EQ(world.eventsSince(first).size(), last - first);
        EXPECT_EQ(world.journal().historyProblem().empty(), missing);
        EXPECT_FALSE(std::filesystem::exists(world.folder().segment(1)));
    }
}

TEST_F(JournalRetentionTest, AFullDiskGetsRoom) {
    if (!runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("only root may mount a small file system");
    }
    const TemporaryDirectory directory;
    const auto mount = ScopedMount::memory(directory.path());
    if (!mount ||
        ::mount(nullptr, directory.path().c_str(), nullptr, MS_REMOUNT, "size=48m") != 0) {
        MARROWDALE_SKIP("no tmpfs can be mounted here");
    }
    TestJournal world(directory.path());
    world.open();
    world.fillSegments(3);
    world.snapshot();
    const int filler = ::open(directory.path("filler").c_str(), O_WRONLY | O_CREAT, 0600);
    const std::string block(4096, 'f');
    while (::write(filler, block.data(), block.size()) > 0) {
    }
    ::close(filler);
    EventBatch batch;
    batch.add({.flags = 1, .path = block});
    const auto refused =
        world.journal().commit(world.index(), batch, world.journal().lastDocument());
    ASSERT_FALSE(refused);
    EXPECT_EQ(refused.error().code, ENOSPC);
    const auto last = world.journal().lastEvent();
    world.close();
    world.options.retention = {std::chrono::seconds(0), 1, 0};
    world.open();
    EXPECT_EQ(world.journal().log()->segments().size(), 1U);
    EXPECT_EQ(world.journal().lastEvent(), last);
    ASSERT_TRUE(world.journal().commit(world.index(), batch, world.journal().lastDocument()));
    EXPECT_EQ(world.eventsSince(last).size(), 1U);
}

// Nobody looks at the frames of old segments at a start. Reading them finds out.
TEST_F(JournalRetentionTest, AnOldSegmentThatWasCutIsDamageWhenItIsRead) {
    world_.open();
    world_.fillSegments(2);
    world_.snapshot();
    const auto segments = world_.journal().log()->segments();
    world_.close();
    const std::string path = world_.folder().segment(1);
    const std::string whole = readFile(path);
    SegmentReader reader = *SegmentReader::open(path, world_.uuid(), 1);
    std::vector<std::size_t> lengths{segmentHeaderSize, segmentHeaderSize + 10, whole.size() - 1};
    ASSERT_EQ(*reader.next(), SegmentReader::Step::frame);
    lengths.push_back(reader.offset());  // between two frames
    for (const std::size_t length : lengths) {
        std::filesystem::resize_file(path, length);
        world_.open();
        auto cursor = *world_.journal().eventsSince(EventID{0});
        std::uint64_t last = 0;
        auto event = cursor->next();
        for (; event && *event; event = cursor->next()) {
            ASSERT_EQ(raw((**event).id), ++last);
        }
        EXPECT_FALSE(event) << length;
        EXPECT_LT(last, segments[1]->header.lastEventBefore);
        world_.close();
        writeFile(path, whole);
    }
}

}  // namespace
}  // namespace marrowdale::native
