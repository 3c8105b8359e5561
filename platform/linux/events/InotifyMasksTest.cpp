#include <cstddef>
#include <sys/inotify.h>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/events/InotifyMasks.h"
#include "platform/linux/events/Watcher.h"

namespace marrowdale::native {
namespace {

using InotifyBit = std::pair<std::uint32_t, std::uint32_t>;

// Every bit that is asked for or comes unasked, and what it means.
const std::vector<InotifyBit> inotifyBits{
    {IN_MODIFY, WatchHint::changed},
    {IN_ATTRIB, WatchHint::changed},
    {IN_CLOSE_WRITE, WatchHint::changed},
    {IN_CREATE, WatchHint::appeared},
    {IN_DELETE, WatchHint::gone},
    {IN_MOVED_FROM, WatchHint::movedFrom},
    {IN_MOVED_TO, WatchHint::movedTo},
    {IN_DELETE_SELF, WatchHint::rootMoved},
    {IN_MOVE_SELF, WatchHint::rootMoved},
    {IN_UNMOUNT, WatchHint::rootMoved},
    {IN_ONLYDIR, 0},
    {IN_ISDIR, 0},
    {IN_IGNORED, 0},
    {IN_Q_OVERFLOW, 0},
};

TEST(InotifyMasksTest, everyCombinationMeansWhatItsBitsMean) {
    for (std::size_t chosen = 0; chosen < std::size_t{1} << inotifyBits.size(); ++chosen) {
        std::uint32_t mask = 0;
        std::uint32_t meaning = 0;
        for (std::size_t i = 0; i < inotifyBits.size(); ++i) {
            mask |= (chosen >> i & 1U) != 0 ? inotifyBits[i].first : 0U;
            meaning |= (chosen >> i & 1U) != 0 ? inotifyBits[i].second : 0U;
        }
        ASSERT_EQ(InotifyMasks::what(mask), meaning) << mask;
    }
}

TEST(InotifyMasksTest, tableKnowsEveryBitThatIsAskedFor) {
    std::uint32_t known = 0;
    for (const InotifyBit& bit : inotifyBits) {
        known |= bit.first;
    }
    const std::uint32_t asked = InotifyMasks::folder | InotifyMasks::rootToo | InotifyMasks::file;
    EXPECT_EQ(asked & ~known, 0U);
}

TEST(InotifyMasksTest, unknownBitsMeanNothing) {
    std::uint32_t known = 0;
    for (const InotifyBit& bit : inotifyBits) {
        known |= bit.first;
    }
    EXPECT_EQ(InotifyMasks::what(~known), 0U);
    EXPECT_EQ(InotifyMasks::what(~known | IN_CREATE), WatchHint::appeared);
}

}  // namespace
}  // namespace marrowdale::native
