// The journal's events: what is committed is read again, under identifiers that only grow.

#include <atomic>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <limits>
#include <random>
#include <sys/resource.h>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/JournalTestSupport.h"
#include "platform/linux/store/StoreDamage.h"

namespace marrowdale::native {
namespace {

using Standing = EventHistory::Standing;
using testing::ElementsAre;

class JournalTest : public testing::Test {
  protected:
    [[nodiscard]] Standing standing(std::uint64_t since) {
        return world_.journal().standingOf(EventID{since});
    }
    // The names of the segments' files, oldest first.
    [[nodiscard]] std::vector<std::string> segmentFiles() const {
        std::vector<std::string> files;
        const auto numbers = world_.folder().segments();
        for (const std::uint64_t number : *numbers) {
            files.push_back(world_.folder().segment(number));
        }
        return files;
    }
    // Bytes that this process has read so far.
    [[nodiscard]] static std::uint64_t bytesRead() {
        std::ifstream in("/proc/self/io");
        std::string name;
        std::uint64_t count = 0;
        in >> name >> count;
        EXPECT_EQ(name, "rchar:");
        return count;
    }
    void addFile(const std::string& name, std::uint64_t fileID) {
        Row values{};
        values.flags = static_cast<std::uint32_t>(RowKind::file);
        values.fileID = fileID;
        ASSERT_NE(world_.index().add(rootRow, name, values), noRow);
    }
    void addRoot() {
        Row values{};
        values.flags = static_cast<std::uint32_t>(RowKind::folder);
        ASSERT_EQ(world_.index().add(noRow, {}, values), rootRow);
    }

