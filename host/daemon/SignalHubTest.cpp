#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/SignalHub.h"
#include "platform/foundation/Semaphore.h"

namespace marrowdale::host {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using Clock = std::chrono::steady_clock;

// Remembers what it heard.
class Listener {
  public:
    [[nodiscard]] SignalTaker taker() {
        return [this](std::string_view container) {
            {
                const MutexLock lock(mutex_);
                heard_.emplace_back(container);
            }
            heardOne_.signal();
        };
    }
    [[nodiscard]] bool waitForOne() { return heardOne_.waitUntil(Clock::now() + seconds(30)); }
    [[nodiscard]] std::vector<std::string> heard() {
        const MutexLock lock(mutex_);
        return heard_;
    }

  private:
    Mutex mutex_;
    std::vector<std::string> heard_ MARROWDALE_GUARDED_BY(mutex_);
    Semaphore heardOne_;
};

TEST(SignalHubTest, everySubscriberHearsASignal) {
    Listener first;
    Listener second;
    SignalHub hub;
    const auto one = hub.subscribe(first.taker());
    const auto two = hub.subscribe(second.taker());
    hub.signal("root");
    ASSERT_TRUE(first.waitForOne());
    ASSERT_TRUE(second.waitForOne());
    EXPECT_THAT(first.heard(), ::testing::ElementsAre("root"));
}

TEST(SignalHubTest, aStormBecomesTheFirstSignalAndOneAtTheEndOfThePause) {
    Listener listener;
    SignalHub hub(milliseconds(200));
    const auto subscription = hub.subscribe(listener.taker());
    hub.signal("root");
    ASSERT_TRUE(listener.waitForOne());
    const auto begun = Clock::now();
    for (int i = 0; i < 1000; ++i) {
        hub.signal("root");
    }
    ASSERT_TRUE(listener.waitForOne());
    EXPECT_GE(Clock::now() - begun, milliseconds(100));
    EXPECT_THAT(listener.heard(), ::testing::ElementsAre("root", "root"));
}

TEST(SignalHubTest, oneContainerDoesNotWaitForAnothersPause) {
    Listener listener;
    SignalHub hub(seconds(3600));
    const auto subscription = hub.subscribe(listener.taker());
    hub.signal("root");
    ASSERT_TRUE(listener.waitForOne());
    hub.signal("working-set");
    ASSERT_TRUE(listener.waitForOne());
    EXPECT_THAT(listener.heard(), ::testing::ElementsAre("root", "working-set"));
}

TEST(SignalHubTest, aSubscriptionThatIsGoneHearsNothingMore) {
    Listener gone;
    Listener stays;
    SignalHub hub(milliseconds(0));
    auto subscription = hub.subscribe(gone.taker());
    const auto other = hub.subscribe(stays.taker());
    subscription.reset();
    hub.signal("root");
    ASSERT_TRUE(stays.waitForOne());
    EXPECT_THAT(gone.heard(), ::testing::IsEmpty());
}

}  // namespace
}  // namespace marrowdale::host
