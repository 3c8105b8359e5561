#include <gtest/gtest.h>

#include "providers/marrowdale/fs/FSScanOffset.h"

namespace marrowdale {
namespace {

TEST(FSScanOffsetTest, withoutADeletionItIsThePosition) {
    EXPECT_EQ((FSScanOffset{.position = 199, .newestDeletion = 0}).value(), 199U);
    EXPECT_EQ(FSScanOffset::from(199).position, 199U);
    EXPECT_EQ(FSScanOffset::from(199).newestDeletion, 0U);
}

TEST(FSScanOffsetTest, bothNumbersComeBack) {
    const FSScanOffset offset{.position = 0xffffffff, .newestDeletion = 0xfffffffe};
    const auto again = FSScanOffset::from(offset.value());
    EXPECT_EQ(again.position, offset.position);
    EXPECT_EQ(again.newestDeletion, offset.newestDeletion);
}

TEST(FSScanOffsetTest, theDistanceOfADeletionIsBehindTheFolder) {
    EXPECT_EQ(FSScanOffset::distance(EventID{}, EventID{12}), 0U);
    EXPECT_EQ(FSScanOffset::distance(EventID{12}, EventID{12}), 0U);
    EXPECT_EQ(FSScanOffset::distance(EventID{15}, EventID{12}), 3U);
}

}  // namespace
}  // namespace marrowdale
