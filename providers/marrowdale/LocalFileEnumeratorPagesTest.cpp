#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <set>

#include "platform/linux/files/EntryStatus.h"
#include "providers/marrowdale/LocalFileEnumeratorTestWorld.h"

namespace marrowdale {
namespace {

// How a listing is divided into pages, and when the next one is refused.
class LocalFileEnumeratorPagesTest : public LocalFileEnumeratorTestWorld {
  protected:
    // Every page, each from a fresh enumerator.
    std::vector<CollectingObserver> allPages() {
        std::vector<CollectingObserver> pages{page(byName)};
        while (pages.back().nextPage) {
            pages.push_back(page(*pages.back().nextPage));
        }
        return pages;
    }
    static FSChangeToken tokenOf(const Data& data) { return *FSChangeToken::decode(data); }
};

INSTANTIATE_TEST_SUITE_P(OnEach, LocalFileEnumeratorPagesTest,
                         ::testing::ValuesIn(testFileSystems()), testFileSystemName);

TEST_P(LocalFileEnumeratorPagesTest, exactly200EntriesYieldAFullPageAndThenAnEmptyOne) {
    makeFiles("f", 200);
    const auto pages = allPages();
    ASSERT_EQ(pages.size(), 2U);
    EXPECT_EQ(pages[0].pageItems.size(), 200U);
    EXPECT_EQ(pages[1].batches, 1);
    EXPECT_TRUE(pages[1].pageItems.empty());
    EXPECT_EQ(world_.sink->count("[DEBUG] gather phase finished for " + world_.root()), 1U);
}

TEST_P(LocalFileEnumeratorPagesTest, everyEntryComesOnceWhateverTheNumberOfPages) {
    makeFiles("f", 650);
    std::set<std::string> names;
    const auto pages = allPages();
    EXPECT_EQ(pages.size(), 4U);
    for (const auto& one : pages) {
        for (const auto& item : one.pageItems) {
            EXPECT_TRUE(names.insert(item->filename).second) << item->filename;
        }
    }
    EXPECT_EQ(names.size(), 650U);
}

TEST_P(LocalFileEnumeratorPagesTest, aPageWhoseCursorIsGoneIsFoundByItsOffset) {
    makeFiles("f", 450);
    const auto first = page(byName);
    const auto second = page(*first.nextPage);
    auto& cursors = world_.shared.get<FSWalkCursors>("marrowdale.walk-cursors");
    for (std::uint64_t other = 0; other < FSWalkCursors::capacity; ++other) {
        cursors.remember(
            {.deviceUUID = {}, .streamEventID = 0, .offset = other, .container = {}, .roots = {}},
            {});
    }
    const auto again = page(*first.nextPage);
    EXPECT_EQ(again.filenames(), second.filenames());
    EXPECT_EQ(again.nextPage, second.nextPage);
}

TEST_P(LocalFileEnumeratorPagesTest, aPageThatIsAskedForTwiceIsTheSameTwice) {
    makeFiles("f", 300);
    const auto first = page(byName);
    EXPECT_EQ(page(*first.nextPage).filenames(), page(*first.nextPage).filenames());
}

TEST_P(LocalFileEnumeratorPagesTest, aPageOfExactly48BytesIsExpiredWithoutBeingDecoded) {
    const auto observer = page(Data(Bytes(48, 'x')));
    EXPECT_EQ(observer.error, errorSyncAnchorExpired());
    EXPECT_EQ(observer.batches, 0);
    EXPECT_EQ(world_.sink->lines(),
              Names{"[ERROR] can't create change token from anchor data, resetting"});
}

TEST_P(LocalFileEnumeratorPagesTest, anUndecodablePageIsExpired) {
    for (const Data& data : {Data(), Data::fromText("garbage")}) {
        const auto observer = page(data);
        EXPECT_EQ(observer.error, errorSyncAnchorExpired());
    }
    EXPECT_EQ(world_.sink->count("[ERROR] can't create change token from anchor data, resetting"),
              2U);
}

TEST_P(LocalFileEnumeratorPagesTest, aTokenFromAnotherVolumeIsExpired) {
    makeFiles("f", 200);
    FSChangeToken token = tokenOf(*page(byName).nextPage);
    const UUID current = token.deviceUUID;
    token.deviceUUID = *UUID::fromText("00000000-0000-4000-8000-000000000000");
    const auto observer = page(token.encode());
    EXPECT_EQ(observer.error, errorSyncAnchorExpired());
    EXPECT_EQ(world_.sink->count("[DEBUG] device UUID changed (" + token.deviceUUID.text() +
                                 " -> " + current.text() + ")"),
              1U);
    EXPECT_TRUE(events_.script.streams().empty());
}

TEST_P(LocalFileEnumeratorPagesTest, eachPageCarriesTheEventThatWasNewestWhenItBegan) {
    makeFiles("f", 650);
    events_.script.eventID = EventID{40};
    const auto first = page(byName);
    const FSChangeToken start = tokenOf(*first.nextPage);
    EXPECT_EQ(start, (FSChangeToken{.version = 0,
                                    .deviceUUID = *world_.store->volumeUUID(world_.url("")),
                                    .streamEventID = 40,
                                    .offset = 200,
                                    .appLibraryVersionToken = 0}));
    EXPECT_TRUE(events_.script.streams().empty());
    events_.script.eventID = EventID{50};
    const auto second = page(*first.nextPage);
    FSChangeToken expected = start;
    expected.streamEventID = 50;
    expected.offset = 400;
    EXPECT_EQ(tokenOf(*second.nextPage), expected);
    events_.script.eventID = EventID{60};
    EXPECT_EQ(tokenOf(*page(*second.nextPage).nextPage).streamEventID, 60U);
    const auto streams = events_.script.streams();
    ASSERT_EQ(streams.size(), 2U);
    EXPECT_EQ(streams[0]->since, EventID{40});
    EXPECT_EQ(streams[0]->paths, Names{world_.root()});
    EXPECT_EQ(streams[1]->since, EventID{50});
    EXPECT_EQ(world_.sink->count("[DEBUG] start gather phase"), 1U);
    EXPECT_EQ(world_.sink->count("[DEBUG] resume gather phase at offset 200"), 1U);
    EXPECT_EQ(world_.sink->count("[DEBUG] resume gather phase at offset 400"), 1U);
    EXPECT_EQ(world_.sink->count("[DEBUG] safe to resume gather phase from 50"), 1U);
    EXPECT_EQ(world_.sink->count("[DEBUG] safe to resume gather phase from 60"), 1U);
    EXPECT_EQ(world_.sink->count("[DEBUG] discovered 200 items"), 3U);
}

TEST_P(LocalFileEnumeratorPagesTest, aPageFromBeforeADeletionIsExpired) {
    makeFiles("f", 300);
    const auto first = page(byName);
    std::filesystem::remove(world_.path("f7"));
    events_.script.history.insert(events_.script.history.begin(), {{.id = EventID{2},
                                                                    .flags = FileEventFlag::gone,
                                                                    .path = world_.path("f7"),
                                                                    .fileID = FileID{5},
                                                                    .goneDocument = {}}});
    const auto observer = page(*first.nextPage);
    EXPECT_EQ(observer.error, errorSyncAnchorExpired());
    EXPECT_EQ(observer.batches, 0);
    EXPECT_EQ(world_.sink->count("[DEBUG] deletion of " + world_.path("f7") +
                                 " requires to re-gather from scratch"),
              1U);
    EXPECT_EQ(page(byName).pageItems.size(), 200U);
}

TEST_P(LocalFileEnumeratorPagesTest, aPageWhoseEventsAreLostIsExpired) {
    makeFiles("f", 300);
    const auto first = page(byName);
    std::size_t times = 0;
    for (const std::uint32_t lost : {FileEventFlag::userDropped, FileEventFlag::kernelDropped,
                                     FileEventFlag::eventIDsWrapped}) {
        events_.script.history = FakeFileEventService::emptyHistory();
        events_.script.history.insert(
            events_.script.history.begin(),
            {{.id = EventID{2}, .flags = lost, .path = {}, .fileID = {}, .goneDocument = {}}});
        const auto observer = page(*first.nextPage);
        EXPECT_EQ(observer.error, errorSyncAnchorExpired());
        EXPECT_EQ(observer.batches, 0);
        EXPECT_EQ(world_.sink->count("[DEBUG] can't replay historical FSEvents, need to re-start "
                                     "gather phase from scratch"),
                  ++times);
    }
    EXPECT_EQ(world_.sink->countContaining("safe to resume"), 0U);
}

TEST_P(LocalFileEnumeratorPagesTest, aChangeSinceThePageDoesNotExpireIt) {
    makeFiles("f", 300);
    const auto first = page(byName);
    writeFile(world_.path("f7"), "changed");
    events_.script.history.insert(events_.script.history.begin(), {{.id = EventID{2},
                                                                    .flags = FileEventFlag::changed,
                                                                    .path = world_.path("f7"),
                                                                    .fileID = {},
                                                                    .goneDocument = {}}});
    EXPECT_EQ(page(*first.nextPage).pageItems.size(), 100U);
}

TEST_P(LocalFileEnumeratorPagesTest, aCheckThatCannotBeMadeEndsThePageWithTheError) {
    makeFiles("f", 300);
    const auto first = page(byName);
    events_.script.eventIDError = errorWithPOSIXCode(EIO);
    const auto observer = page(*first.nextPage);
    EXPECT_EQ(observer.error, errorWithPOSIXCode(EIO));
    EXPECT_EQ(observer.batches, 0);
}

// The walk was left under the event of the page before, and is found although the next page has a
// newer one.
TEST_P(LocalFileEnumeratorPagesTest, aPageGoesOnWhereTheWalkWasLeft) {
    makeFiles("f", 450);
    std::vector<std::size_t> depths;
    world_.fileSystem.enumerateFault = [&](const DirectoryEnumerationRequest& request) {
        depths.push_back(request.position.levels.size());
        return std::optional<Error>();
    };
    const auto first = page(byName);
    events_.script.eventID = EventID{50};
    const auto second = page(*first.nextPage);
    events_.script.eventID = EventID{60};
    const auto third = page(*second.nextPage);
    EXPECT_EQ(depths, (std::vector<std::size_t>{0, 1, 1}));
    EXPECT_EQ(third.pageItems.size(), 50U);
}

TEST_P(LocalFileEnumeratorPagesTest, theSameEnumeratorKeepsTheWalkOpen) {
    makeFiles("f", 450);
    // A folder that was changed just now is read again.
    const Date changed = native::statTarget(AT_FDCWD, world_.root().c_str())->changed;
    ASSERT_TRUE(waitUntil([&] { return native::isSettled(changed, Date::now()); }));
    int walks = 0;
    world_.fileSystem.enumerateFault = [&](const DirectoryEnumerationRequest&) {
        ++walks;
        return std::optional<Error>();
    };
    LocalFileEnumerator kept = enumerator();
    std::set<std::string> names;
    std::optional<Data> next = byName;
    for (std::uint64_t event = 50; next; event += 10) {
        events_.script.eventID = EventID{event};
        CollectingObserver observer;
        kept.enumerateItemsForObserver(observer, *next);
        for (const auto& item : observer.pageItems) {
            EXPECT_TRUE(names.insert(item->filename).second) << item->filename;
        }
        next = observer.nextPage;
    }
    EXPECT_EQ(names.size(), 450U);
    EXPECT_EQ(walks, 1);
}

TEST_P(LocalFileEnumeratorPagesTest, anOffsetPastTheEndEndsTheListing) {
    makeFiles("f", 3);
    const FSChangeToken token{.deviceUUID = *world_.store->volumeUUID(world_.url("")),
                              .offset = ~std::uint64_t{0} - 100};
    const auto observer = page(token.encode());
    EXPECT_TRUE(observer.pageItems.empty());
    EXPECT_EQ(observer.nextPage, std::nullopt);
    EXPECT_EQ(observer.error, std::nullopt);
}

TEST_P(LocalFileEnumeratorPagesTest, aURLThatCannotBecomeAnItemIsDroppedAndCounts) {
    makeFiles("f", 199);
    std::filesystem::create_symlink("nowhere", world_.path("link"));
    const auto first = page(byName);
    EXPECT_EQ(first.pageItems.size(), 199U);
    ASSERT_TRUE(first.nextPage);
    EXPECT_EQ(tokenOf(*first.nextPage).offset, 200U);
}

}  // namespace
}  // namespace marrowdale
