// Which rows make an index: what a log or a snapshot may hold of names and places.

#include <string>

#include <gtest/gtest.h>

#include "platform/linux/store/Index.h"

namespace marrowdale::native {
namespace {

class IndexRestoreTest : public testing::Test {
  protected:
    static Row valuesOf(RowKind kind, RowNumber parent, std::uint64_t fileID) {
        Row values{};
        values.fileID = fileID;
        values.parent = parent;
        values.flags = static_cast<std::uint32_t>(kind);
        return values;
    }
    IndexRestoreTest() {
        restore(rootRow, RowKind::folder, noRow, "");
        restore(folder_, RowKind::folder, rootRow, "folder");
    }
    void restore(RowNumber row, RowKind kind, RowNumber parent, const std::string& name) {
        index_.restoreRow(row, valuesOf(kind, parent, row + 100), name);
    }
    // With one more row.
    [[nodiscard]] bool isGoodWith(RowKind kind, RowNumber parent, const std::string& name) {
        restore(3, kind, parent, name);
        return index_.finishRestoring();
    }

    static constexpr RowNumber folder_ = 2;
    Index index_;
};

TEST_F(IndexRestoreTest, ALibraryHangsBelowTheRootAndIsNoSubfolderOfIt) {
    ASSERT_TRUE(isGoodWith(RowKind::folder, rootRow, "/org.example.A"));
    EXPECT_TRUE(index_.isLibrary(3));
    EXPECT_TRUE(index_.isRoot(3));
    EXPECT_FALSE(index_.isRoot(folder_));
    EXPECT_EQ(index_.row(rootRow).subfolders(), 1U);
    std::string path;
    ASSERT_TRUE(index_.path(3, path));
    EXPECT_EQ(path, "/org.example.A");
    index_.putInLimbo(3);
    EXPECT_EQ(index_.row(rootRow).subfolders(), 1U);
}

TEST_F(IndexRestoreTest, ALibraryBelowAnotherFolderIsDamage) {
    EXPECT_FALSE(isGoodWith(RowKind::folder, folder_, "/org.example.A"));
}

TEST_F(IndexRestoreTest, AFileIsNoLibrary) {
    EXPECT_FALSE(isGoodWith(RowKind::file, rootRow, "/org.example.A"));
}

TEST_F(IndexRestoreTest, AKeyIsNotEmpty) {
    EXPECT_FALSE(isGoodWith(RowKind::folder, rootRow, "/"));
}

TEST_F(IndexRestoreTest, ANameWithASlashInItIsDamage) {
    EXPECT_FALSE(isGoodWith(RowKind::file, folder_, "a/b"));
}

TEST_F(IndexRestoreTest, AKeyWithASlashInItIsDamage) {
    EXPECT_FALSE(isGoodWith(RowKind::folder, rootRow, "/a/b"));
}

// Logs were written that say so of rows which they never had.
TEST(IndexRestoreAttributesTest, ARowThatIsNotThereHasNone) {
    Index index;
    EXPECT_TRUE(index.restoreAttributes(7, {}));
    EXPECT_FALSE(index.restoreAttributes(7, {{"user.tag", "red"}}));
    EXPECT_FALSE(index.restoreAttributes(noRow, {}));
}

}  // namespace
}  // namespace marrowdale::native
