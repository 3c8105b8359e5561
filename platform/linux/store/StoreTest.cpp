#include <algorithm>
#include <fcntl.h>
#include <filesystem>
#include <map>
#include <sys/stat.h>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/Store.h"
#include "platform/linux/store/StoreTestSupport.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

class StoreTest : public StoreTestBase {};

TEST_P(StoreTest, GivesEveryEntryADocumentAndFindsItAgain) {
    write("a");
    write("folder/b");
    write("folder/deep/c");
    open();
    const auto given = assign("");
    const auto below = assign("folder/deep");
    ASSERT_EQ(given.size(), 2U);
    EXPECT_NE(given.at("a"), DocumentID{});
    EXPECT_NE(given.at("a"), given.at("folder"));
    EXPECT_EQ(pathOf(given.at("a")), "a");
    EXPECT_EQ(pathOf(given.at("folder")), "folder");
    EXPECT_EQ(pathOf(below.at("c")), "folder/deep/c");
    EXPECT_EQ(assign(""), given);
    EXPECT_EQ(store().knownDocumentID(status("a")), given.at("a"));
}

TEST_P(StoreTest, IdentifiersSurviveARestart) {
    write("a");
    write("folder/b");
    settle();
    open();
    const auto a = assign("").at("a");
    const auto b = assign("folder").at("b");
    const auto uuid = store().report().uuid;
    reopen();
    EXPECT_EQ(store().report().uuid, uuid);
    EXPECT_EQ(store().report().rebuildReason, "");
    EXPECT_EQ(store().report().reconcile.differences, 0U);
    EXPECT_EQ(pathOf(a), "a");
    EXPECT_EQ(pathOf(b), "folder/b");
    EXPECT_EQ(assign("").at("a"), a);
}

TEST_P(StoreTest, IdentifiersSurviveRenamesAndMovesWhileItRuns) {
    write("a");
    write("from/b");
    makeFolder(path("to"));
    open();
    const auto a = assign("").at("a");
    const auto b = assign("from").at("b");
    rename("a", "renamed");
    rename("from/b", "to/moved");
    EXPECT_EQ(pathOf(a), "renamed");
    EXPECT_EQ(pathOf(b), "to/moved");
    EXPECT_EQ(assign("to").at("moved"), b);
}

TEST_P(StoreTest, ListingAMovedFileKeepsItsDocument) {
    write("from/b");
    makeFolder(path("to"));
    open();
    const auto b = assign("from").at("b");
    rename("from/b", "to/b");
    EXPECT_EQ(assign("to").at("b"), b);
    EXPECT_EQ(pathOf(b), "to/b");
}

TEST_P(StoreTest, IdentifiersSurviveRenamesAndMovesWhileItIsClosed) {
    write("a");
    write("from/b");
    makeFolder(path("to"));
    open();
    const auto a = assign("").at("a");
    const auto b = assign("from").at("b");
    close();
    rename("a", "to/a");
    rename("from/b", "b2");
    rename("to", "from/to");
    open();
    EXPECT_EQ(pathOf(a), "from/to/a");
    EXPECT_EQ(pathOf(b), "b2");
}

TEST_P(StoreTest, AMovedFolderKeepsAllBelowIt) {
    write("x/y/z/file");
    makeFolder(path("elsewhere"));
    open();
    const auto file = assign("x/y/z").at("file");
    const auto folder = status("x/y").fileID;
    rename("x/y", "elsewhere/y2");
    EXPECT_EQ(pathOf(file), "elsewhere/y2/z/file");
    EXPECT_EQ(pathOf(folder), "elsewhere/y2");
    reopen();
    EXPECT_EQ(pathOf(file), "elsewhere/y2/z/file");
}

TEST_P(StoreTest, FoldersThatChangedPlacesAreTold) {
    write("outer/inner/file");
    open();
    const auto file = assign("outer/inner").at("file");
    const auto outer = status("outer").fileID;
    close();
    rename("outer/inner", "inner");
    rename("outer", "inner/outer");
    open();
    EXPECT_EQ(pathOf(file), "inner/file");
    EXPECT_EQ(pathOf(outer), "inner/outer");
}

TEST_P(StoreTest, TwoFilesThatExchangedTheirNamesKeepTheirDocuments) {
    write("a", "first");
    write("b", "second");
    open();
    const auto given = assign("");
    close();
    rename("a", "c");
    rename("b", "a");
    rename("c", "b");
    open();
    EXPECT_EQ(pathOf(given.at("a")), "b");
    EXPECT_EQ(pathOf(given.at("b")), "a");
    reopen();
    EXPECT_EQ(pathOf(given.at("a")), "b");
}

