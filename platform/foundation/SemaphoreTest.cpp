#include <atomic>
#include <memory>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "platform/foundation/Semaphore.h"

namespace marrowdale {
namespace {

using std::chrono::steady_clock;

TEST(SemaphoreTest, letsThroughAsManyAsWereSignalled) {
    Semaphore semaphore(1);
    semaphore.signal();
    semaphore.wait();
    semaphore.wait();
    EXPECT_FALSE(semaphore.waitUntil(steady_clock::now()));
    semaphore.signal();
    EXPECT_TRUE(semaphore.waitUntil(steady_clock::now()));
}

TEST(SemaphoreTest, waitUntilEndsAtItsDeadline) {
    Semaphore semaphore;
    const auto deadline = steady_clock::now() + std::chrono::milliseconds(5);
    EXPECT_FALSE(semaphore.waitUntil(deadline));
    EXPECT_GE(steady_clock::now(), deadline);
}

TEST(SemaphoreTest, wakesAWaiterOnAnotherThread) {
    Semaphore asked;
    Semaphore answered;
    std::jthread thread([&] {
        asked.wait();
        answered.signal();
    });
    asked.signal();
    EXPECT_TRUE(answered.waitUntil(steady_clock::now() + std::chrono::seconds(60)));
}

TEST(SemaphoreTest, mayBeDestroyedAsSoonAsTheWaiterReturns) {
    for (int i = 0; i < 2000; ++i) {
        auto semaphore = std::make_unique<Semaphore>();
        std::jthread thread([&signalled = *semaphore] { signalled.signal(); });
        semaphore->wait();
        semaphore.reset();
    }
}

TEST(WorkGroupTest, waitReturnsAtOnceWhenNothingWasEntered) {
    WorkGroup().wait();
}

TEST(WorkGroupTest, waitsForAllThatWasEntered) {
    WorkGroup group;
    std::atomic<int> done = 0;
    std::vector<std::jthread> threads;
    for (int i = 0; i < 8; ++i) {
        group.enter();
        threads.emplace_back([&] {
            ++done;
            group.leave();
        });
    }
    group.wait();
    EXPECT_EQ(done, 8);
}

TEST(WorkGroupDeathTest, leavingWhatWasNotEnteredEndsTheProcess) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_DEATH(WorkGroup().leave(), "left more often than entered");
}

}  // namespace
}  // namespace marrowdale
