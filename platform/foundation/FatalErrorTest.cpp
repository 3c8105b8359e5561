#include <csignal>

#include <gtest/gtest.h>

#include "platform/foundation/FatalError.h"

namespace marrowdale {
namespace {

TEST(FatalErrorDeathTest, writesTheMessageAndAborts) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(fatalError("the reason"), testing::KilledBySignal(SIGABRT), "fatal: the reason");
}

}  // namespace
}  // namespace marrowdale