TEST_P(StoreTest, ANewFileNeverInheritsADocumentWithTheInodeNumber) {
    open();
    std::vector<DocumentID> seen;
    for (int i = 0; i < 30; ++i) {
        const std::string name = "f" + std::to_string(i);
        write(name);
        const auto document = assign("").at(name);
        EXPECT_THAT(seen, testing::Not(testing::Contains(document)));
        seen.push_back(document);
        remove(name);
    }
    for (const DocumentID document : seen) {
        EXPECT_EQ(store().resolveDocumentID(document, device()).error().code, ENOENT);
    }
}

TEST_P(StoreTest, ANewFileNeverInheritsADocumentWhileTheStoreIsClosed) {
    std::vector<DocumentID> seen;
    for (int i = 0; i < 10; ++i) {
        const std::string name = "f" + std::to_string(i);
        write(name);
        open();
        const auto document = assign("").at(name);
        EXPECT_THAT(seen, testing::Not(testing::Contains(document)));
        seen.push_back(document);
        close();
        remove(name);
    }
}

TEST_P(StoreTest, AFileThatIsGoneIsENOENT) {
    write("a");
    open();
    const auto a = assign("").at("a");
    const auto fileID = status("a").fileID;
    remove("a");
    EXPECT_EQ(store().resolveDocumentID(a, device()).error().code, ENOENT);
    EXPECT_EQ(store().pathForFileID(device(), fileID).error().code, ENOENT);
    EXPECT_EQ(store().resolveDocumentID(DocumentID{7}, device()).error().code, ENOENT);
    EXPECT_EQ(store().resolveDocumentID(DocumentID{0}, device()).error().code, ENOENT);
    EXPECT_EQ(store().pathForFileID(device(), FileID{0}).error().code, ENOENT);
}

TEST_P(StoreTest, AnotherDeviceIsENXIO) {
    write("a");
    open();
    const auto a = assign("").at("a");
    const DeviceID other{raw(device()) + 1};
    EXPECT_EQ(store().resolveDocumentID(a, other).error().code, ENXIO);
    EXPECT_EQ(store().pathForFileID(other, status("a").fileID).error().code, ENXIO);
}

TEST_P(StoreTest, SeveralNamesOfOneFileAreOneDocumentAndTheOldestStands) {
    write("first");
    makeFolder(path("folder"));
    open();
    const auto document = assign("").at("first");
    link("first", "folder/second");
    EXPECT_EQ(assign("folder").at("second"), document);
    EXPECT_EQ(pathOf(document), "first");
    reopen();
    EXPECT_EQ(assign("").at("first"), document);
    EXPECT_EQ(assign("folder").at("second"), document);
    EXPECT_EQ(pathOf(document), "first");
    remove("first");
    EXPECT_EQ(pathOf(document), "folder/second");
    reopen();
    EXPECT_EQ(pathOf(document), "folder/second");
}

TEST_P(StoreTest, LinksKnownBeforeTheirDocumentShareIt) {
    write("a");
    link("a", "b");
    link("a", "c");
    open();
    const auto given = assign("");
    EXPECT_EQ(given.at("a"), given.at("b"));
    EXPECT_EQ(given.at("a"), given.at("c"));
}

TEST_P(StoreTest, AChangedFileIsStillTheSameDocument) {
    write("a");
    open();
    const auto a = assign("").at("a");
    write("a", "other contents");
    EXPECT_EQ(store().knownDocumentID(status("a")), a);
    EXPECT_EQ(assign("").at("a"), a);
    EXPECT_EQ(pathOf(a), "a");
}

TEST_P(StoreTest, AFolderMadeAfterwardsIsLearnt) {
    open();
    write("new/deep/file");
    const auto file = assign("new/deep").at("file");
    EXPECT_EQ(pathOf(file), "new/deep/file");
    EXPECT_EQ(pathOf(status("new").fileID), "new");
    EXPECT_EQ(store().subfolderCount(status("new").fileID), 1U);
}

TEST_P(StoreTest, AnEntryThatMovedBetweenListingAndAskingKeepsItsDocument) {
    write("a");
    makeFolder(path("to"));
    open();
    auto requests = requestsFor("");
    rename("a", "to/b");
    const auto given = assign(requests);
    EXPECT_EQ(pathOf(given.at("a")), "to/b");
    EXPECT_EQ(assign("to").at("b"), given.at("a"));
}

TEST_P(StoreTest, AnEntryNewAndMovedBetweenListingAndAskingKeepsItsDocument) {
    makeFolder(path("to"));
    open();
    write("a");
    auto requests = requestsFor("");
    rename("a", "to/b");
    const auto given = assign(requests);
    ASSERT_NE(given.at("a"), DocumentID{});
    reopen();
    EXPECT_EQ(pathOf(given.at("a")), "to/b");
    EXPECT_EQ(assign("to").at("b"), given.at("a"));
}

