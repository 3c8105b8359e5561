#include <atomic>
#include <memory>
#include <optional>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "platform/foundation/Semaphore.h"
#include "platform/foundation/SerialQueue.h"

namespace marrowdale {
namespace {

void expectSignalInTime(Semaphore& semaphore) {
    EXPECT_TRUE(semaphore.waitUntil(std::chrono::steady_clock::now() + std::chrono::seconds(120)));
}

TEST(SerialQueueTest, keepsItsLabel) {
    EXPECT_EQ(SerialQueue("marrowdale.example").label(), "marrowdale.example");
}

TEST(SerialQueueTest, runsBlocksInTheOrderInWhichTheyCame) {
    std::vector<int> order;
    {
        const SerialQueue queue("marrowdale.example");
        for (int i = 0; i < 1000; ++i) {
            if (i % 3 == 0) {
                queue.sync([&order, i] { order.push_back(i); });
            } else {
                queue.async([&order, i] { order.push_back(i); });
            }
        }
    }
    ASSERT_EQ(order.size(), 1000U);
    for (int i = 0; i < 1000; ++i) {
        EXPECT_EQ(order[static_cast<std::size_t>(i)], i);
    }
}

TEST(SerialQueueTest, syncRunsOnTheCallersThread) {
    const SerialQueue queue("marrowdale.example");
    std::thread::id runner;
    queue.sync([&] { runner = std::this_thread::get_id(); });
    EXPECT_EQ(runner, std::this_thread::get_id());
    queue.async([&] { runner = std::this_thread::get_id(); });
    queue.sync([] {});
    EXPECT_NE(runner, std::this_thread::get_id());
}

TEST(SerialQueueTest, neverRunsTwoBlocksAtOnce) {
    int unguarded = 0;
    std::atomic<int> inside = 0;
    {
        const SerialQueue queue("marrowdale.example");
        const auto block = [&] {
            EXPECT_EQ(inside.fetch_add(1), 0);
            ++unguarded;
            inside.fetch_sub(1);
        };
        std::vector<std::jthread> threads;
        for (int i = 0; i < 8; ++i) {
            threads.emplace_back([&, i, queue] {
                for (int round = 0; round < 2000; ++round) {
                    if ((round + i) % 2 == 0) {
                        queue.async(block);
                    } else {
                        queue.sync(block);
                    }
                }
            });
        }
    }
    EXPECT_EQ(unguarded, 16'000);
}

TEST(SerialQueueTest, syncWaitsForWhatCameBefore) {
    const SerialQueue queue("marrowdale.example");
    Semaphore gate;
    bool ranBefore = false;
    queue.async([&] {
        gate.wait();
        ranBefore = true;
    });
    std::jthread opener([&] { gate.signal(); });
    queue.sync([&] { EXPECT_TRUE(ranBefore); });
    EXPECT_TRUE(ranBefore);
}

TEST(SerialQueueTest, isCurrentInsideItsOwnBlocksOnly) {
    const SerialQueue outer("marrowdale.outer");
    const SerialQueue inner("marrowdale.inner");
    EXPECT_FALSE(outer.isCurrent());
    outer.sync([&] {
        EXPECT_TRUE(outer.isCurrent());
        EXPECT_FALSE(inner.isCurrent());
        inner.sync([&] {
            EXPECT_TRUE(outer.isCurrent());
            EXPECT_TRUE(inner.isCurrent());
            std::jthread([&] { EXPECT_FALSE(outer.isCurrent()); });
        });
        EXPECT_FALSE(inner.isCurrent());
    });
    EXPECT_FALSE(outer.isCurrent());
    Semaphore done;
    outer.async([&] {
        EXPECT_TRUE(outer.isCurrent());
        done.signal();
    });
    expectSignalInTime(done);
}

TEST(SerialQueueTest, aBlockMayAddBlocks) {
    const SerialQueue queue("marrowdale.example");
    Semaphore done;
    std::vector<int> order;
    queue.async([&] {
        queue.async([&] {
            order.push_back(2);
            done.signal();
        });
        order.push_back(1);
    });
    expectSignalInTime(done);
    EXPECT_EQ(order, (std::vector{1, 2}));
}

TEST(SerialQueueTest, theLastCopyLetsWaitingBlocksEnd) {
    Semaphore gate;
    std::atomic<int> done = 0;
    std::optional<SerialQueue> queue("marrowdale.example");
    queue->async([&] { gate.wait(); });
    for (int i = 0; i < 100; ++i) {
        queue->async([&] { ++done; });
    }
    std::optional<SerialQueue> copy = queue;
    queue.reset();
    EXPECT_EQ(done, 0);
    gate.signal();
    copy.reset();
    EXPECT_EQ(done, 100);
}

TEST(SerialQueueTest, mayBeReleasedFromItsOwnBlock) {
    for (int round = 0; round < 200; ++round) {
        Semaphore released;
        Semaphore done;
        auto queue = std::make_shared<std::optional<SerialQueue>>("marrowdale.example");
        const std::optional<SerialQueue>& alias = *queue;
        alias->async([&] {
            released.wait();
            queue->reset();
        });
        alias->async([&] { done.signal(); });
        released.signal();
        expectSignalInTime(done);
    }
}

TEST(SerialQueueTest, mayBeReleasedByABlockThatOwnsIt) {
    for (int round = 0; round < 200; ++round) {
        Semaphore done;
        {
            const SerialQueue queue("marrowdale.example");
            queue.async([&done, queue] {
                EXPECT_TRUE(queue.isCurrent());
                done.signal();
            });
        }
        expectSignalInTime(done);
    }
}

TEST(SerialQueueTest, mayBeReleasedFromASyncBlockWhileOthersWait) {
    for (int round = 0; round < 200; ++round) {
        std::atomic<int> done = 0;
        std::optional<SerialQueue> queue("marrowdale.example");
        queue->sync([&] {
            queue->async([&] { ++done; });
            queue.reset();
        });
        EXPECT_EQ(done, 1);
    }
}

TEST(SerialQueueTest, whatABlockCapturedGoesBeforeTheNextBlockRuns) {
    const SerialQueue queue("marrowdale.example");
    auto captured = std::make_shared<int>(0);
    const std::weak_ptr<int> watch = captured;
    queue.async([captured = std::move(captured)] {});
    queue.sync([&] { EXPECT_TRUE(watch.expired()); });
}

TEST(SerialQueueDeathTest, syncFromItsOwnBlockEndsTheProcess) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    const SerialQueue queue("marrowdale.example");
    EXPECT_DEATH(queue.sync([&] { queue.sync([] {}); }),
                 "sync on the queue \"marrowdale.example\"");
    EXPECT_DEATH(
        {
            queue.async([&] { queue.sync([] {}); });
            queue.sync([] {});
        },
        "sync on the queue \"marrowdale.example\"");
}

}  // namespace
}  // namespace marrowdale
