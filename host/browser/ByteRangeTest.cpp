#include <gtest/gtest.h>

#include "host/browser/ByteRange.h"

namespace marrowdale::host {
namespace {

struct Case {
    const char* field;
    std::uint64_t size;
    RangeKind kind;
    ByteRange range;
};

TEST(ByteRangeTest, partsAreFoundWithinTheContent) {
    const std::initializer_list<Case> cases{
        {"bytes=0-", 10, RangeKind::part, {0, 10}},
        {"bytes=0-0", 10, RangeKind::part, {0, 1}},
        {"bytes=3-5", 10, RangeKind::part, {3, 3}},
        {"bytes=3-99", 10, RangeKind::part, {3, 7}},
        {"bytes=9-18446744073709551615", 10, RangeKind::part, {9, 1}},
        {"bytes=-3", 10, RangeKind::part, {7, 3}},
        {"bytes=-30", 10, RangeKind::part, {0, 10}},
        {"bytes=10-", 10, RangeKind::unreachable, {}},
        {"bytes=0-", 0, RangeKind::unreachable, {}},
        {"bytes=-0", 10, RangeKind::unreachable, {}},
        {"bytes=-5", 0, RangeKind::unreachable, {}},
        {"bytes=5-3", 10, RangeKind::whole, {0, 10}},
        {"bytes=0-1,3-4", 10, RangeKind::whole, {0, 10}},
        {"bytes=a-b", 10, RangeKind::whole, {0, 10}},
        {"bytes=-", 10, RangeKind::whole, {0, 10}},
        {"bytes=5", 10, RangeKind::whole, {0, 10}},
        {"bytes=99999999999999999999-", 10, RangeKind::whole, {0, 10}},
        {"lines=1-2", 10, RangeKind::whole, {0, 10}}};
    for (const Case& each : cases) {
        const auto found = requestedRange(each.field, each.size);
        EXPECT_EQ(found.kind, each.kind) << each.field;
        EXPECT_EQ(found.range, each.range) << each.field;
    }
    EXPECT_EQ(requestedRange(std::nullopt, 10).range, (ByteRange{0, 10}));
}

}  // namespace
}  // namespace marrowdale::host
