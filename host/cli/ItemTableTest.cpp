#include <gtest/gtest.h>

#include "host/cli/ItemTable.h"
#include "host/testing/FakeExtension.h"

namespace marrowdale::host {
namespace {

FileProviderItemPtr fileItem(std::string_view identifier, std::string_view name) {
    auto item = std::make_shared<FakeItem>(identifier, "/root/" + std::string(name));
    item->typeIdentifier = "text/plain";
    item->documentSize = 1234;
    return item;
}

FileProviderItemPtr folderItem(std::string_view identifier, std::string_view name) {
    auto item = std::make_shared<FakeItem>(identifier, "/root/" + std::string(name));
    item->typeIdentifier = "inode/directory";
    item->folder = true;
    return item;
}

TEST(ItemTableTest, columnsAreAligned) {
    ItemTable table(ItemTable::Colour::none);
    EXPECT_EQ(table.page({fileItem("did=1", "a b"), folderItem("fid=12345", "sub")}),
              "did=1      text/plain       1.2 kB  -                 a b\n"
              "fid=12345  inode/directory       -  -                 sub/\n");
    // Never narrower than in the page before.
    EXPECT_EQ(table.page({fileItem("did=2", "c")}),
              "did=2      text/plain       1.2 kB  -                 c\n");
}

TEST(ItemTableTest, namesAreHarmless) {
    ItemTable table(ItemTable::Colour::none);
    const std::string text = table.page({fileItem("did=1", "a\n\x1B[2J")});
    EXPECT_TRUE(text.ends_with("  $'a\\n\\e[2J'\n")) << text;
}

TEST(ItemTableTest, onlyATerminalGetsColour) {
    EXPECT_EQ(ItemTable(ItemTable::Colour::none).page({folderItem("fid=1", "x")}).find('\x1B'),
              std::string::npos);
    EXPECT_TRUE(ItemTable(ItemTable::Colour::terminal)
                    .page({folderItem("fid=1", "x")})
                    .ends_with("\x1B[1;34mx/\x1B[0m\n"));
}

TEST(ItemTableTest, datesOutsideTheYearsOfFourDigitsAreToldAsSuch) {
    const Date late{253'402'300'800, 0};
    EXPECT_EQ(readableTime(late), "after year 9999");
    EXPECT_EQ(readableTime(Date{-62'167'219'201, 0}), "before year 0");
    FakeItem item("did=1");
    item.contentModificationDate = late;
    EXPECT_TRUE(itemDetails(item).contains(
        "  +10000-01-01T00:00:00.000000000Z (outside the years 0 to 9999)\n"));
}

TEST(ItemTableTest, detailsNameWhatThereIs) {
    FakeItem item("did=1", "/root/a\nb");
    item.capabilities = 63;
    item.favoriteRank = Number(std::int64_t{3});
    const std::string text = itemDetails(item);
    EXPECT_TRUE(text.contains("name            $'a\\nb'\n")) << text;
    EXPECT_TRUE(text.contains("allowed         read, write, move, rename, trash, delete\n"))
        << text;
    EXPECT_TRUE(text.contains("favourite rank  3\n")) << text;
    EXPECT_FALSE(text.contains("last used")) << text;
}

}  // namespace
}  // namespace marrowdale::host
