#include <algorithm>

#include "providers/marrowdale/fs/FSChangesEnumeratorTestWorld.h"

namespace marrowdale {
namespace {

// What a request tells, and how it ends.
class FSChangesEnumeratorTest : public FSChangesEnumeratorTestWorld {};

INSTANTIATE_TEST_SUITE_P(OnEach, FSChangesEnumeratorTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(FSChangesEnumeratorTest, anEmptyListOfURLsEndsTheProcess) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_DEATH((void)FSChangesEnumerator::make(platform_, token_, "fid=1", {},
                                                 std::make_shared<CollectingChangeObserver>()),
                 "require at least one URL to init a change enumerator");
}

TEST_P(FSChangesEnumeratorTest, theFirstPassReadsThePathsQuietlySinceTheAnchor) {
    begin();
    EXPECT_EQ(stream()->paths, Lines{world_.root()});
    EXPECT_EQ(stream()->device, std::nullopt);
    EXPECT_EQ(stream()->since, EventID{10});
    EXPECT_EQ(world_.sink->countContaining("starting <FSEventReader"), 0U);
}

TEST_P(FSChangesEnumeratorTest, theEndOfTheFirstPassBeginsTheSecondOneAtTheAnchor) {
    begin();
    tell({doneAt(50)});
    ASSERT_EQ(passes_.streams().size(), 2U);
    EXPECT_EQ(stream()->paths, Lines{"/.docid"});
    EXPECT_NE(stream()->device, std::nullopt);
    EXPECT_EQ(stream()->since, EventID{10});
    EXPECT_EQ(logged("[DEBUG] processed all FSEvents path based, carry on with the docID based"),
              1U);
    EXPECT_EQ(world_.sink->countContaining("starting <FSEventReader"), 1U);
    EXPECT_EQ(observer_->calls(), Lines{});
}

TEST_P(FSChangesEnumeratorTest, withoutEventsItCatchesUpAtOnce) {
    token_.version = 3;
    token_.offset = 7;
    token_.appLibraryVersionToken = 5;
    begin();
    tell({doneAt(50)});
    tell({doneAt(10)});
    EXPECT_EQ(observer_->calls(), Lines{"finish"});
    EXPECT_EQ(logged("[DEBUG] fetching changes did catch up"), 1U);
    FSChangeToken expected = token_;
    expected.streamEventID = 50;
    expected.offset = 0;
    EXPECT_EQ(anchor(), expected);
}

TEST_P(FSChangesEnumeratorTest, theAnchorIsTheNewestEndOfAHistory) {
    begin();
    tell({doneAt(50)});
    tell({doneAt(60)});
    EXPECT_EQ(anchor()->streamEventID, 60U);
}

TEST_P(FSChangesEnumeratorTest, updatesAreToldOneByOneAndLogged) {
    writeFile(world_.path("a"), "");
    makeFolder(world_.path("b"));
    begin();
    tell({changed("a"), changed("b")});
    EXPECT_EQ(observer_->calls(), (Lines{"update a", "update b"}));
    const auto told = std::static_pointer_cast<const LocalItem>(observer_->updates().front());
    EXPECT_EQ(logged("[DEBUG] forward update of " + told->description()), 1U);
}

TEST_P(FSChangesEnumeratorTest, aMoveIsLoggedWithItsNewPlace) {
    writeFile(world_.path("a"), "");
    begin();
    tell({event("a", FileEventFlag::renamed, fileIDOf("a"))});
    const auto told = std::static_pointer_cast<const LocalItem>(observer_->updates().at(0));
    EXPECT_EQ(
        logged("[DEBUG] forward update of " + told->description() + " to " + world_.path("a")), 1U);
}

TEST_P(FSChangesEnumeratorTest, whatConcernsTheContainerNotIsLoggedAndDoesNotCount) {
    makeFolder(world_.path("sub"));
    writeFile(world_.path("sub/a"), "");
    begin(allDirectories);
    tell({changed("sub/a"), changed("sub")});
    EXPECT_EQ(observer_->calls(), Lines{"update sub"});
    const auto lines = world_.sink->lines();
    EXPECT_TRUE(std::ranges::any_of(lines, [](const std::string& line) {
        return line.starts_with("[DEBUG] ignore update of <LocalItem:") &&
               line.ends_with("; item is not a directory");
    }));
}

TEST_P(FSChangesEnumeratorTest, aFolderIsToldWhatLiesDirectlyInIt) {
    makeFolder(world_.path("sub/deeper"));
    writeFile(world_.path("sub/a"), "");
    writeFile(world_.path("b"), "");
    const std::string container = itemAt("sub")->itemIdentifier;
    begin(container);
    tell({changed("sub/a"), changed("sub/deeper"), changed("b"), changed("sub")});
    EXPECT_EQ(observer_->calls(), (Lines{"update a", "update deeper"}));
    EXPECT_EQ(world_.sink->countContaining("; item is not a directory of " + container), 2U);
}

TEST_P(FSChangesEnumeratorTest, deletionsOfABatchAreToldTogether) {
    begin();
    tell({gone("a", FileID{5}), gone("b", FileID{6}, 7)});
    EXPECT_EQ(observer_->calls(), Lines{"delete fid=5 fid=6 did=7"});
    EXPECT_EQ(logged("[DEBUG] forward deletion of fid=5"), 1U);
    EXPECT_EQ(logged("[DEBUG] forward deletion of did=7"), 1U);
    EXPECT_EQ(logged("[DEBUG] forward deletion of 3 items"), 1U);
    tell({gone("c", FileID{8})});
    EXPECT_EQ(observer_->calls().back(), "delete fid=8");
    EXPECT_EQ(logged("[DEBUG] forward deletion of 1 items"), 1U);
}

TEST_P(FSChangesEnumeratorTest, deletionsAreToldBeforeTheNextUpdate) {
    writeFile(world_.path("a"), "");
    begin();
    tell({gone("b", FileID{5}), changed("a"), gone("c", FileID{6})});
    EXPECT_EQ(observer_->calls(), (Lines{"delete fid=5", "update a", "delete fid=6"}));
}

TEST_P(FSChangesEnumeratorTest, deletionsAreToldBeforeEveryFinish) {
    begin();
    tell({gone("a", FileID{5}), doneAt(50)});
    tell({gone("b", FileID{6}), doneAt(10)});
    EXPECT_EQ(observer_->calls(), (Lines{"delete fid=5", "delete fid=6", "finish"}));
    begin();
    tell({gone("a", FileID{5}), streamEvent(FileEventFlag::userDropped)});
    EXPECT_EQ(observer_->calls(), (Lines{"delete fid=5", "error -1002"}));
}

TEST_P(FSChangesEnumeratorTest, allDirectoriesAreToldNoDocumentsDeletion) {
    begin(allDirectories);
    tell({gone("a", FileID{5}, 7)});
    EXPECT_EQ(observer_->calls(), Lines{"delete fid=5"});
    EXPECT_EQ(logged("[DEBUG] ignore update of did=7; item is not a directory"), 1U);
}

TEST_P(FSChangesEnumeratorTest, aDeletedLibraryIsNoneOfTheWorkingSets) {
    begin(workingSet);
    passes_.queue->sync([&] {
        enumerator_->fsEventReaderDidDeleteItem("#org.example", "/a", gone("a", FileID{5}));
    });
    endHistory();
    EXPECT_EQ(observer_->calls(), Lines{"finish"});
    EXPECT_EQ(logged("[DEBUG] ignore update of #org.example; app library are not indexed"), 1U);
}

TEST_P(FSChangesEnumeratorTest, aDeletedLibraryMakesTheHostAskTheRootAgain) {
    begin(root);
    passes_.queue->sync([&] {
        enumerator_->fsEventReaderDidDeleteItem("#org.example", "/a", gone("a", FileID{5}));
        EXPECT_EQ(world_.manager.signalled(), Lines{});
    });
    passes_.queue->sync([] {});
    EXPECT_EQ(world_.manager.signalled(), Lines{std::string(root)});
    endHistory();
    EXPECT_EQ(observer_->calls(), Lines{"finish"});
}

TEST_P(FSChangesEnumeratorTest, the199thChangeDoesNotEndTheRequest) {
    begin();
    tell(deletions(1000, 199));
    EXPECT_EQ(observer_->finishes(), 0U);
    endHistory();
    EXPECT_EQ(observer_->calls().back(), "finish");
    EXPECT_EQ(observer_->deletions().size(), 199U);
}

TEST_P(FSChangesEnumeratorTest, the200thChangeEndsTheRequestAndThe201stIsLeftForTheNext) {
    begin();
    const auto events = deletions(1000, 201);
    tell(events);
    EXPECT_EQ(observer_->deletions().size(), 200U);
    EXPECT_EQ(observer_->calls().back(), "finish, more");
    FSChangeToken expected = token_;
    expected.streamEventID = raw(events[199].id);
    EXPECT_EQ(anchor(), expected);
}

TEST_P(FSChangesEnumeratorTest, updatesAndDeletionsCountTogether) {
    writeFile(world_.path("a"), "");
    begin();
    tell(deletions(1000, 199));
    tell({changed("a"), gone("b", FileID{5})});
    EXPECT_EQ(observer_->calls().back(), "finish, more");
    EXPECT_EQ(observer_->updates().size(), 1U);
    EXPECT_EQ(observer_->deletions().size(), 199U);
}

TEST_P(FSChangesEnumeratorTest, aThousandChangesTakeFiveFullRequestsAndALastOne) {
    passes_.pathHistory = deletions(1000, 1000);
    passes_.pathHistory.push_back(done());
    passes_.documentHistory = {doneAt(10)};
    const auto all = passes_.pathHistory;
    std::vector<std::string> told;
    begin();
    for (int request = 0; request < 5; ++request) {
        ASSERT_TRUE(observer_->waitForFinish());
        ASSERT_EQ(observer_->calls().back(), "finish, more");
        ASSERT_EQ(observer_->deletions().size(), 200U);
        const auto batch = observer_->deletions();
        told.insert(told.end(), batch.begin(), batch.end());
        const auto since = anchor()->streamEventID;
        passes_.pathHistory.clear();
        std::ranges::copy_if(all, std::back_inserter(passes_.pathHistory),
                             [&](const FileEvent& event) { return raw(event.id) > since; });
        goOn();
    }
    EXPECT_EQ(observer_->calls(), Lines{"finish"});
    ASSERT_EQ(told.size(), 1000U);
    for (std::size_t i = 0; i < told.size(); ++i) {
        EXPECT_EQ(told[i], "fid=" + std::to_string(1000 + i));
    }
}

TEST_P(FSChangesEnumeratorTest, anEventOfWhichHalfWasToldIsToldAgain) {
    begin();
    auto events = deletions(1000, 199);
    const EventID before = events.back().id;
    events.push_back(gone("b", FileID{5}, 7));
    tell(events);
    EXPECT_EQ(observer_->deletions().back(), "fid=5");
    EXPECT_EQ(anchor()->streamEventID, raw(before));
}

TEST_P(FSChangesEnumeratorTest, anEventWhoseSecondHalfIsThe200thIsNotToldAgain) {
    begin();
    auto events = deletions(1000, 198);
    events.push_back(gone("b", FileID{5}, 7));
    tell(events);
    EXPECT_EQ(observer_->deletions().back(), "did=7");
    EXPECT_EQ(anchor()->streamEventID, raw(events.back().id));
}

TEST_P(FSChangesEnumeratorTest, aChangeWhoseDocumentMayBeGoneTooIsToldAgain) {
    writeFile(world_.path("a"), "");
    begin();
    auto events = deletions(1000, 199);
    const EventID before = events.back().id;
    events.push_back(event("a", FileEventFlag::gone, fileIDOf("a")));
    events.back().goneDocument = DocumentID{7};
    tell(events);
    EXPECT_EQ(observer_->calls().back(), "finish, more");
    EXPECT_EQ(anchor()->streamEventID, raw(before));
}

TEST_P(FSChangesEnumeratorTest, lostEventsExpireTheAnchorInEitherPass) {
    for (const auto flag : {FileEventFlag::userDropped, FileEventFlag::kernelDropped,
                            FileEventFlag::eventIDsWrapped}) {
        for (const bool inSecondPass : {false, true}) {
            world_.sink->clear();
            begin();
            if (inSecondPass) {
                tell({doneAt(50)});
            }
            tell({streamEvent(flag), gone("a", FileID{5}), done()});
            EXPECT_EQ(observer_->calls(), Lines{"error -1002"}) << flag;
            EXPECT_EQ(observer_->error(), errorSyncAnchorExpired());
            EXPECT_EQ(logged("[DEBUG] fetching changes did finish after reset"), 1U);
            EXPECT_EQ(logged("[DEBUG] fetching changes did catch up"), 0U);
        }
    }
}

TEST_P(FSChangesEnumeratorTest, aDroppedConditionThatEndsTheHistoryTooIsOneFinish) {
    begin();
    tell({streamEvent(FileEventFlag::kernelDropped | FileEventFlag::historyDone)});
    EXPECT_EQ(observer_->calls(), Lines{"error -1002"});
    EXPECT_EQ(passes_.streams().size(), 1U);
}

TEST_P(FSChangesEnumeratorTest, whatTheFirstPassStillTellsIsIgnored) {
    begin();
    const auto first = stream();
    std::vector<FileEvent> batch{doneAt(50), gone("a", FileID{5}),
                                 streamEvent(FileEventFlag::userDropped)};
    tell(batch);
    first->tell({gone("b", FileID{6}), done()});
    tell({doneAt(10)});
    EXPECT_EQ(observer_->calls(), Lines{"finish"});
    EXPECT_EQ(anchor()->streamEventID, 50U);
}

TEST_P(FSChangesEnumeratorTest, theSecondPassTellsTheDocumentsThatMoved) {
    writeFile(world_.path("a"), "");
    const auto item = itemAt("a");
    begin();
    tell({doneAt(50)});
    FileEvent moved = event("", FileEventFlag::documentMoved);
    moved.path = "/.docid/1/changed/" + std::to_string(*item->docID) + "/src=1,dst=2";
    tell({moved});
    EXPECT_EQ(observer_->calls(), Lines{"update a"});
    tell({doneAt(10)});
    EXPECT_EQ(observer_->calls().back(), "finish");
}

TEST_P(FSChangesEnumeratorTest, aFullSecondPassDoesNotPassWhatTheFirstHasSeen) {
    begin();
    tell({doneAt(15)});
    auto events = deletions(1000, 200);
    for (FileEvent& event : events) {
        event.id = EventID{raw(event.id) + 100};
    }
    tell(events);
    EXPECT_EQ(observer_->calls().back(), "finish, more");
    EXPECT_EQ(anchor()->streamEventID, 15U);
}

TEST_P(FSChangesEnumeratorTest, aFullSecondPassGoesOnBehindTheEventThatFilledIt) {
    begin();
    auto events = deletions(1000, 200);
    tell({doneAt(5000)});
    tell(events);
    EXPECT_EQ(anchor()->streamEventID, raw(events.back().id));
}

}  // namespace
}  // namespace marrowdale
