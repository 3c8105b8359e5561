#include <gtest/gtest.h>

#include "providers/marrowdale/fs/FSWalkCursors.h"

namespace marrowdale {
namespace {

FSWalkCursorKey keyAt(std::uint64_t offset) {
    return {.deviceUUID = {},
            .streamEventID = 7,
            .offset = offset,
            .container = "fid=1",
            .roots = {"/a", "/b"}};
}

FSWalkPosition positionAt(std::int64_t offset) {
    return {.root = 1,
            .position = {.levels = {{.name = "", .folder = FileID{5}, .offset = offset}},
                         .atEnd = false}};
}

TEST(FSWalkCursorsTest, aPositionIsFoundUnderItsKeyAgainAndAgain) {
    FSWalkCursors cursors;
    cursors.remember(keyAt(200), positionAt(3));
    EXPECT_EQ(cursors.find(keyAt(200)), positionAt(3));
    EXPECT_EQ(cursors.find(keyAt(200)), positionAt(3));
}

TEST(FSWalkCursorsTest, everyPartOfTheKeyCounts) {
    FSWalkCursors cursors;
    cursors.remember(keyAt(200), positionAt(3));
    std::vector<FSWalkCursorKey> others(5, keyAt(200));
    others[0].deviceUUID = UUID::random();
    others[1].streamEventID = 8;
    others[2].offset = 400;
    others[3].container = "fid=2";
    others[4].roots = {"/a"};
    for (const auto& other : others) {
        EXPECT_EQ(cursors.find(other), std::nullopt);
    }
}

TEST(FSWalkCursorsTest, theLastPositionOfAKeyCounts) {
    FSWalkCursors cursors;
    cursors.remember(keyAt(200), positionAt(3));
    cursors.remember(keyAt(200), positionAt(4));
    EXPECT_EQ(cursors.find(keyAt(200)), positionAt(4));
}

TEST(FSWalkCursorsTest, theLast64AreKept) {
    FSWalkCursors cursors;
    for (std::uint64_t page = 0; page <= FSWalkCursors::capacity; ++page) {
        cursors.remember(keyAt(page), positionAt(static_cast<std::int64_t>(page)));
    }
    EXPECT_EQ(cursors.find(keyAt(0)), std::nullopt);
    EXPECT_EQ(cursors.find(keyAt(1)), positionAt(1));
    EXPECT_EQ(cursors.find(keyAt(FSWalkCursors::capacity)), positionAt(64));
}

TEST(FSWalkCursorsTest, aKeyRememberedAgainIsTheYoungest) {
    FSWalkCursors cursors;
    for (std::uint64_t page = 0; page < FSWalkCursors::capacity; ++page) {
        cursors.remember(keyAt(page), positionAt(1));
    }
    cursors.remember(keyAt(0), positionAt(2));
    cursors.remember(keyAt(1000), positionAt(1));
    EXPECT_EQ(cursors.find(keyAt(0)), positionAt(2));
    EXPECT_EQ(cursors.find(keyAt(1)), std::nullopt);
}

}  // namespace
}  // namespace marrowdale
