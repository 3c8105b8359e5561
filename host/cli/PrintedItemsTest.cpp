#include <gtest/gtest.h>

#include "host/cli/PrintedItems.h"

namespace marrowdale::host {
namespace {

TEST(PrintedItemsTest, withinOnePassNothingIsLeftOut) {
    PrintedItems printed;
    EXPECT_FALSE(printed.wasPrintedBefore("did=1"));
    EXPECT_FALSE(printed.wasPrintedBefore("did=1"));
}

TEST(PrintedItemsTest, aListingThatStartsOverLeavesOutWhatAnyEarlierPassPrinted) {
    PrintedItems printed;
    EXPECT_FALSE(printed.wasPrintedBefore("did=1"));
    EXPECT_FALSE(printed.wasPrintedBefore("#org.example.Notes"));
    printed.startOver();
    EXPECT_TRUE(printed.wasPrintedBefore("did=1"));
    EXPECT_TRUE(printed.wasPrintedBefore("#org.example.Notes"));
    EXPECT_FALSE(printed.wasPrintedBefore("did=2"));
    printed.startOver();
    EXPECT_TRUE(printed.wasPrintedBefore("did=1"));
    EXPECT_TRUE(printed.wasPrintedBefore("did=2"));
}

TEST(PrintedItemsTest, identifiersThatLookAlikeAreNotMixedUp) {
    PrintedItems printed;
    for (const char* identifier : {"did=1", "fid=18446744073709551615", "did=x", "did=0"}) {
        EXPECT_FALSE(printed.wasPrintedBefore(identifier));
    }
    printed.startOver();
    for (const char* identifier :
         {"fid=1", "did=01", "did=", "did=9223372036854775807", "fid=0", "did=00", "1"}) {
        EXPECT_FALSE(printed.wasPrintedBefore(identifier)) << identifier;
    }
    EXPECT_TRUE(printed.wasPrintedBefore("fid=18446744073709551615"));
    EXPECT_TRUE(printed.wasPrintedBefore("did=x"));
}

}  // namespace
}  // namespace marrowdale::host
