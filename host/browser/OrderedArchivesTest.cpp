#include <gtest/gtest.h>

#include "host/browser/OrderedArchives.h"

namespace marrowdale::host {
namespace {

class OrderedArchivesTest : public ::testing::Test {
  protected:
    OrderedArchives::Clock::time_point now_ = OrderedArchives::Clock::now();
    OrderedArchives archives_{[this] { return now_; }};
};

TEST_F(OrderedArchivesTest, anOrderIsFoundByItsSecret) {
    const std::string secret =
        archives_.add({.session = 7, .name = "a.zip", .items = {"did=1", "fid=2"}});
    const auto found = archives_.find(secret);
    ASSERT_TRUE(found.has_value());
    EXPECT_EQ(found->session, 7U);
    EXPECT_EQ(found->items.size(), 2U);
    EXPECT_FALSE(archives_.find("").has_value());
    EXPECT_FALSE(archives_.find(secret + "0").has_value());
}

TEST_F(OrderedArchivesTest, anOrderEndsWithItsTime) {
    const std::string secret = archives_.add({});
    now_ += OrderedArchives::lifetime;
    EXPECT_TRUE(archives_.find(secret).has_value());
    now_ += std::chrono::seconds(1);
    EXPECT_FALSE(archives_.find(secret).has_value());
}

TEST_F(OrderedArchivesTest, theOldestOfTooManyIsForgotten) {
    const std::string first = archives_.add({});
    std::string last;
    for (std::size_t i = 0; i < OrderedArchives::most; ++i) {
        last = archives_.add({});
    }
    EXPECT_FALSE(archives_.find(first).has_value());
    EXPECT_TRUE(archives_.find(last).has_value());
}

}  // namespace
}  // namespace marrowdale::host
