#include <cerrno>
#include <deque>

#include <gtest/gtest.h>

#include "platform/linux/events/KernelQueue.h"

namespace marrowdale::native {
namespace {

// A read that answers what is in `script`, one after the other: a count, or -errno.
KernelQueue::Read scripted(std::deque<int>& script) {
    return [&script](void*, std::size_t) -> ssize_t {
        const int answer = script.front();
        script.pop_front();
        errno = answer < 0 ? -answer : 0;
        return answer < 0 ? -1 : answer;
    };
}

void takeOneAByte(std::span<const std::byte> bytes, Watcher::Drained& drained) {
    drained.events += bytes.size();
}

TEST(KernelQueueTest, readsUntilThereIsNothingMore) {
    std::deque<int> script{3, -EINTR, 4, -EAGAIN, 5};
    KernelQueue queue(100);
    const auto drained = queue.drain(scripted(script), takeOneAByte);
    ASSERT_TRUE(drained);
    EXPECT_EQ(drained->events, 7U);
    EXPECT_EQ(script.size(), 1U);
}

TEST(KernelQueueTest, failureOfTheReadIsTold) {
    std::deque<int> script{3, -EIO};
    EXPECT_EQ(KernelQueue(100).drain(scripted(script), takeOneAByte).error().code, EIO);
    script = {0};
    EXPECT_EQ(KernelQueue(100).drain(scripted(script), takeOneAByte).error().code, EIO);
}

TEST(KernelQueueTest, endsOnceMoreWasReadThanWasThereAtTheBeginning) {
    const KernelQueue::Read never = [](void*, std::size_t) -> ssize_t { return 7; };
    const auto drained = KernelQueue(100).drain(never, takeOneAByte);
    ASSERT_TRUE(drained);
    EXPECT_GE(drained->events, 101U);
    EXPECT_LT(drained->events, 110U);
}

TEST(KernelQueueTest, queueWithoutALimitIsReadToItsEnd) {
    std::deque<int> script(1000, 60'000);
    script.push_back(-EAGAIN);
    EXPECT_EQ(KernelQueue(0).drain(scripted(script), takeOneAByte)->events, 60'000'000U);
}

}  // namespace
}  // namespace marrowdale::native
