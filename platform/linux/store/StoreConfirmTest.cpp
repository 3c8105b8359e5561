// Nobody is told of a folder that the history would not tell the end of.

#include "platform/linux/store/StoreEventsTestSupport.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsSupersetOf;
using testing::StartsWith;

class StoreConfirmTest : public StoreEventsTest {
  protected:
    // The folders of these that are there, of a folder's entries as they were seen.
    [[nodiscard]] std::vector<std::string> confirmed(FolderRequests& seen) {
        std::vector<std::string> names;
        withStore([&] {
            const auto done = store().confirmFolders(seen.requests);
            ASSERT_TRUE(done) << done.error().description();
            for (const auto& request : seen.requests) {
                if (request.isThere) {
                    names.emplace_back(request.name);
                }
            }
        });
        return names;
    }
    [[nodiscard]] std::vector<std::string> confirmed(const std::string& folder) {
        auto seen = requestsFor(folder);
        return confirmed(seen);
    }
};

TEST_P(StoreConfirmTest, AFolderIsKnownOnceItWasConfirmed) {
    makeFolder(path("old"));
    begin();
    makeFolder(path("new"));
    EXPECT_THAT(confirmed(""), testing::UnorderedElementsAre("new", "old"));
    EXPECT_THAT(news(), ElementsAre("appeared new/"));
    remove("new");
    remove("old");
    EXPECT_THAT(newsOnce(), testing::UnorderedElementsAre("gone new/", "gone old/"));
}

TEST_P(StoreConfirmTest, AFolderOfAFolderThatIsNew) {
    begin();
    makeFolder(path("a/b"));
    EXPECT_THAT(confirmed("a"), ElementsAre("b"));
    remove("a");
    EXPECT_THAT(news(), Contains("gone a/b/"));
}

TEST_P(StoreConfirmTest, AFolderThatWentBeforeItWasKnownIsNotThere) {
    begin();
    makeFolder(path("gone"));
    makeFolder(path("kept"));
    auto seen = requestsFor("");
    remove("gone");
    EXPECT_THAT(confirmed(seen), ElementsAre("kept"));
}

TEST_P(StoreConfirmTest, AFolderThatMovedBeforeItWasKnownIsNotThere) {
    begin();
    makeFolder(path("from"));
    auto seen = requestsFor("");
    rename("from", "to");
    EXPECT_TRUE(confirmed(seen).empty());
    EXPECT_THAT(confirmed(""), ElementsAre("to"));
}

TEST_P(StoreConfirmTest, AnotherFolderAtItsNameIsNotIt) {
    begin();
    makeFolder(path("folder"));
    auto seen = requestsFor("");
    rename("folder", "away");
    makeFolder(path("folder"));
    EXPECT_TRUE(confirmed(seen).empty());
}

TEST_P(StoreConfirmTest, AFolderWhoseContentsChangedIsTheSame) {
    makeFolder(path("folder"));
    begin();
    auto seen = requestsFor("");
    settle();
    write("folder/file");
    EXPECT_THAT(confirmed(seen), ElementsAre("folder"));
}

// The tree holds the store itself.
TEST_P(StoreConfirmTest, WhatIsNeverIndexedIsThereAsItWasSeen) {
    setState(path("state"));
    begin();
    EXPECT_THAT(confirmed(""), ElementsAre("state"));
    EXPECT_THAT(confirmed("state"), Contains(StartsWith("store-")));
}

TEST_P(StoreConfirmTest, WhatIsInAFolderThatCannotBeListed) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    makeFolder(path("dark/inside"));
    auto seen = requestsFor("dark");
    std::filesystem::permissions(path("dark"), std::filesystem::perms::owner_exec);
    begin();
    EXPECT_THAT(confirmed(seen), ElementsAre("inside"));
    std::filesystem::permissions(path("dark"), std::filesystem::perms::owner_all);
}

// A look-up takes note of the folder, and the recorder comes to it later.
TEST_P(StoreConfirmTest, WhatIsInAFolderThatWasLookedUpFirst) {
    begin();
    makeFolder(path("folder/inner"));
    makeFolder(path("moved"));
    withStore([&] {
        for (const char* folder : {"folder", "moved"}) {
            EXPECT_EQ(
                store()
                    .permanentStorageForItemAtURL(URL::fileURL(path(folder)), AllocateIfNone::no)
                    .error()
                    .code,
                ENOENT);
        }
    });
    rename("moved", "elsewhere");
    EXPECT_THAT(newsOnce(),
                IsSupersetOf({"appeared folder/", "appeared folder/inner/", "renamed elsewhere/"}));
    write("folder/file");
    write("folder/inner/file");
    write("elsewhere/file");
    EXPECT_THAT(newsOnce(), IsSupersetOf({"appeared folder/file", "appeared folder/inner/file",
                                          "appeared elsewhere/file"}));
}

INSTANTIATE_TEST_SUITE_P(OnEach, StoreConfirmTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Following::fanotify, Following::inotify,
                                                          Following::restart)),
                         nameOf);

}  // namespace
}  // namespace marrowdale::native
