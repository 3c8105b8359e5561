#include <atomic>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "platform/foundation/Semaphore.h"
#include "platform/hostframework/RefreshPacer.h"

namespace marrowdale {
namespace {

using Clock = std::chrono::steady_clock;

constexpr auto interval = std::chrono::milliseconds(40);
constexpr auto patience = std::chrono::seconds(30);

class RefreshPacerTest : public ::testing::Test {
  protected:
    RefreshPacerTest() {
        pacer_->setEventBlock([this] {
            begins_.push_back(Clock::now());
            if (duringEvent) {
                duringEvent();
            }
            fired_.signal();
        });
    }
    bool fires() { return fired_.waitUntil(Clock::now() + patience); }
    // On the queue, so that it may be read.
    std::vector<Clock::time_point> begins() {
        std::vector<Clock::time_point> copy;
        queue_.sync([&] { copy = begins_; });
        return copy;
    }

    std::function<void()> duringEvent;
    SerialQueue queue_{"marrowdale.test.pacer"};
    std::vector<Clock::time_point> begins_;  // touched on the queue
    Semaphore fired_;
    std::unique_ptr<RefreshPacer> pacer_ =
        RefreshPacer::makePacer("marrowdale.test", queue_, interval);
};

TEST_F(RefreshPacerTest, aSignalBeforeResumeIsKept) {
    pacer_->signal();
    EXPECT_TRUE(begins().empty());
    pacer_->resume();
    EXPECT_TRUE(fires());
    EXPECT_EQ(pacer_->name(), "marrowdale.test");
}

TEST_F(RefreshPacerTest, eventsBeginNoSoonerThanAnIntervalAfterTheLast) {
    pacer_->resume();
    for (int i = 0; i < 4; ++i) {
        pacer_->signal();
        ASSERT_TRUE(fires());
    }
    const auto times = begins();
    ASSERT_EQ(times.size(), 4U);
    for (std::size_t i = 1; i < times.size(); ++i) {
        EXPECT_GE(times[i] - times[i - 1], interval);
    }
}

TEST_F(RefreshPacerTest, signalsThatComeTogetherAreOneEventOrTwo) {
    pacer_->resume();
    for (int i = 0; i < 1000; ++i) {
        pacer_->signal();
    }
    ASSERT_TRUE(fires());
    // A signal after the first event began leads to one more, which any further signal then joins.
    EXPECT_LE(begins().size(), 2U);
}

TEST_F(RefreshPacerTest, aSignalDuringTheEventLeadsToAnother) {
    std::atomic<bool> again = true;
    duringEvent = [&] {
        if (again.exchange(false)) {
            pacer_->signal();
        }
    };
    pacer_->resume();
    pacer_->signal();
    EXPECT_TRUE(fires());
    EXPECT_TRUE(fires());
}

TEST_F(RefreshPacerTest, noEventBeginsOnceItIsGone) {
    pacer_->resume();
    Semaphore goOn;
    queue_.async([&] { goOn.wait(); });
    pacer_->signal();
    pacer_.reset();
    goOn.signal();
    EXPECT_TRUE(begins().empty());
}

TEST_F(RefreshPacerTest, mayBeReleasedByItsOwnEvent) {
    duringEvent = [&] { pacer_.reset(); };
    pacer_->resume();
    pacer_->signal();
    EXPECT_TRUE(fires());
}

TEST_F(RefreshPacerTest, noSignalOfManyThreadsIsLost) {
    std::atomic<int> wanted = 0;
    std::atomic<int> seen = 0;
    duringEvent = [&] { seen = wanted.load(); };
    pacer_->resume();
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            for (int k = 0; k < 500; ++k) {
                ++wanted;
                pacer_->signal();
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    while (seen != 2000) {
        ASSERT_TRUE(fires());
    }
}

}  // namespace
}  // namespace marrowdale
