#include <gtest/gtest.h>

#include "platform/linux/events/WatchTable.h"

namespace marrowdale::native {
namespace {

using Role = Watched::Role;
using Handles = WatchTable<std::string>;

TEST(WatchTableTest, findsByTheWholeKey) {
    Handles table;
    table.watch(FileID{7}, std::string_view("ab\0c", 4), Role::folder);
    ASSERT_TRUE(table.find(std::string_view("ab\0c", 4)));
    EXPECT_EQ(table.find(std::string_view("ab\0c", 4))->number, FileID{7});
    EXPECT_FALSE(table.find(std::string_view("ab\0d", 4)));
    EXPECT_FALSE(table.find("ab"));
    EXPECT_EQ(table.size(), 1U);
}

TEST(WatchTableTest, newFolderUnderTheNumberTakesTheOldOnesPlace) {
    Handles table;
    EXPECT_EQ(table.watch(FileID{7}, "old", Role::root), std::nullopt);
    EXPECT_EQ(table.watch(FileID{7}, "new", Role::folder), "old");
    EXPECT_FALSE(table.find("old"));
    EXPECT_EQ(table.find("new")->role, Role::folder);
    EXPECT_EQ(table.size(), 1U);
}

TEST(WatchTableTest, newNumberOfTheKeyTakesTheOldOnesPlace) {
    WatchTable<int> table;
    table.watch(FileID{7}, 3, Role::folder);
    EXPECT_EQ(table.watch(FileID{8}, 3, Role::folder), std::nullopt);
    EXPECT_EQ(table.find(3)->number, FileID{8});
    EXPECT_EQ(table.unwatch(FileID{7}), std::nullopt);
    EXPECT_EQ(table.size(), 1U);
}

TEST(WatchTableTest, rootStaysOneWhenItComesAgainAsAFolder) {
    Handles table;
    table.watch(FileID{7}, "key", Role::folder);
    table.watch(FileID{7}, "key", Role::root);
    EXPECT_EQ(table.watch(FileID{7}, "key", Role::folder), std::nullopt);
    EXPECT_EQ(table.find("key")->role, Role::root);
}

TEST(WatchTableTest, forgetsByNumberAndByKey) {
    Handles table;
    table.watch(FileID{1}, "one", Role::folder);
    table.watch(FileID{2}, "two", Role::file);
    EXPECT_EQ(table.unwatch(FileID{1}), "one");
    EXPECT_EQ(table.unwatch(FileID{1}), std::nullopt);
    table.forget("two");
    table.forget("two");
    EXPECT_EQ(table.unwatch(FileID{2}), std::nullopt);
    EXPECT_EQ(table.size(), 0U);
}

TEST(WatchTableTest, keyThatLiesInTheTableMayBeGivenAgain) {
    Handles table;
    table.watch(FileID{1}, "a key that is longer than a short string may be", Role::folder);
    const auto key = table.unwatch(FileID{1});
    table.watch(FileID{1}, *key, Role::folder);
    table.watch(FileID{2}, *key, Role::folder);
    EXPECT_EQ(table.find(*key)->number, FileID{2});
}

}  // namespace
}  // namespace marrowdale::native
