#include <cstddef>
#include <sys/fanotify.h>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/events/FanotifyMasks.h"
#include "platform/linux/events/Watcher.h"

namespace marrowdale::native {
namespace {

using FanotifyBit = std::pair<std::uint64_t, std::uint32_t>;

// Every bit that is asked for or comes unasked, and what it means.
const std::vector<FanotifyBit> fanotifyBits{
    {FAN_MODIFY, WatchHint::changed},
    {FAN_ATTRIB, WatchHint::changed},
    {FAN_CLOSE_WRITE, WatchHint::changed},
    {FAN_CREATE, WatchHint::appeared},
    {FAN_DELETE, WatchHint::gone},
    {FAN_RENAME, 0},
    {FAN_DELETE_SELF, WatchHint::rootMoved},
    {FAN_MOVE_SELF, WatchHint::rootMoved},
    {FAN_ONDIR, 0},
    {FAN_EVENT_ON_CHILD, 0},
    {FAN_Q_OVERFLOW, 0},
};

TEST(FanotifyMasksTest, everyCombinationMeansWhatItsBitsMean) {
    for (std::size_t chosen = 0; chosen < std::size_t{1} << fanotifyBits.size(); ++chosen) {
        std::uint64_t mask = 0;
        std::uint32_t meaning = 0;
        for (std::size_t i = 0; i < fanotifyBits.size(); ++i) {
            mask |= (chosen >> i & 1U) != 0 ? fanotifyBits[i].first : 0U;
            meaning |= (chosen >> i & 1U) != 0 ? fanotifyBits[i].second : 0U;
        }
        ASSERT_EQ(FanotifyMasks::what(mask), meaning) << mask;
    }
}

TEST(FanotifyMasksTest, tableKnowsEveryBitThatIsAskedFor) {
    std::uint64_t known = 0;
    for (const FanotifyBit& bit : fanotifyBits) {
        known |= bit.first;
    }
    const std::uint64_t asked =
        FanotifyMasks::folder | FanotifyMasks::rootToo | FanotifyMasks::file;
    EXPECT_EQ(asked & ~known, 0U);
}

TEST(FanotifyMasksTest, unknownBitsMeanNothing) {
    std::uint64_t known = 0;
    for (const FanotifyBit& bit : fanotifyBits) {
        known |= bit.first;
    }
    EXPECT_EQ(FanotifyMasks::what(~known), 0U);
    EXPECT_EQ(FanotifyMasks::what(~known | FAN_CREATE), WatchHint::appeared);
}

}  // namespace
}  // namespace marrowdale::native
