#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/events/HintSet.h"

namespace marrowdale::native {
namespace {

WatchHint hint(std::uint32_t what, std::uint64_t folder, std::string_view name) {
    WatchHint hint;
    hint.what = what;
    hint.folder = FileID{folder};
    hint.name = name;
    return hint;
}

TEST(HintSetTest, EachPlaceOnceWithAllThatWasToldOfIt) {
    HintSet hints;
    EXPECT_TRUE(hints.empty());
    hints.add(hint(WatchHint::appeared, 2, "b"));
    hints.add(hint(WatchHint::changed, 2, "a"));
    hints.add(hint(WatchHint::gone, 2, "b"));
    hints.add(hint(WatchHint::changed, 1, "b"));
    const auto places = hints.takePlaces();
    ASSERT_EQ(places.size(), 3U);
    EXPECT_EQ(places[0].folder, FileID{1});
    EXPECT_EQ(places[1].name, "a");
    EXPECT_EQ(places[2].name, "b");
    EXPECT_EQ(places[2].what, WatchHint::appeared | WatchHint::gone);
    EXPECT_TRUE(hints.empty());
}

TEST(HintSetTest, TheLastMoveToAPlaceCounts) {
    HintSet hints;
    auto move = hint(WatchHint::movedTo, 1, "doc");
    move.fromFolder = FileID{1};
    move.fromName = "first";
    move.fingerprint = 5;
    hints.add(move);
    move.fromName = "second";
    move.fingerprint = 6;
    hints.add(move);
    hints.add(hint(WatchHint::changed, 1, "doc"));
    const auto places = hints.takePlaces();
    ASSERT_EQ(places.size(), 1U);
    EXPECT_EQ(places[0].fromName, "second");
    EXPECT_EQ(places[0].fingerprint, 6U);
}

TEST(HintSetTest, WatchedFilesAreKeptApart) {
    HintSet hints;
    WatchHint file;
    file.what = WatchHint::changed;
    file.file = FileID{9};
    hints.add(file);
    hints.add(file);
    hints.add(WatchHint{});
    EXPECT_FALSE(hints.empty());
    EXPECT_TRUE(hints.takePlaces().empty());
    EXPECT_THAT(hints.takeFiles(), testing::ElementsAre(FileID{9}));
    EXPECT_TRUE(hints.empty());
}

}  // namespace
}  // namespace marrowdale::native