TEST_P(StoreTest, AnEntryGoneBetweenListingAndAskingHasADocumentThatIsGone) {
    open();
    write("a");
    auto requests = requestsFor("");
    EXPECT_TRUE(requests.requests.front().isThere);
    remove("a");
    const auto given = assign(requests);
    EXPECT_FALSE(requests.requests.front().isThere);
    EXPECT_EQ(store().resolveDocumentID(given.at("a"), device()).error().code, ENOENT);
    reopen();
    EXPECT_EQ(store().resolveDocumentID(given.at("a"), device()).error().code, ENOENT);
}

TEST_P(StoreTest, APathThroughALinkIsNotAPlace) {
    write("folder/file");
    open();
    const auto file = assign("folder").at("file");
    rename("folder", "moved");
    std::filesystem::create_directory_symlink("moved", path("folder"));
    EXPECT_EQ(pathOf(file), "moved/file");
}

TEST_P(StoreTest, LinksPipesAndFoldersHaveDocumentsToo) {
    makeFolder(path("folder"));
    std::filesystem::create_symlink("nowhere", path("link"));
    ASSERT_EQ(::mkfifo(path("pipe").c_str(), 0600), 0);
    open();
    const auto given = assign("");
    for (const auto& [name, document] : given) {
        EXPECT_EQ(pathOf(document), name);
    }
    EXPECT_EQ(given.size(), 3U);
}

TEST_P(StoreTest, NamesOfAnyBytesAreKept) {
    const std::vector<std::string> names{"new\nline",           "\x1b[31m",    "\xff\xfe",
                                         std::string(255, 'x'), "-rf",         " ",
                                         "caf\xc3\xa9",         "cafe\xcc\x81"};
    for (const auto& name : names) {
        write(name);
    }
    open();
    const auto given = assign("");
    ASSERT_EQ(given.size(), names.size());
    reopen();
    for (const auto& [name, document] : given) {
        EXPECT_EQ(pathOf(document), name);
    }
}

