#include <atomic>
#include <latch>

#include <gtest/gtest.h>

#include "platform/linux/operations/WorkerPool.h"

namespace marrowdale::native {
namespace {

TEST(WorkerPoolTest, runsEveryBlockOnce) {
    std::atomic<int> count = 0;
    WorkerPool pool(3);
    for (int i = 0; i < 1000; ++i) {
        pool.async([&] { ++count; });
    }
    pool.finish();
    EXPECT_EQ(count, 1000);
}

TEST(WorkerPoolTest, runsAsManyAtOnceAsItMay) {
    constexpr int threads = 3;
    WorkerPool pool(threads);
    std::latch all(threads);
    for (int i = 0; i < threads; ++i) {
        pool.async([&] { all.arrive_and_wait(); });  // each waits for the others
    }
    pool.finish();
    EXPECT_TRUE(all.try_wait());
}

TEST(WorkerPoolTest, blocksMayHandOverBlocks) {
    std::atomic<int> count = 0;
    WorkerPool pool(1);
    pool.async([&] { pool.async([&] { ++count; }); });
    pool.finish();
    EXPECT_EQ(count, 1);
}

TEST(WorkerPoolTest, afterTheEndBlocksRunAtOnce) {
    WorkerPool pool(1);
    pool.finish();
    bool ran = false;
    pool.async([&] { ran = true; });
    EXPECT_TRUE(ran);
}

}  // namespace
}  // namespace marrowdale::native