    TestJournal world_;
};

TEST_F(JournalTest, EventsAreReadAsTheyWereCommitted) {
    world_.open();
    world_.add("folder/a", 0x1'0000, 10);
    world_.add("folder/a", 0x2'0000, 10);
    world_.add("folder", 0x14'0000, 11);
    world_.commit();
    world_.add("folder/b", 0x8'0000, 12, 0xFFFF'FFFF);
    world_.add("", 0xFFFF'FFFF, std::numeric_limits<std::uint64_t>::max(), 1);
    world_.commit();
    const std::vector<TestEvent> all{
        {1, 0x1'0000, 10, 0, "folder/a"},
        {2, 0x2'0000, 10, 0, "folder/a"},
        {3, 0x14'0000, 11, 0, "folder"},
        {4, 0x8'0000, 12, 0xFFFF'FFFF, "folder/b"},
        {5, 0xFFFF'FFFF, std::numeric_limits<std::uint64_t>::max(), 1, ""}};
    EXPECT_EQ(world_.eventsSince(0), all);
    world_.close();
    world_.open();
    for (std::uint64_t since = 0; since <= all.size(); ++since) {
        EXPECT_EQ(world_.eventsSince(since),
                  std::vector(all.begin() + static_cast<std::ptrdiff_t>(since), all.end()));
    }
}

TEST_F(JournalTest, RowsHaveNoIdentifiersOfTheirOwn) {
    world_.open();
    addRoot();
    addFile("a", 2);
    world_.commit();
    EXPECT_EQ(world_.journal().lastEvent(), 0U);
    addFile("b", 3);
    world_.commitOne("b");
    EXPECT_EQ(world_.journal().lastEvent(), 1U);
    EXPECT_EQ(world_.eventsSince(0).size(), 1U);
}

TEST_F(JournalTest, RowsThatWereTouchedAreLoadedWithTheirNewValues) {
    world_.open();
    addRoot();
    addFile("a", 2);
    addFile("b", 3);
    world_.commit();
    const RowNumber a = world_.index().child(rootRow, "a");
    Row values = world_.index().row(a);
    values.changed = -5;
    values.size = 1U << 31U;
    values.fingerprint = 99;
    values.set(Row::unsure, true);
    const auto before = world_.journal().logBytes();
    world_.index().update(a, values);
    world_.commit();
    EXPECT_EQ(world_.journal().logBytes() - before, frameHeaderSize + 36U);
    world_.index().setDocument(world_.index().child(rootRow, "b"), 77);
    world_.commit();
    world_.close();
    world_.open();
    const RowNumber again = world_.index().child(rootRow, "a");
    const Row& row = world_.index().row(again);
    EXPECT_EQ(row.changed, -5);
    EXPECT_EQ(row.size, 1U << 31U);
    EXPECT_EQ(row.fingerprint, 99U);
    EXPECT_TRUE(row.has(Row::unsure));
    EXPECT_EQ(row.fileID, 2U);
    EXPECT_EQ(world_.index().row(world_.index().child(rootRow, "b")).document, 77U);
}

// A request may give a document to a file that is gone before the next commit, attributes and all.
TEST_F(JournalTest, ARowThatWasMadeAndRemovedWithinACommitLeavesNothing) {
    world_.open();
    addRoot();
    addFile("stays", 2);
    world_.commit();
    addFile("passes", 3);
    const RowNumber passing = world_.index().child(rootRow, "passes");
    ASSERT_EQ(passing + 1, world_.index().endOfRows());
    world_.index().setAttributes(passing, {{"user.tag", "red"}});
    world_.index().remove(passing);
    const auto before = world_.journal().logBytes();
    world_.commit();
    EXPECT_EQ(world_.journal().logBytes() - before, frameHeaderSize + 8U) << "that it is removed";
    world_.close();
    world_.open();
    EXPECT_EQ(world_.index().count(), 2U);
    EXPECT_TRUE(world_.index().allAttributes().empty());
}

TEST_F(JournalTest, ARowThatIsRemovedTakesItsAttributesAlong) {
    world_.open();
    addRoot();
    addFile("goes", 2);
    world_.index().setAttributes(world_.index().child(rootRow, "goes"), {{"user.tag", "red"}});
    world_.commit();
    world_.index().remove(world_.index().child(rootRow, "goes"));
    world_.commit();
    addFile("takes its row", 3);
    world_.commit();
    world_.close();
    world_.open();
    const RowNumber row = world_.index().child(rootRow, "takes its row");
    ASSERT_NE(row, noRow);
    EXPECT_TRUE(world_.index().attributes(row).empty());
}

TEST_F(JournalTest, AFileInLimboIsLoadedWithTheFolderThatItLeft) {
    world_.open();
    addRoot();
    addFile("a", 2);
    const RowNumber row = world_.index().child(rootRow, "a");
    EXPECT_EQ(world_.index().folderLeft(row), noRow);
    world_.index().putInLimbo(row);
    world_.commit();
    world_.close();
    world_.open();
    EXPECT_EQ(world_.index().folderLeft(row), rootRow);
    EXPECT_EQ(world_.index().name(row), "a");
    ASSERT_TRUE(world_.index().place(row, rootRow, "b"));
    EXPECT_EQ(world_.index().folderLeft(row), noRow);
    EXPECT_EQ(world_.index().row(row).attributes, 0U);
}

TEST_F(JournalTest, PathsOfAnyBytesComeBack) {
    world_.open();
    std::vector<std::string> paths{"",
                                   "a",
                                   std::string("\0", 1),
                                   "a/b",
                                   "a",
                                   "ab",
                                   "\xff\xfe",
                                   "new\nline/\x1b[31m",
                                   "e\xcc\x81",
                                   "\xc3\xa9",
                                   "",
                                   "a/",
                                   std::string(4095, 'p') + "/q",
                                   std::string(4095, 'p') + "/r",
                                   std::string(longestEventPath, 'z')};
    std::mt19937 random(5);
    std::uniform_int_distribution<int> byte(0, 3);
    std::uniform_int_distribution<std::size_t> length(0, 40);
    for (int i = 0; i < 3000; ++i) {
        std::string path(length(random), 'x');
        for (char& c : path) {
            c = static_cast<char>("ab/\xff"[byte(random)]);
        }
        paths.push_back(std::move(path));
    }
    for (std::size_t i = 0; i < paths.size(); ++i) {
        world_.add(paths[i]);
        if (i % 97 == 0) {
            world_.commit();
        }
    }
    world_.commit();
    const auto events = world_.eventsSince(0);
    ASSERT_EQ(events.size(), paths.size());
    for (std::size_t i = 0; i < paths.size(); ++i) {
        ASSERT_EQ(events[i].path, paths[i]) << i;
        ASSERT_EQ(events[i].id, i + 1);
    }
}

TEST_F(JournalTest, APathThatIsTooLongTellsOfTheFolderAboveThatIsNot) {
    world_.open();
    const std::string folder = "deep/" + std::string(longestEventPath - 100, 'd');
    world_.add(folder + "/" + std::string(200, 'n'), 0x8'0000, 9, 4);
    world_.add(std::string(longestEventPath + 1, 'n'));
    world_.commit();
    EXPECT_THAT(world_.eventsSince(0), ElementsAre(TestEvent{1, 0x12'0000, 0, 4, folder},
                                                   TestEvent{2, 0x12'0000, 0, 0, ""}));
}

TEST_F(JournalTest, ACommitOfManyFramesIsReadWhole) {
    world_.open();
    const std::string rest(3000, 'r');
    for (int i = 1; i <= 2000; ++i) {
        world_.add(std::to_string(i) + rest);
    }
    world_.commit();
    for (const std::uint64_t since : {0U, 1U, 999U, 1999U, 2000U}) {
        const auto events = world_.eventsSince(since);
        ASSERT_EQ(events.size(), 2000 - since);
        for (const TestEvent& event : events) {
            ASSERT_EQ(event.path, std::to_string(event.id) + rest);
        }
    }
}

TEST_F(JournalTest, ACursorGoesOnAfterLaterCommitsAndOverSegments) {
    world_.open();
    auto cursor = *world_.journal().eventsSince(EventID{0});
    EXPECT_TRUE(TestJournal::read(*cursor).empty());
    world_.commitOne("1/");
    EXPECT_EQ(TestJournal::read(*cursor).size(), 1U);
    EXPECT_TRUE(TestJournal::read(*cursor).empty());
    world_.fillSegments(3);
    const auto events = TestJournal::read(*cursor);
    EXPECT_EQ(events.size(), world_.journal().lastEvent() - 1);
    std::uint64_t last = 1;
    for (const TestEvent& event : events) {
        ASSERT_EQ(event.id, ++last);
    }
    world_.commitOne("more");
    EXPECT_EQ(TestJournal::read(*cursor).size(), 1U);
}

// The cursor must never see half a commit, whatever the writer is doing.
TEST_F(JournalTest, ACursorReadsWhileTheJournalWrites) {
    world_.open();
    auto cursor = *world_.journal().eventsSince(EventID{0});
    std::uint64_t last = 0;
    std::uint64_t wrong = 0;
    std::atomic<bool> done = false;
    std::thread reader([&] {
        while (true) {
            const bool isLastRound = done;
            for (auto event = cursor->next(); event && *event; event = cursor->next()) {
                const std::string path((*event)->path.substr(0, (*event)->path.find('/')));
                wrong += raw((*event)->id) != ++last || path != std::to_string(last) ? 1U : 0U;
            }
            if (isLastRound) {
                return;
            }
        }
    });
    world_.fillSegments(4);
    done = true;
    reader.join();
    EXPECT_EQ(wrong, 0U);
    EXPECT_EQ(last, world_.journal().lastEvent());
}

TEST_F(JournalTest, StartingAtTheTailReadsABoundedPart) {
    world_.open();
    world_.fillSegments(1);
    world_.commitOne("tail");
    const std::uint64_t shortLast = world_.journal().lastEvent();
    const auto readFrom = [&](std::uint64_t since) {
        const std::uint64_t before = bytesRead();
        EXPECT_EQ(world_.eventsSince(since).size(), world_.journal().lastEvent() - since);
        return bytesRead() - before;
    };
    const std::uint64_t small = readFrom(shortLast - 1);
    world_.fillSegments(9);
    world_.commitOne("tail");
    EXPECT_LE(readFrom(world_.journal().lastEvent() - 1), small + (64U << 10U));
    // Nothing but the segment's header, and what counting takes itself.
    EXPECT_LE(readFrom(world_.journal().lastEvent()), 4096U);
    // From the middle of a full segment: its frames by their headers, not its 8 MiB.
    const auto segments = world_.journal().log()->segments();
    const std::uint64_t end = segments[5]->header.lastEventBefore;
    const std::uint64_t before = bytesRead();
    auto cursor = *world_.journal().eventsSince(EventID{end - 1});
    ASSERT_EQ(raw((**cursor->next()).id), end);
    EXPECT_LE(bytesRead() - before, 3U << 20U);
}

TEST_F(JournalTest, IdentifiersOfALostRunAreLost) {
    world_.open();
    world_.commitOne("first");
    world_.crash();
    world_.open();
    EXPECT_EQ(standing(0), Standing::good);
    EXPECT_EQ(standing(1), Standing::good);
    const auto gap = world_.journal().gaps().back();
    EXPECT_EQ(gap.first, 2U);
    EXPECT_EQ(standing(gap.first), Standing::lost);
    EXPECT_EQ(standing(gap.last), Standing::lost);
    EXPECT_EQ(standing(gap.last + 1), Standing::future);
    world_.commitOne("second");
    EXPECT_EQ(standing(gap.last), Standing::lost);
    EXPECT_EQ(standing(gap.last + 1), Standing::good);
    EXPECT_EQ(standing(gap.last + 2), Standing::good);
    EXPECT_EQ(standing(gap.last + 3), Standing::future);
    // The gap's record has an identifier of its own, beyond the gap.
    EXPECT_THAT(world_.eventsSince(0),
                ElementsAre(TestEvent{1, 0x1'0000, 7, 0, "first"},
                            TestEvent{gap.last + 2, 0x1'0000, 7, 0, "second"}));
    EXPECT_EQ(world_.journal().log()->extent().events, 3U);
    world_.close();
    world_.open();
    EXPECT_EQ(standing(gap.first), Standing::lost);
    EXPECT_EQ(standing(1), Standing::good);
}

TEST_F(JournalTest, IdentifiersOnlyGrowOverRuns) {
    std::uint64_t last = 0;
    for (int run = 0; run < 6; ++run) {
        world_.open();
        EXPECT_GE(world_.journal().lastEvent(), last);
        last = world_.journal().lastEvent();
        world_.commitOne("event");
        EXPECT_GT(world_.journal().lastEvent(), last);
        last = world_.journal().lastEvent();
        if (run % 2 == 0) {
            world_.close();
        } else {
            world_.crash();
        }
    }
}

TEST_F(JournalTest, ARefusedCommitGivesItsIdentifiersAgainAndNothingIsReadOfIt) {
    world_.open();
    world_.commitOne("first");
    auto cursor = *world_.journal().eventsSince(EventID{0});
    EXPECT_EQ(TestJournal::read(*cursor).size(), 1U);
    // Beyond the limit of the process, writing fails with an error; nothing else of it is touched.
    EventBatch batch;
    batch.add({{}, 0x1'0000, FileID{1}, {}, std::string(60'000, 'x')});
    const auto length = std::filesystem::file_size(segmentFiles().back());
    rlimit limit{};
    ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &limit), 0);
    const rlimit small{length + 1000, limit.rlim_max};
    const auto ignored = ::signal(SIGXFSZ, SIG_IGN);
    ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &small), 0);
    const auto refused =
        world_.journal().commit(world_.index(), batch, world_.journal().lastDocument());
    ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &limit), 0);
    ::signal(SIGXFSZ, ignored);
    ASSERT_FALSE(refused);
    EXPECT_EQ(refused.error().code, EFBIG);
    EXPECT_EQ(batch.count(), 1U);
    EXPECT_TRUE(TestJournal::read(*cursor).empty());
    EXPECT_EQ(standing(2), Standing::future);
    world_.commitOne("second");
    EXPECT_THAT(TestJournal::read(*cursor), ElementsAre(TestEvent{2, 0x1'0000, 7, 0, "second"}));
}

TEST_F(JournalTest, AnEventOfAFileThatChangedTakesLittleRoom) {
    world_.open();
    addRoot();
    std::mt19937 random(3);
    std::uniform_int_distribution<int> letter('a', 'z');
    const int count = 1000;
    for (int i = 0; i < count; ++i) {
        addFile("f" + std::to_string(i), 1'000'000 + static_cast<std::uint64_t>(i));
    }
    world_.commit();
    const auto before = world_.journal().logBytes();
    for (int i = 0; i < count; ++i) {
        std::string path(85, 'x');
        for (char& c : path) {
            c = static_cast<char>(letter(random));
        }
        const RowNumber row = world_.index().child(rootRow, "f" + std::to_string(i));
        world_.index().update(row, world_.index().row(row));
        world_.add(path, 0x2'0000, 1'000'000 + static_cast<std::uint64_t>(i));
    }
    world_.commit();
    EXPECT_LE((world_.journal().logBytes() - before) / count, 150U);
    RecordProperty("BytesAnEvent", std::to_string((world_.journal().logBytes() - before) / count));
}

// Each byte of a closed segment and of the one that is written: an error, or the right events.
TEST_F(JournalTest, DamageIsAnErrorAndNeverAWrongEvent) {
    world_.open();
    addRoot();
    for (int i = 0; i < 3; ++i) {
        world_.add("folder/a" + std::to_string(i), 0x8'0000, 5, 6);
        world_.commitOne("folder/b" + std::to_string(i));
    }
    const auto all = world_.eventsSince(0);
    ASSERT_EQ(all.size(), 6U);
    const std::string file = segmentFiles().front();
    const std::string whole = readFile(file);
    const auto check = [&](const std::string& bytes, const std::string& what) {
        writeFile(file, bytes);
        auto cursor = world_.journal().eventsSince(EventID{0});
        std::size_t good = 0;
        bool failed = !cursor;
        while (!failed) {
            const auto event = (*cursor)->next();
            if (!event) {
                EXPECT_TRUE(isDamage(event.error()) || event.error().code == EPROTO) << what;
                // It stays so.
                EXPECT_FALSE((*cursor)->next()) << what;
                failed = true;
            } else if (!*event) {
                break;
            } else {
                ASSERT_EQ(testEvent(**event), all[good++]) << what;
            }
        }
        EXPECT_TRUE(failed) << what;
    };
    for (std::size_t at = 0; at < whole.size(); ++at) {
        std::string changed = whole;
        changed[at] = static_cast<char>(changed[at] ^ (1 << (at % 8)));
        check(changed, "flipped at " + std::to_string(at));
        check(whole.substr(0, at), "cut at " + std::to_string(at));
        if (HasFatalFailure()) {
            return;
        }
    }
    writeFile(file, whole);
    EXPECT_EQ(world_.eventsSince(0), all);
}

}  // namespace
}  // namespace marrowdale::native