TEST_P(StoreTest, PathsLongerThanTheKernelTakesAreFound) {
    std::string folder;
    const std::string name(200, 'd');
    UniqueFD at(::open(root().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    for (int i = 0; i < 30; ++i) {
        ASSERT_TRUE(at);
        ASSERT_EQ(::mkdirat(at.get(), name.c_str(), 0700), 0);
        at.reset(::openat(at.get(), name.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
        folder += name + "/";
    }
    ASSERT_TRUE(at);
    const UniqueFD file(::openat(at.get(), "file", O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
    ASSERT_TRUE(file);
    const auto found = statEntry(at.get(), "file");
    ASSERT_TRUE(found);
    open();
    const auto answer = store().pathForFileID(device(), found->fileID);
    ASSERT_TRUE(answer) << answer.error().description();
    EXPECT_EQ(*answer, path(folder + "file"));
}

TEST_P(StoreTest, OnlyNewIdentifiersAreSynced) {
    write("a");
    open();
    (void)assign("");
    const auto before = store().report().logBytes;
    (void)assign("");
    EXPECT_EQ(store().report().logBytes, before);
}

TEST_P(StoreTest, EventIdentifiersOnlyGrow) {
    open();
    auto last = store().barrier();
    ASSERT_TRUE(last);
    for (int i = 0; i < 4; ++i) {
        write("f" + std::to_string(i));
        ASSERT_TRUE(store().reconcile());
        const auto next = store().barrier();
        ASSERT_TRUE(next);
        EXPECT_GT(*next, *last);
        last = next;
        reopen();
        EXPECT_GE(*store().barrier(), *last);
    }
}

TEST_P(StoreTest, NothingChangesNoEventIdentifier) {
    write("a");
    open();
    settle();
    ASSERT_TRUE(store().reconcile());
    const auto before = *store().barrier();
    ASSERT_TRUE(store().reconcile());
    EXPECT_EQ(*store().barrier(), before);
    EXPECT_EQ(store().report().reconcile.differences, 0U);
}

TEST_P(StoreTest, TheVolumeOfTheRootHasTheStoresUUID) {
    write("a");
    open();
    EXPECT_EQ(*store().volumeUUID(URL::fileURL(path("a"))), store().report().uuid);
    EXPECT_EQ(store().volumeUUID(URL::fileURL("/proc/self")).error().code, ENXIO);
    EXPECT_EQ(store().volumeUUID(URL::fileURL(path("none"))).error().code, ENOENT);
}

TEST_P(StoreTest, FilesAreOnlyForTheOwner) {
    write("a");
    open();
    close();
    for (const auto& entry : std::filesystem::recursive_directory_iterator(state())) {
        struct stat found{};
        ASSERT_EQ(::lstat(entry.path().c_str(), &found), 0);
        EXPECT_EQ(found.st_mode & 0077U, 0U) << entry.path();
    }
}

TEST_P(StoreTest, AMissingRootIsAnError) {
    std::filesystem::remove_all(root());
    const auto opened = tryOpen();
    ASSERT_FALSE(opened);
    EXPECT_EQ(opened.error().code, ENOENT);
    EXPECT_EQ(opened.error().subject, root());
    EXPECT_FALSE(std::filesystem::exists(state()));
}

TEST_P(StoreTest, ARootThatIsNoFolderIsAnError) {
    std::filesystem::remove_all(root());
    writeFile(root(), "a file");
    EXPECT_EQ(tryOpen().error().code, ENOTDIR);
}

TEST_P(StoreTest, AStateCopiedElsewhereHasAnotherUUID) {
    write("a");
    open();
    const auto uuid = store().report().uuid;
    const auto earlier = state();
    close();
    std::filesystem::copy(earlier, earlier + ".copy", std::filesystem::copy_options::recursive);
    setState(earlier + ".copy");
    open();
    EXPECT_NE(store().report().uuid, uuid);
    EXPECT_THAT(store().report().rebuildReason, testing::HasSubstr("it was made at"));
}

TEST_P(StoreTest, AStateOlderThanItsWitnessHasAnotherUUID) {
    write("a");
    open();
    const auto uuid = store().report().uuid;
    close();
    const auto backup = state() + ".backup";
    std::filesystem::copy(state(), backup, std::filesystem::copy_options::recursive);
    write("b");
    open();
    const auto b = assign("").at("b");
    EXPECT_EQ(store().report().uuid, uuid);
    close();
    std::filesystem::remove_all(state());
    std::filesystem::rename(backup, state());
    open();
    EXPECT_NE(store().report().uuid, uuid);
    EXPECT_THAT(store().report().rebuildReason, testing::HasSubstr("older than its witness"));
    EXPECT_EQ(store().resolveDocumentID(b, device()).error().code, ENOENT);
    EXPECT_EQ(store().report().damagedFolder, damagedFor(storeIn(state())));
}

TEST_P(StoreTest, ALostWitnessIsMadeAnew) {
    write("a");
    open();
    const auto uuid = store().report().uuid;
    close();
    std::filesystem::remove_all(cache());
    open();
    EXPECT_EQ(store().report().uuid, uuid);
    EXPECT_EQ(store().report().witness, "");
    EXPECT_FALSE(std::filesystem::is_empty(cache()));
}

TEST_P(StoreTest, ReportTellsItsState) {
    write("a");
    write("folder/b");
    open();
    (void)assign("");
    const auto report = store().report();
    EXPECT_EQ(report.entries, 4U);
    EXPECT_EQ(report.documents, 2U);
    EXPECT_EQ(report.documentIDsUsed, 2U);
    EXPECT_GT(report.memory, 0U);
    EXPECT_GT(report.logBytes, 0U);
    EXPECT_EQ(report.reconcile.folders, 2U);
    EXPECT_EQ(report.reconcile.entries, 3U);
    EXPECT_FALSE(report.writeError);
}

TEST_P(StoreTest, AnUnreadableFolderKeepsWhatWasKnown) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    write("shut/file");
    open();
    const auto file = assign("shut").at("file");
    close();
    ASSERT_EQ(::chmod(path("shut").c_str(), 0), 0);
    open();
    EXPECT_EQ(store().report().reconcile.unreadableFolders, std::vector<std::string>{"shut"});
    EXPECT_EQ(store().resolveDocumentID(file, device()).error().code, EACCES);
    ASSERT_EQ(::chmod(path("shut").c_str(), 0700), 0);
    reopen();
    EXPECT_EQ(pathOf(file), "shut/file");
    EXPECT_EQ(store().report().reconcile.unreadableFolderCount, 0U);
}

TEST_P(StoreTest, AStateFolderThatCannotBeWrittenIsAnError) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    open();
    close();
    const std::string folder = storeIn(state());
    ASSERT_EQ(::chmod(folder.c_str(), 0500), 0);
    ASSERT_EQ(::chmod((folder + "/head").c_str(), 0400), 0);
    const auto opened = tryOpen();
    ASSERT_FALSE(opened);
    EXPECT_EQ(opened.error().code, EACCES);
    EXPECT_THAT(opened.error().subject, testing::HasSubstr(folder + "/head"));
    ASSERT_EQ(::chmod(folder.c_str(), 0700), 0);
}

INSTANTIATE_TEST_SUITE_P(OnEach, StoreTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

}  // namespace
}  // namespace marrowdale::native
