// The history that is kept of a tree: the same, whichever way it was followed.

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include "platform/linux/store/StoreEventsTestSupport.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

TEST_P(StoreEventsTest, NothingHappened) {
    write("a");
    write("folder/b");
    begin();
    EXPECT_THAT(news(), IsEmpty());
    EXPECT_THAT(news(), IsEmpty());
}

TEST_P(StoreEventsTest, MadeChangedAndDeleted) {
    write("kept");
    write("changed");
    write("deleted");
    begin();
    write("made");
    write("changed", "something longer");
    remove("deleted");
    EXPECT_THAT(newsOnce(), ElementsAre("gone deleted", testing::_, testing::_));
    settle();
    write("made", "other");
    EXPECT_THAT(newsOnce(), ElementsAre("changed made"));
}

TEST_P(StoreEventsTest, WhatIsGoneComesFirst) {
    write("b");
    begin();
    write("a");
    remove("b");
    write("c");
    EXPECT_THAT(newsOnce(), ElementsAre("gone b", testing::StartsWith("appeared"),
                                        testing::StartsWith("appeared")));
}

TEST_P(StoreEventsTest, MetadataOfFilesAndFolders) {
    write("file");
    write("folder/inside");
    begin();
    ASSERT_EQ(::chmod(path("file").c_str(), 0600), 0);
    EXPECT_THAT(newsOnce(), ElementsAre("changed file"));
    ASSERT_EQ(::chmod(path("folder").c_str(), 0700), 0);
    EXPECT_THAT(newsOnce(), ElementsAre("changed folder/"));
    settle();
    write("folder/another");
    EXPECT_THAT(newsOnce(), ElementsAre("appeared folder/another")) << "not the folder itself";
}

TEST_P(StoreEventsTest, AttributesOfFilesAndFolders) {
    write("file");
    makeFolder(path("folder"));
    if (::setxattr(path("file").c_str(), "user.probe", "1", 1, 0) != 0) {
        MARROWDALE_SKIP("this file system keeps no user attributes");
    }
    begin();
    ASSERT_EQ(::setxattr(path("folder").c_str(), "user.tag", "red", 3, 0), 0);
    EXPECT_THAT(newsOnce(), ElementsAre("changed folder/"));
    ASSERT_EQ(::setxattr(path("folder").c_str(), "user.tag", "rot", 3, 0), 0);
    EXPECT_THAT(newsOnce(), ElementsAre("changed folder/"));
    ASSERT_EQ(::setxattr(path("file").c_str(), "user.tag", "red", 3, 0), 0);
    EXPECT_THAT(newsOnce(), ElementsAre("changed file"));
}

TEST_P(StoreEventsTest, AFolderRenamedInTheTreeHasTwoEventsAndItsContentsNone) {
    write("from/deep/a");
    write("from/b");
    begin();
    rename("from", "to");
    EXPECT_THAT(newsOnce(), ElementsAre("gone+renamed from/", "renamed to/"));
    settle();
    write("to/deep/a", "changed");
    EXPECT_THAT(newsOnce(), ElementsAre("changed to/deep/a")) << "it is still followed";
}

TEST_P(StoreEventsTest, AFolderRenamedWhileItsContentsChange) {
    write("from/a");
    write("from/b");
    begin();
    write("from/c");
    rename("from", "to");
    write("to/d");
    remove("to/a");
    EXPECT_THAT(newsOnce(),
                UnorderedElementsAre("gone+renamed from/", "renamed to/", "appeared to/c",
                                     "appeared to/d", testing::AnyOf("gone from/a", "gone to/a")));
}

TEST_P(StoreEventsTest, AFolderMovedInIsTakenWhole) {
    begin();
    const std::string outside = root() + "-outside";
    makeFolder(outside + "/deep");
    writeFile(outside + "/a", "x");
    writeFile(outside + "/deep/b", "x");
    std::filesystem::rename(outside, path("in"));
    EXPECT_THAT(newsOnce(), UnorderedElementsAre("appeared in/", "appeared in/a",
                                                 "appeared in/deep/", "appeared in/deep/b"));
    settle();
    write("in/deep/b", "changed");
    EXPECT_THAT(newsOnce(), ElementsAre("changed in/deep/b"));
}

TEST_P(StoreEventsTest, AFolderMovedOutTakesEverythingWithIt) {
    write("folder/deep/a");
    write("folder/b");
    begin();
    const auto a = documentOf("folder/deep/a");
    (void)news();
    std::filesystem::rename(path("folder"), root() + "-outside");
    EXPECT_THAT(newsOnce(),
                UnorderedElementsAre("gone folder/", "gone folder/deep/",
                                     "gone folder/deep/a (did=" + std::to_string(raw(a)) + ")",
                                     "gone folder/b"));
    writeFile(root() + "-outside/deep/a", "not ours");
    EXPECT_THAT(news(), IsEmpty());
}

