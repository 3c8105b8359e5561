#include <gtest/gtest.h>

#include "platform/linux/store/EntryMerger.h"

namespace marrowdale::native {
namespace {

constexpr std::uint32_t fileMode = 0100644;
constexpr std::uint32_t folderMode = 0040755;

// Something that was changed long before it was looked at.
EntryLook lookAt(std::uint32_t mode) {
    EntryLook look;
    look.status.fileID = FileID{12};
    look.status.mode = mode;
    look.status.size = 4096;
    look.status.birth = {1'000, 0};
    look.status.hasBirth = true;
    look.status.changed = {2'000, 0};
    look.lookedAt = {3'000, 0};
    return look;
}

TEST(EntryMergerTest, TheSameStatusIsNoChange) {
    for (const std::uint32_t mode : {fileMode, folderMode}) {
        const EntryLook look = lookAt(mode);
        EXPECT_TRUE(EntryMerger::isUnchanged(EntryMerger::valuesOf(look), look.status)) << mode;
    }
}

// After a power cut ext4 has files with the times of a write, and without what was written.
TEST(EntryMergerTest, AnotherSizeIsAChangeWhateverTheTimesSay) {
    const EntryLook look = lookAt(fileMode);
    EntryStatus cut = look.status;
    cut.size = 0;
    EXPECT_FALSE(EntryMerger::isUnchanged(EntryMerger::valuesOf(look), cut));
}

TEST(EntryMergerTest, TheSizeOfAFolderMeansNothing) {
    const EntryLook look = lookAt(folderMode);
    EntryStatus grown = look.status;
    grown.size = 8192;
    EXPECT_TRUE(EntryMerger::isUnchanged(EntryMerger::valuesOf(look), grown));
}

// Deletions are told by the number: that of the earlier file must not come after the later one.
TEST(EntryMergerTest, AFileWhoseNumberIsAnothersNowHasLeft) {
    const PackageTypes packages;
    Index index;
    TreeChanges changes(index, packages);
    OwnMoves own;
    SafeSaves saves(index, changes, own);
    EntryMerger merger(index, changes, saves);
    EntryLook root = lookAt(folderMode);
    root.status.fileID = FileID{2};
    (void)index.add(noRow, {}, EntryMerger::valuesOf(root));
    const EntryLook earlier = lookAt(fileMode);
    EntryLook later = earlier;
    later.status.birth = {1'500, 0};
    const RowNumber first = merger.merge(rootRow, "first", earlier);
    ASSERT_NE(first, noRow);
    const RowNumber link = merger.merge(rootRow, "link", earlier);
    ASSERT_NE(link, noRow);
    const RowNumber second = merger.merge(rootRow, "second", later);
    ASSERT_NE(second, noRow);
    EXPECT_TRUE(index.row(first).has(Row::limbo));
    EXPECT_TRUE(index.row(link).has(Row::limbo));
    EXPECT_FALSE(index.row(second).has(Row::limbo));
}

}  // namespace
}  // namespace marrowdale::native
