#include <gtest/gtest.h>

#include "platform/linux/events/KernelLimit.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::native {
namespace {

TEST(KernelLimitTest, isTheNumberThatTheKernelShows) {
    const std::string shown = readFile("/proc/sys/fs/inotify/max_queued_events");
    EXPECT_EQ(std::to_string(kernelLimit("inotify/max_queued_events")) + "\n", shown);
}

TEST(KernelLimitTest, noneIsShownAsZero) {
    EXPECT_EQ(kernelLimit("inotify/no_such_limit"), 0U);
}

}  // namespace
}  // namespace marrowdale::native
