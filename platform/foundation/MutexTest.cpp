#include <chrono>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "platform/foundation/Mutex.h"

namespace marrowdale {
namespace {

using std::chrono::steady_clock;

struct Counter {
    Mutex mutex;
    Condition changed;
    int count MARROWDALE_GUARDED_BY(mutex) = 0;
};

TEST(MutexTest, excludesOtherThreads) {
    Counter counter;
    {
        std::vector<std::jthread> threads;
        for (int i = 0; i < 4; ++i) {
            threads.emplace_back([&counter] {
                for (int round = 0; round < 5000; ++round) {
                    const MutexLock lock(counter.mutex);
                    ++counter.count;
                }
            });
        }
    }
    const MutexLock lock(counter.mutex);
    EXPECT_EQ(counter.count, 20'000);
}

TEST(ConditionTest, aWaiterGivesTheMutexUpAndIsWoken) {
    Counter counter;
    std::jthread thread([&counter] {
        const MutexLock lock(counter.mutex);
        counter.count = 1;
        counter.changed.notifyAll();
    });
    const auto deadline = steady_clock::now() + std::chrono::seconds(120);
    bool isInTime = true;
    MutexLock lock(counter.mutex);
    while (counter.count == 0 && isInTime) {
        isInTime = counter.changed.waitUntil(lock, deadline);
    }
    EXPECT_EQ(counter.count, 1);
}

TEST(ConditionTest, aWaitEndsAtItsDeadline) {
    Counter counter;
    MutexLock lock(counter.mutex);
    const auto deadline = steady_clock::now() + std::chrono::milliseconds(5);
    while (counter.changed.waitUntil(lock, deadline)) {
    }
    EXPECT_GE(steady_clock::now(), deadline);
}

}  // namespace
}  // namespace marrowdale
