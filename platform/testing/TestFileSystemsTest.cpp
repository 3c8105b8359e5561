#include <gtest/gtest.h>

#include "platform/testing/TestFileSystems.h"

namespace marrowdale {
namespace {

TEST(TestFileSystemsTest, ReadsOnePairAndSeveral) {
    const auto one = parseTestFileSystems("ext4=/mnt/a");
    ASSERT_EQ(one.size(), 1U);
    EXPECT_EQ(one[0].name, "ext4");
    EXPECT_EQ(one[0].dir, "/mnt/a");

    const auto two = parseTestFileSystems("ext4=/mnt/a:xfs=/mnt/b=c");
    ASSERT_EQ(two.size(), 2U);
    EXPECT_EQ(two[1].name, "xfs");
    EXPECT_EQ(two[1].dir, "/mnt/b=c");
}

TEST(TestFileSystemsTest, RefusesWhatIsNoListOfPairs) {
    for (const char* text :
         {"", ":", "ext4", "ext4=", "=/mnt", "ext4=relative", "a=/b:", ":a=/b", "a=/b::c=/d"}) {
        EXPECT_TRUE(parseTestFileSystems(text).empty()) << text;
    }
}

TEST(TestFileSystemsTest, AlwaysOffersAFileSystem) {
    EXPECT_FALSE(testFileSystems().empty());
}

}  // namespace
}  // namespace marrowdale
