#include <gtest/gtest.h>

#include "platform/linux/streams/StreamFilter.h"

namespace marrowdale::native {
namespace {

constexpr DeviceID volume{5};
constexpr DeviceID other{6};

std::vector<EventRoot> roots(const std::string& root,
                             const std::vector<EventRoot>& libraries = {}) {
    std::vector<EventRoot> all{{{}, root, true}};
    all.insert(all.end(), libraries.begin(), libraries.end());
    return all;
}

std::string pathOf(const StreamFilter& filter, std::string_view path,
                   std::uint32_t flags = FileEventFlag::changed) {
    const auto event = filter.take({.flags = flags, .path = path});
    return event ? *event->path : "-";
}

TEST(StreamFilterTest, AnEventBelongsAtOrBelowOneOfThePaths) {
    const StreamFilter filter({"/r/a", "/r/b c/d/"}, {}, roots("/r"), volume);
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
        const StreamFilter filter({root}, {}, roots(root), volume);
        EXPECT_TRUE(filter.isRecorded());
        EXPECT_EQ(pathOf(filter, ""), root);
        EXPECT_EQ(pathOf(filter, "x"), root == "/" ? "/x" : "/r/x");
        EXPECT_EQ(pathOf(filter, "/.docid/1/changed/2/src=3,dst=4", FileEventFlag::documentMoved),
                  "-");
    }
}

TEST(StreamFilterTest, WhatLiesElsewhereIsNotRecorded) {
    EXPECT_FALSE(StreamFilter({"/r/a", "/other"}, {}, roots("/r"), volume).isRecorded());
    EXPECT_FALSE(StreamFilter({"/ra"}, {}, roots("/r"), volume).isRecorded());
    EXPECT_FALSE(StreamFilter({"r"}, {}, roots("/r"), volume).isRecorded());
    EXPECT_FALSE(StreamFilter({""}, {}, roots("/r"), volume).isRecorded());
    const StreamFilter above({"/"}, {}, roots("/r"), volume);
    EXPECT_FALSE(above.isRecorded());
    EXPECT_EQ(pathOf(above, "x"), "/r/x");
}

TEST(StreamFilterTest, EventsOfALibraryAreToldWhereItStands) {
    const auto all = roots("/r", {{"/org.a", "/apps/a", true}, {"/org.ab", "/apps/ab", true}});
    const StreamFilter filter({"/r", "/apps/a/"}, {}, all, volume);
    EXPECT_TRUE(filter.isRecorded());
    EXPECT_EQ(pathOf(filter, "x"), "/r/x");
    EXPECT_EQ(pathOf(filter, "/org.a"), "/apps/a");
    EXPECT_EQ(pathOf(filter, "/org.a/x/y"), "/apps/a/x/y");
    EXPECT_EQ(pathOf(filter, "/org.ab/x"), "-") << "another library";
    EXPECT_EQ(pathOf(filter, "/org.c/x"), "-") << "none any more";
    EXPECT_EQ(pathOf(filter, "/org.a/1/changed/2/src=3,dst=4", FileEventFlag::documentMoved), "-");
}

TEST(StreamFilterTest, ALibraryIsNotPartOfTheRoot) {
    const auto all = roots("/r", {{"/org.a", "/apps/a", true}});
    const StreamFilter root({"/r"}, {}, all, volume);
    EXPECT_TRUE(root.isRecorded());
    EXPECT_EQ(pathOf(root, "/org.a/x"), "-");
    const StreamFilter below({"/apps/a/in"}, {}, all, volume);
    EXPECT_TRUE(below.isRecorded());
    EXPECT_EQ(pathOf(below, "/org.a/in/x"), "/apps/a/in/x");
    EXPECT_EQ(pathOf(below, "/org.a/x"), "-");
    EXPECT_EQ(pathOf(below, "in/x"), "-");
}

TEST(StreamFilterTest, AFolderAboveTakesWhatIsRecordedInIt) {
    const auto all = roots("/home/r", {{"/org.a", "/home/apps/a", true}});
    const StreamFilter above({"/home"}, {}, all, volume);
    EXPECT_FALSE(above.isRecorded());
    EXPECT_EQ(pathOf(above, "x"), "/home/r/x");
    EXPECT_EQ(pathOf(above, "/org.a/x"), "/home/apps/a/x");
}

TEST(StreamFilterTest, WhatIsMissedInALibraryIsDropped) {
    const auto all = roots("/r", {{"/org.a", "/apps/a", false}, {"/org.b", "/apps/b", true}});
    EXPECT_FALSE(StreamFilter({"/r", "/apps/a"}, {}, all, volume).isRecorded());
    EXPECT_TRUE(StreamFilter({"/r", "/apps/b"}, {}, all, volume).isRecorded());
    EXPECT_FALSE(StreamFilter({"/r", "/apps/c"}, {}, all, volume).isRecorded());
}

TEST(StreamFilterTest, TheFeedOfADeviceHasMovesAlone) {
    const StreamFilter filter({"/.docid"}, volume, roots("/r"), volume);
    EXPECT_TRUE(filter.isRecorded());
    EXPECT_EQ(pathOf(filter, "/.docid/5/changed/2/src=3,dst=4", FileEventFlag::documentMoved),
              "/.docid/5/changed/2/src=3,dst=4");
    EXPECT_EQ(pathOf(filter, "x"), "-");
    EXPECT_EQ(pathOf(filter, ""), "-");
    EXPECT_FALSE(StreamFilter({"/.docid"}, other, roots("/r"), volume).isRecorded());
    EXPECT_FALSE(StreamFilter({"/else"}, volume, roots("/r"), volume).isRecorded());
}

TEST(StreamFilterTest, AnEventKeepsWhatItTells) {
    const StreamFilter filter({"/r"}, {}, roots("/r"), volume);
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
