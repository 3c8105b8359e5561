#include <atomic>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/files/SharedWork.h"

namespace marrowdale::native {
namespace {

std::vector<int> timesDone(SharedWork& work, std::size_t count) {
    std::vector<std::atomic<int>> times(count);
    work.run(count, [&](std::size_t first, std::size_t last) {
        for (; first < last; ++first) {
            ++times[first];
        }
    });
    return {times.begin(), times.end()};
}

TEST(SharedWorkTest, everyPieceIsDoneOnce) {
    SharedWork work;
    for (const std::size_t count :
         std::initializer_list<std::size_t>{0, 1, 31, 32, 33, 200, 1001}) {
        EXPECT_EQ(timesDone(work, count), std::vector<int>(count, 1)) << count;
    }
}

TEST(SharedWorkTest, allOfItIsOverWhenTheCallReturns) {
    SharedWork work;
    for (int round = 0; round < 10'000; ++round) {
        std::atomic<int> running = 0;
        work.run(40, [&](std::size_t /*first*/, std::size_t /*last*/) {
            ++running;
            --running;
        });
        ASSERT_EQ(running, 0);
    }
}

TEST(SharedWorkTest, callersWhoComeWhileTheHelperIsBusyWorkAlone) {
    SharedWork work;
    std::vector<std::jthread> threads;
    std::atomic<int> wrong = 0;
    for (int thread = 0; thread < 4; ++thread) {
        threads.emplace_back([&] {
            for (int round = 0; round < 500; ++round) {
                wrong += timesDone(work, 100) == std::vector<int>(100, 1) ? 0 : 1;
            }
        });
    }
    threads.clear();
    EXPECT_EQ(wrong, 0);
}

}  // namespace
}  // namespace marrowdale::native
