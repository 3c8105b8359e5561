#include <gtest/gtest-spi.h>

#include "platform/testing/TestSkip.h"

namespace marrowdale {
namespace {

class ForbiddenSkipTest : public ::testing::Test {
  protected:
    void SetUp() override {
        const char* before = std::getenv("MARROWDALE_TEST_NO_SKIP");
        before_ = before == nullptr ? "" : before;
        ::setenv("MARROWDALE_TEST_NO_SKIP", "1", 1);
    }
    void TearDown() override { ::setenv("MARROWDALE_TEST_NO_SKIP", before_.c_str(), 1); }

  private:
    std::string before_;
};

void skipForWantOfATool() {
    MARROWDALE_SKIP("no such tool");
}

TEST_F(ForbiddenSkipTest, FailsAndNamesTheReason) {
    EXPECT_FATAL_FAILURE(skipForWantOfATool(), "no such tool");
}

TEST_F(ForbiddenSkipTest, OtherValuesForbidNothing) {
    EXPECT_TRUE(skippingIsForbidden());
    ::setenv("MARROWDALE_TEST_NO_SKIP", "0", 1);
    EXPECT_FALSE(skippingIsForbidden());
    ::unsetenv("MARROWDALE_TEST_NO_SKIP");
    EXPECT_FALSE(skippingIsForbidden());
}

}  // namespace
}  // namespace marrowdale