TEST_P(StoreEventsTest, ADeletedTreeTellsOfEveryDocument) {
    std::vector<std::string> expected;
    for (int i = 0; i < 30; ++i) {
        write("tree/" + std::to_string(i % 3) + "/" + std::to_string(i));
    }
    begin();
    for (int i = 0; i < 30; ++i) {
        const std::string below = "tree/" + std::to_string(i % 3) + "/" + std::to_string(i);
        expected.push_back("gone " + below + " (did=" + std::to_string(raw(documentOf(below))) +
                           ")");
    }
    (void)news();
    expected.insert(expected.end(), {"gone tree/", "gone tree/0/", "gone tree/1/", "gone tree/2/"});
    remove("tree");
    EXPECT_THAT(newsOnce(), testing::UnorderedElementsAreArray(expected));
}

TEST_P(StoreEventsTest, AFolderSwappedForAnotherOfTheSameName) {
    write("folder/a");
    begin();
    remove("folder");
    write("folder/b");
    EXPECT_THAT(newsOnce(), UnorderedElementsAre("gone folder/", "gone folder/a",
                                                 "appeared folder/", "appeared folder/b"));
}

TEST_P(StoreEventsTest, ADeepChainMadeAtOnce) {
    begin();
    std::string chain = "0";
    for (int i = 1; i < 40; ++i) {
        chain += "/" + std::to_string(i);
    }
    write(chain + "/file");
    auto texts = newsOnce();
    EXPECT_EQ(texts.size(), 41U);
    EXPECT_THAT(texts, Contains("appeared " + chain + "/file"));
}

TEST_P(StoreEventsTest, WhatLiesInAPackageIsAChangeOfThePackage) {
    write("doc.bundle/text");
    begin();
    write("doc.bundle/text", "longer text");
    write("doc.bundle/deep/picture");
    EXPECT_THAT(newsOnce(), ElementsAre("changed doc.bundle"));
    remove("doc.bundle/text");
    EXPECT_THAT(newsOnce(), ElementsAre("changed doc.bundle"));
    const auto document = documentOf("doc.bundle");
    settle();
    (void)news();
    remove("doc.bundle");
    EXPECT_THAT(newsOnce(),
                ElementsAre("gone doc.bundle (did=" + std::to_string(raw(document)) + ")"));
}

TEST_P(StoreEventsTest, AFolderThatBecomesAPackageTakesItsContentsOutOfSight) {
    write("folder/a");
    begin();
    rename("folder", "folder.bundle");
    EXPECT_THAT(newsOnce(),
                ElementsAre("gone+renamed folder/", "gone folder/a", "renamed folder.bundle"));
    rename("folder.bundle", "folder");
    EXPECT_THAT(newsOnce(),
                ElementsAre("gone+renamed folder.bundle", "renamed folder/", "appeared folder/a"));
}

TEST_P(StoreEventsTest, EachNameOfAFileIsAnItem) {
    write("a");
    begin();
    link("a", "b");
    EXPECT_THAT(newsOnce(), UnorderedElementsAre("appeared b", "changed a"));
    const auto document = documentOf("a");
    EXPECT_EQ(documentOf("b"), document);
    (void)news();
    remove("a");
    EXPECT_THAT(newsOnce(), testing::AllOf(Contains("gone a"),
                                           testing::Not(Contains(testing::HasSubstr("did=")))));
    EXPECT_EQ(placeOf(document), "b");
    remove("b");
    EXPECT_THAT(newsOnce(), ElementsAre("gone b (did=" + std::to_string(raw(document)) + ")"));
}

TEST_P(StoreEventsTest, ANameThatGoesOutOfSightLeavesTheOthers) {
    write("a");
    makeFolder(path("folder"));
    link("a", "folder/b");
    begin();
    const auto document = documentOf("a");
    (void)news();
    rename("folder", "folder.bundle");
    EXPECT_THAT(newsOnce(), ElementsAre("gone+renamed folder/", "gone folder/b",
                                        "renamed folder.bundle", "changed a"));
    EXPECT_EQ(documentOf("a"), document);
}

TEST_P(StoreEventsTest, ANameThatIsMovedOutWithItsFolderLeavesTheOthers) {
    write("a");
    makeFolder(path("folder"));
    link("a", "folder/b");
    begin();
    const auto document = documentOf("a");
    (void)news();
    std::filesystem::rename(path("folder"), root() + "-outside");
    EXPECT_THAT(newsOnce(), UnorderedElementsAre(testing::StartsWith("gone folder/ "),
                                                 "gone folder/b", "changed a"));
    EXPECT_EQ(documentOf("a"), document);
}

TEST_P(StoreEventsTest, ANameThatIsRenamedLeavesTheOthers) {
    write("a");
    link("a", "b");
    begin();
    const auto document = documentOf("a");
    (void)news();
    rename("a", "c");
    // Where nobody listened, one name went and another came.
    const std::vector<std::string> live{"gone+renamed a", "renamed c", "changed b"};
    const std::vector<std::string> result{"gone a", "changed b", "appeared c"};
    EXPECT_THAT(newsOnce(), testing::UnorderedElementsAreArray(isLive() ? live : result));
    EXPECT_EQ(documentOf("b"), document);
}

