#include <limits>
#include <set>

#include <gtest/gtest.h>

#include "providers/marrowdale/fs/FSEventDescription.h"

namespace marrowdale {
namespace {

struct FlagCase {
    std::uint32_t flags;
    const char* names;
};

class FlagNamesTest : public ::testing::TestWithParam<FlagCase> {};

TEST_P(FlagNamesTest, areJoinedBySlashes) {
    EXPECT_EQ(flagNames(GetParam().flags), GetParam().names);
}

INSTANTIATE_TEST_SUITE_P(
    Table, FlagNamesTest,
    ::testing::Values(
        FlagCase{0, ""}, FlagCase{FileEventFlag::userDropped, "userDropped"},
        FlagCase{FileEventFlag::kernelDropped, "kernelDropped"},
        FlagCase{FileEventFlag::eventIDsWrapped, "eventIDsWrapped"},
        FlagCase{FileEventFlag::historyDone, "historyDone"},
        FlagCase{FileEventFlag::appeared, "appeared"}, FlagCase{FileEventFlag::changed, "changed"},
        FlagCase{FileEventFlag::renamed, "renamed"}, FlagCase{FileEventFlag::gone, "gone"},
        FlagCase{FileEventFlag::isFolder, "isFolder"},
        FlagCase{FileEventFlag::documentMoved, "documentMoved"},
        FlagCase{FileEventFlag::renamed | FileEventFlag::gone | FileEventFlag::isFolder,
                 "renamed/gone/isFolder"},
        FlagCase{FileEventFlag::userDropped | FileEventFlag::kernelDropped,
                 "userDropped/kernelDropped"},
        FlagCase{0x4000'0001, "0x40000001"},
        FlagCase{FileEventFlag::changed | 0x8000'0000, "changed/0x80000000"},
        FlagCase{std::numeric_limits<std::uint32_t>::max(),
                 "userDropped/kernelDropped/eventIDsWrapped/historyDone/appeared/changed/renamed/"
                 "gone/isFolder/documentMoved/0xffc0ffe1"}));

// Each of the 32 bits has a text of its own, so that none is lost.
TEST(FSEventDescriptionTest, everyBitIsTold) {
    std::set<std::string> names;
    for (unsigned bit = 0; bit < 32; ++bit) {
        const std::string text = flagNames(std::uint32_t{1} << bit);
        EXPECT_FALSE(text.empty());
        EXPECT_TRUE(names.insert(text).second) << text;
    }
}

TEST(FSEventDescriptionTest, anEventShowsAllItHas) {
    FileEvent event{.id = EventID{std::numeric_limits<std::uint64_t>::max()},
                    .flags = FileEventFlag::changed | FileEventFlag::isFolder,
                    .path = "/a \xff",
                    .fileID = FileID{7},
                    .goneDocument = {}};
    EXPECT_EQ(description(event),
              "(changed/isFolder) \"/a \xff\" fileID:7 eventID:18446744073709551615");
    event.fileID = std::nullopt;
    event.path = std::nullopt;
    EXPECT_EQ(description(event),
              "(changed/isFolder) \"\" fileID:unspecified eventID:18446744073709551615");
}

TEST(FSEventDescriptionTest, aMovedDocumentShowsItsNumbers) {
    EXPECT_EQ(description(DocIDChange{42, 100, -200}), "<docID:42 src:100 dst:-200>");
}

}  // namespace
}  // namespace marrowdale
