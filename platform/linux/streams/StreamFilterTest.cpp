#include <gtest/gtest.h>

#include "platform/linux/streams/StreamFilter.h"

namespace marrowdale::native {
namespace {

constexpr DeviceID volume{5};
constexpr DeviceID other{6};

std::string pathOf(const StreamFilter& filter, std::string_view path,
                   std::uint32_t flags = FileEventFlag::changed) {
    const auto event = filter.take({.flags = flags, .path = path});
    return event ? *event->path : "-";
}

TEST(StreamFilterTest, AnEventBelongsAtOrBelowOneOfThePaths) {
    const StreamFilter filter({"/r/a", "/r/b c/d/"}, {}, "/r", volume);
    EXPECT_TRUE(filter.isRecorded());
    EXPECT_EQ(pathOf(filter, "a"), "/r/a");
    EXPECT_EQ(pathOf(filter, "a/x/y"), "/r/a/x/y");
    EXPECT_EQ(pathOf(filter, "ab"), "-");
    EXPECT_EQ(pathOf(filter, "b c/d"), "/r/b c/d");
    EXPECT_EQ(pathOf(filter, "b c"), "-");
    EXPECT_EQ(pathOf(filter, ""), "-");
    EXPECT_EQ(pathOf(filter, "x/a"), "-");
}

TEST(StreamFilterTest, TheRootItselfTakesAll) {
    for (const std::string root : {"/r", "/"}) {
        const StreamFilter filter({root}, {}, root, volume);
        EXPECT_TRUE(filter.isRecorded());
        EXPECT_EQ(pathOf(filter, ""), root);
        EXPECT_EQ(pathOf(filter, "x"), root == "/" ? "/x" : "/r/x");
        EXPECT_EQ(pathOf(filter, "/.docid/1/changed/2/src=3,dst=4", FileEventFlag::documentMoved),
                  "-");
    }
}

TEST(StreamFilterTest, WhatLiesElsewhereIsNotRecorded) {
    EXPECT_FALSE(StreamFilter({"/r/a", "/other"}, {}, "/r", volume).isRecorded());
    EXPECT_FALSE(StreamFilter({"/ra"}, {}, "/r", volume).isRecorded());
    EXPECT_FALSE(StreamFilter({"r"}, {}, "/r", volume).isRecorded());
    EXPECT_FALSE(StreamFilter({""}, {}, "/r", volume).isRecorded());
    const StreamFilter above({"/"}, {}, "/r", volume);
    EXPECT_FALSE(above.isRecorded());
    EXPECT_EQ(pathOf(above, "x"), "/r/x");
}

TEST(StreamFilterTest, TheFeedOfADeviceHasMovesAlone) {
    const StreamFilter filter({"/.docid"}, volume, "/r", volume);
    EXPECT_TRUE(filter.isRecorded());
    EXPECT_EQ(pathOf(filter, "/.docid/5/changed/2/src=3,dst=4", FileEventFlag::documentMoved),
              "/.docid/5/changed/2/src=3,dst=4");
    EXPECT_EQ(pathOf(filter, "x"), "-");
    EXPECT_EQ(pathOf(filter, ""), "-");
    EXPECT_FALSE(StreamFilter({"/.docid"}, other, "/r", volume).isRecorded());
    EXPECT_FALSE(StreamFilter({"/else"}, volume, "/r", volume).isRecorded());
}

TEST(StreamFilterTest, AnEventKeepsWhatItTells) {
    const StreamFilter filter({"/r"}, {}, "/r", volume);
    const auto event = filter.take({.id = EventID{9},
                                    .flags = 0xFFC8'0001,
                                    .fileID = FileID{3},
                                    .goneDocument = DocumentID{4},
                                    .path = "p"});
    ASSERT_TRUE(event);
    EXPECT_EQ(event->id, EventID{9});
    EXPECT_EQ(event->flags, 0xFFC8'0001U);
    EXPECT_EQ(event->fileID, FileID{3});
    EXPECT_EQ(event->goneDocument, DocumentID{4});
    EXPECT_FALSE(filter.take({.flags = 1, .path = "p"})->fileID);
}

}  // namespace
}  // namespace marrowdale::native
