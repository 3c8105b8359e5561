#include <limits>
#include <string>

#include <gtest/gtest.h>

#include "providers/marrowdale/fs/DocIDChangePath.h"

namespace marrowdale {
namespace {

constexpr DocIDChange expected{.documentID = 42, .sourceFileID = 100, .destinationFileID = 200};

bool accepts(std::string_view path) {
    DocIDChange change;
    return parseDocIDChangePath(path, change);
}

TEST(DocIDChangePathTest, acceptsAPathWithADevice) {
    DocIDChange change;
    ASSERT_TRUE(parseDocIDChangePath("/.docid/1/changed/42/src=100,dst=200", change));
    EXPECT_EQ(change, expected);
}

TEST(DocIDChangePathTest, acceptsAPathWithoutADeviceAfterSeveralSlashes) {
    DocIDChange change;
    ASSERT_TRUE(parseDocIDChangePath("//.docid/changed/42/src=100,dst=200", change));
    EXPECT_EQ(change, expected);
    EXPECT_TRUE(accepts(".docid/changed/42/src=100,dst=200"));
}

TEST(DocIDChangePathTest, rejectsAnythingAfterTheDestination) {
    EXPECT_FALSE(accepts("/.docid/1/changed/42/src=100,dst=200x"));
    EXPECT_FALSE(accepts("/.docid/1/changed/42/src=100,dst=200/"));
    EXPECT_FALSE(accepts("/.docid/1/changed/42/src=100,dst=200 "));
    EXPECT_FALSE(accepts(std::string_view("/.docid/1/changed/42/src=100,dst=200\0", 37)));
}

TEST(DocIDChangePathTest, rejectsDestinationBeforeSource) {
    EXPECT_FALSE(accepts("/.docid/1/changed/42/dst=200,src=100"));
}

TEST(DocIDChangePathTest, rejectsAMissingLiteral) {
    EXPECT_FALSE(accepts(""));
    EXPECT_FALSE(accepts("/"));
    EXPECT_FALSE(accepts("/docid/1/changed/42/src=100,dst=200"));
    EXPECT_FALSE(accepts("/.docid"));
    EXPECT_FALSE(accepts("/.docid/1"));
    EXPECT_FALSE(accepts("/.docid/1x/changed/42/src=100,dst=200"));
    EXPECT_FALSE(accepts("/.docid/1/42/src=100,dst=200"));
    EXPECT_FALSE(accepts("/.docid/1/changed/42"));
    EXPECT_FALSE(accepts("/.docid/1/changed/42/100,dst=200"));
    EXPECT_FALSE(accepts("/.docid/1/changed/42/src=100"));
    EXPECT_FALSE(accepts("/.docid/1/changed/42/src=100dst=200"));
}

TEST(DocIDChangePathTest, rejectsNumbersOutOfRange) {
    EXPECT_FALSE(accepts("/.docid/99999999999999999999/changed/42/src=100,dst=200"));
    EXPECT_FALSE(accepts("/.docid/1/changed/9223372036854775808/src=100,dst=200"));
    EXPECT_FALSE(accepts("/.docid/1/changed/42/src=-9223372036854775809,dst=200"));
    EXPECT_FALSE(accepts("/.docid/1/changed/42/src=100,dst=9223372036854775808"));
}

TEST(DocIDChangePathTest, readsTheWholeSignedRange) {
    DocIDChange change;
    ASSERT_TRUE(parseDocIDChangePath(
        "/.docid/changed/9223372036854775807/src=-9223372036854775808,dst=+7", change));
    EXPECT_EQ(change.documentID, std::numeric_limits<std::int64_t>::max());
    EXPECT_EQ(change.sourceFileID, std::numeric_limits<std::int64_t>::min());
    EXPECT_EQ(change.destinationFileID, 7);
}

TEST(DocIDChangePathTest, aNumberWithoutDigitsIsZero) {
    DocIDChange change;
    ASSERT_TRUE(parseDocIDChangePath("/.docid/1/changed//src=,dst=", change));
    EXPECT_EQ(change, DocIDChange{});
}

TEST(DocIDChangePathTest, aRefusedPathLeavesTheResultAlone) {
    DocIDChange change = expected;
    ASSERT_FALSE(parseDocIDChangePath("/.docid/1/changed/1/src=2,dst=3x", change));
    EXPECT_EQ(change, expected);
}

TEST(DocIDChangePathTest, everyCutOfAPathIsRefusedUntilTheDestinationBegins) {
    const std::string path = "/.docid/1/changed/42/src=100,dst=200";
    const auto destination = path.find("200");
    for (std::size_t length = 0; length < destination; ++length) {
        EXPECT_FALSE(accepts(path.substr(0, length))) << length;
    }
}

}  // namespace
}  // namespace marrowdale
