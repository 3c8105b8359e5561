#include <atomic>
#include <chrono>

#include "platform/foundation/Semaphore.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/apps/AppRefresh.h"
#include "providers/marrowdale/apps/AppsTestWorld.h"

namespace marrowdale {
namespace {

const std::string root(VantrelRootContainerItemIdentifier);
const std::string workingSet(VantrelWorkingSetContainerItemIdentifier);

class AppRefreshTest : public AppsTestWorld {
  protected:
    ~AppRefreshTest() override {
        if (refresh_) {
            refresh_->end();
        }
    }
    void begin() { refresh_ = AppRefresh::begin(world_.platform); }
    // Requests a refresh and waits for it.
    void refreshNow() {
        const int before = refreshes_;
        refresh_->request([this] { ++refreshes_; });
        EXPECT_TRUE(waitUntil([&] { return refreshes_ > before; }));
    }
    std::size_t events() const { return countContaining(" pacer event"); }

    // Handlers are called until the end, so what they touch lives longer.
    std::atomic<int> refreshes_ = 0;
    std::atomic<int> calls_ = 0;
    std::atomic<int> laterCalls_ = 0;
    std::atomic<bool> ended_ = false;
    std::shared_ptr<AppRefresh> refresh_;
};

TEST_F(AppRefreshTest, aRefreshRunsShortlyAfterTheStart) {
    add("A");
    begin();
    EXPECT_TRUE(waitUntil([&] { return world_.manager.signalled().size() == 2; }));
    EXPECT_EQ(world_.manager.signalled(), (Lines{root, workingSet}));
    EXPECT_EQ(count("[INFO] notify changes on VantrelRootContainerItemIdentifier"), 1U);
    EXPECT_EQ(count("[INFO] notify changes on VantrelWorkingSetContainerItemIdentifier"), 1U);
    EXPECT_EQ(count("[DEBUG] auto-upgrading shared app library manager"), 1U);
    EXPECT_EQ(LocalAppLibraryManager::shared(world_.platform).versionToken(), 1U);
}

TEST_F(AppRefreshTest, aRefreshThatFindsTheSameSignalsNothing) {
    begin();
    refresh_->request([this] { ++calls_; });
    EXPECT_TRUE(waitUntil([&] { return calls_ > 0; }));
    EXPECT_TRUE(world_.manager.signalled().empty());
}

TEST_F(AppRefreshTest, onlyTheManagerMovedSignalsTheWorkingSetAlone) {
    add("A");
    ASSERT_EQ(refresh(), Changed::yes);  // as an earlier process left it
    begin();
    EXPECT_TRUE(waitUntil([&] { return !world_.manager.signalled().empty(); }));
    refresh_->request([this] { ++calls_; });
    EXPECT_TRUE(waitUntil([&] { return calls_ > 0; }));
    EXPECT_EQ(world_.manager.signalled(), Lines{workingSet});
}

TEST_F(AppRefreshTest, tenRequestsAtOnceAreOneOrTwoRefreshesAndALaterOneCallsAllAgain) {
    begin();
    for (int i = 0; i < 10; ++i) {
        refresh_->request([this] { ++calls_; });
    }
    EXPECT_TRUE(waitUntil([&] { return calls_ >= 10; }));
    EXPECT_LE(events(), 2U);
    refresh_->request([this] { ++laterCalls_; });
    EXPECT_TRUE(waitUntil([&] { return laterCalls_ > 0; }));
    EXPECT_GE(calls_, 20);
    EXPECT_EQ(calls_ % 10, 0);
}

TEST_F(AppRefreshTest, refreshesBeginHalfASecondApartAtLeast) {
    const auto start = std::chrono::steady_clock::now();
    begin();
    for (int i = 0; i < 3; ++i) {
        refreshNow();
    }
    const auto seen = std::chrono::steady_clock::now() - start;
    const auto apart = static_cast<std::int64_t>(events()) - 1;
    EXPECT_GE(apart, 2);
    EXPECT_GE(seen, apart * std::chrono::milliseconds(500));
}

TEST_F(AppRefreshTest, itsQueueAndItsPacerAreNamed) {
    begin();
    EXPECT_EQ(refresh_->queue().label(), "marrowdale.app-refresh.queue");
    EXPECT_EQ(refresh_->pacerName(), "marrowdale.app-refresh.pacer");
    std::atomic<bool> isOnQueue = false;
    std::atomic<int> called = 0;
    refresh_->request([&] {
        isOnQueue = refresh_->queue().isCurrent();
        ++called;
    });
    EXPECT_TRUE(waitUntil([&] { return called > 0; }));
    EXPECT_TRUE(isOnQueue);
    refresh_->end();  // the handler refers to this test
}

TEST_F(AppRefreshTest, handlersAreCalledInTheOrderOfTheirRequestsBeforeAnySignal) {
    begin();
    refreshNow();
    std::vector<std::string> order;  // touched on the refresh's queue
    std::atomic<bool> done = false;
    add("A");
    for (const char* name : {"first", "second", "third"}) {
        refresh_->request([&, name] {
            if (!done) {
                EXPECT_TRUE(world_.manager.signalled().empty());
                order.emplace_back(name);
                done = order.size() == 3;
            }
        });
    }
    EXPECT_TRUE(waitUntil([&] { return world_.manager.signalled().size() == 2; }));
    EXPECT_EQ(order, (Lines{"first", "second", "third"}));
    refresh_->end();  // handlers refer to this test
}

TEST_F(AppRefreshTest, nothingBeginsAfterTheEnd) {
    begin();
    refreshNow();
    refresh_->end();
    const std::size_t before = events();
    refresh_->request([this] { ++calls_; });
    refresh_->end();
    EXPECT_EQ(calls_, 0);
    EXPECT_EQ(events(), before);
}

TEST_F(AppRefreshTest, anEmptyHandlerOnlyAsks) {
    begin();
    refreshNow();
    const std::size_t before = events();
    refresh_->request({});
    EXPECT_TRUE(waitUntil([&] { return events() > before; }));
}

TEST_F(AppRefreshTest, aHandlerMayEndIt) {
    begin();
    refresh_->request([this] {
        refresh_->end();
        ended_ = true;
    });
    EXPECT_TRUE(waitUntil([&] { return ended_.load(); }));
}

}  // namespace
}  // namespace marrowdale