// Whoever read events meanwhile found nothing where they say. What nobody could read of is not
// told.
TEST_P(StoreEventsTest, AFolderThatWasAwayForAMomentIsToldToBeBack) {
    write("folder/a");
    link("folder/a", "b");
    begin();
    rename("folder", "elsewhere");
    rename("elsewhere", "folder");
    const std::vector<std::string> back{"renamed folder/", "changed b"};
    EXPECT_EQ(newsOnce(), isLive() ? back : std::vector<std::string>());
}

TEST_P(StoreEventsTest, AFileThatWasAwayForAMomentIsToldWithItsOtherNames) {
    write("a");
    link("a", "b");
    begin();
    rename("a", "elsewhere");
    rename("elsewhere", "a");
    // Where nobody listened, its times tell.
    EXPECT_THAT(newsOnce(),
                UnorderedElementsAre(isLive() ? "renamed a" : "changed a", "changed b"));
}

TEST_P(StoreEventsTest, AWriteThroughANameOutsideTheTree) {
    write("a");
    const std::string outside = root() + "-outside";
    std::filesystem::create_hard_link(path("a"), outside);
    begin();
    writeFile(outside, "written through the other name");
    EXPECT_THAT(newsOnce(), ElementsAre("changed a"));
}

TEST_P(StoreEventsTest, HostileNames) {
    const std::vector<std::string> names{"new\nline", "\xff\xfe",  std::string(255, 'n'),
                                         "-rf",       "a\x1b[31m", " "};
    begin();
    std::vector<std::string> expected;
    for (const auto& name : names) {
        write(name);
        expected.push_back("appeared " + name);
    }
    EXPECT_THAT(newsOnce(), testing::UnorderedElementsAreArray(expected));
}

TEST_P(StoreEventsTest, LinksPipesAndDevicesAreEntries) {
    begin();
    std::filesystem::create_symlink("nowhere", path("link"));
    ASSERT_EQ(::mkfifo(path("pipe").c_str(), 0600), 0);
    EXPECT_THAT(newsOnce(), UnorderedElementsAre("appeared link", "appeared pipe"));
}

TEST_P(StoreEventsTest, AnInodeNumberThatIsGivenToAnotherFile) {
    write("first");
    begin();
    const auto first = documentOf("first");
    (void)news();
    for (int i = 0; i < 50; ++i) {
        const auto number = status("first").fileID;
        remove("first");
        write("second");
        const bool isReused = status("second").fileID == number;
        const auto texts = news();
        EXPECT_THAT(texts, Contains(testing::StartsWith("gone first")));
        EXPECT_THAT(texts, Contains("appeared second"));
        EXPECT_NE(documentOf("second"), first);
        if (isReused) {
            break;
        }
        rename("second", "first");
        (void)news();
    }
}

// Where nobody listens, the new file is known first, because somebody asks for its identifier.
TEST_P(StoreEventsTest, AFileIsGoneNoLaterThanItsNumberIsToldAsAnothers) {
    write("first");
    begin();
    (void)news();
    for (int i = 0; i < 50; ++i) {
        bool isReused = false;
        withStore([&] {
            const auto number = status("first").fileID;
            remove("first");
            write("second");
            isReused = status("second").fileID == number;
            (void)assign("");
        });
        const auto texts = news();
        const auto gone = std::ranges::find_if(texts, [](const std::string& text) {
            return text.starts_with("gone") && text.contains(" first");
        });
        const auto appeared = std::ranges::find(texts, "appeared second");
        ASSERT_NE(gone, texts.end());
        ASSERT_NE(appeared, texts.end());
        if (isReused) {
            EXPECT_LT(gone, appeared) << testing::PrintToString(texts);
            return;
        }
        rename("second", "first");
        (void)news();
    }
}

TEST_P(StoreEventsTest, AFileThatWasMadeAndDeletedIsNotTold) {
    begin();
    write("passing");
    remove("passing");
    EXPECT_THAT(news(), IsEmpty());
}

TEST_P(StoreEventsTest, AReadableFolderThatWasUnreadable) {
    if (::geteuid() == 0) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    write("folder/a");
    ASSERT_EQ(::chmod(path("folder").c_str(), 0), 0);
    begin();
    ASSERT_EQ(::chmod(path("folder").c_str(), 0700), 0);
    EXPECT_THAT(newsOnce(), UnorderedElementsAre("changed folder/", "appeared folder/a"));
}

INSTANTIATE_TEST_SUITE_P(OnEach, StoreEventsTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Following::fanotify, Following::inotify,
                                                          Following::restart)),
                         nameOf);

}  // namespace
}  // namespace marrowdale::native
