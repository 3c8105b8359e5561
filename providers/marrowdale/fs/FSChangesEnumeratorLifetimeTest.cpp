#include <thread>

#include "platform/foundation/Semaphore.h"
#include "providers/marrowdale/fs/FSChangesEnumeratorTestWorld.h"

namespace marrowdale {
namespace {

// Who lives how long, and what is heard meanwhile.
class FSChangesEnumeratorLifetimeTest : public FSChangesEnumeratorTestWorld {
  protected:
    // Every stream that was made ended as a stream should.
    void expectStreamsGone(std::size_t count) {
        const auto streams = passes_.streams();
        ASSERT_EQ(streams.size(), count);
        for (const auto& stream : streams) {
            EXPECT_EQ(stream->calls(), (Lines{"start", "stop", "invalidate", "release"}));
        }
    }
};

INSTANTIATE_TEST_SUITE_P(OnEach, FSChangesEnumeratorLifetimeTest,
                         ::testing::ValuesIn(testFileSystems()), testFileSystemName);

TEST_P(FSChangesEnumeratorLifetimeTest, nothingIsKeptBehindTheFinish) {
    begin();
    const std::weak_ptr<CollectingChangeObserver> observer = observer_;
    const std::weak_ptr<FSChangesEnumerator> enumerator = enumerator_;
    endHistory();
    EXPECT_EQ(observer_.use_count(), 1);
    observer_.reset();
    enumerator_.reset();
    settle();
    EXPECT_TRUE(observer.expired());
    EXPECT_TRUE(enumerator.expired());
    expectStreamsGone(2);
    EXPECT_EQ(world_.sink->countContaining("stream deleted without being stopped"), 0U);
}

TEST_P(FSChangesEnumeratorLifetimeTest, theReaderIsStoppedOutsideItsOwnCallback) {
    Lines duringFinish;
    within_ = [&](const std::string& line) {
        if (line.starts_with("finish")) {
            duringFinish = passes_.streams().front()->calls();
        }
    };
    begin();
    tell(deletions(1000, 200));
    EXPECT_EQ(duringFinish, Lines{"start"});
    settle();
    expectStreamsGone(1);
}

TEST_P(FSChangesEnumeratorLifetimeTest, aRequestThatIsStoppedEndsWithoutAWord) {
    begin();
    const auto first = stream();
    tell({gone("a", FileID{5})});
    enumerator_->stop();
    EXPECT_EQ(observer_.use_count(), 1);
    first->tell({gone("b", FileID{6}), done()});
    settle();
    EXPECT_EQ(observer_->calls(), Lines{"delete fid=5"});
    expectStreamsGone(1);
}

TEST_P(FSChangesEnumeratorLifetimeTest, queuedDeletionsOfAStoppedRequestAreNotTold) {
    begin();
    passes_.queue->sync([&] {
        enumerator_->fsEventReaderDidDeleteItem("fid=5", "/a", gone("a", FileID{5}));
        enumerator_->stop();
    });
    settle();
    EXPECT_EQ(observer_->calls(), Lines{});
}

TEST_P(FSChangesEnumeratorLifetimeTest, aRequestThatWasStoppedIsNotStarted) {
    observer_ = std::make_shared<CollectingChangeObserver>();
    enumerator_ = FSChangesEnumerator::make(platform_, token_, "fid=1",
                                            {world_.manager.documentStorageURL()}, observer_);
    enumerator_->stop();
    enumerator_->start();
    EXPECT_TRUE(passes_.streams().empty());
    EXPECT_EQ(observer_.use_count(), 1);
}

TEST_P(FSChangesEnumeratorLifetimeTest, anObserverMayStopTheRequestInEachOfItsCalls) {
    writeFile(world_.path("a"), "");
    for (const std::string_view call : {"update", "delete", "finish", "error"}) {
        within_ = [&](const std::string& line) {
            if (line.starts_with(call)) {
                enumerator_->stop();
            }
        };
        begin();
        const auto first = stream();
        first->tell({changed("a"), gone("b", FileID{5})});
        first->tell(call == "error" ? std::vector{streamEvent(FileEventFlag::userDropped)}
                                    : std::vector{doneAt(500)});
        stream()->tell({doneAt(10), done()});
        const auto calls = observer_->calls();
        ASSERT_FALSE(calls.empty());
        EXPECT_TRUE(calls.back().starts_with(call)) << calls.back();
        settle();
    }
}

TEST_P(FSChangesEnumeratorLifetimeTest, anObserverMayLetGoOfTheEnumeratorInEachOfItsCalls) {
    writeFile(world_.path("a"), "");
    for (const std::string_view call : {"update", "delete", "finish", "error"}) {
        std::weak_ptr<FSChangesEnumerator> weak;
        within_ = [&](const std::string& line) {
            if (line.starts_with(call)) {
                enumerator_.reset();
            }
        };
        begin();
        weak = enumerator_;
        const auto first = stream();
        first->tell({changed("a"), gone("b", FileID{5})});
        first->tell(call == "error" ? std::vector{streamEvent(FileEventFlag::userDropped)}
                                    : std::vector{doneAt(500)});
        stream()->tell({doneAt(10), done()});
        settle();
        EXPECT_TRUE(weak.expired());
        EXPECT_LE(observer_->finishes(), 1U);
        EXPECT_EQ(observer_.use_count(), 1);
    }
    EXPECT_EQ(world_.sink->countContaining("stream deleted without being stopped"), 0U);
}

TEST_P(FSChangesEnumeratorLifetimeTest, stoppingFromOutsideWhileEventsComeIsSafe) {
    for (int round = 0; round < 50; ++round) {
        begin();
        const auto first = stream();
        std::thread teller([&] {
            for (int i = 0; i < 20; ++i) {
                first->hand({gone("a", FileID{5}), gone("b", FileID{6})});
            }
            first->hand({doneAt(500)});
        });
        enumerator_->stop();
        const auto heard = observer_->calls().size();
        teller.join();
        settle();
        // But for the one that was just about to be made.
        EXPECT_LE(observer_->calls().size(), heard + 1);
        EXPECT_EQ(observer_.use_count(), 1);
    }
}

TEST_P(FSChangesEnumeratorLifetimeTest, whatWasRetiredIsWaitedForWithItsThread) {
    Semaphore entered;
    Semaphore leave;
    within_ = [&](const std::string&) {
        entered.signal();
        leave.wait();
    };
    begin();
    stream()->hand({gone("a", FileID{5})});
    entered.wait();
    enumerator_->stop();
    enumerator_.reset();
    passes_.queue.reset();
    std::atomic<bool> isGone = false;
    std::thread waiter([&] {
        FSRetiredReaders::of(platform_).waitUntilGone();
        isGone = true;
    });
    EXPECT_FALSE(isGone);
    leave.signal();
    waiter.join();
    EXPECT_EQ(observer_.use_count(), 1);
    expectStreamsGone(1);
}

}  // namespace
}  // namespace marrowdale
