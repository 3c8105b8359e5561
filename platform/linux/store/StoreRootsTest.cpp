// Which root folder a store belongs to: several in one state folder, moved ones, ones made anew.

#include <filesystem>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/StoreTestSupport.h"

namespace marrowdale::native {
namespace {

namespace fs = std::filesystem;

class StoreRootsTest : public StoreTestBase {
  protected:
    // Opens the store of another folder, with a file of its own in it.
    void openOther() {
        first_ = root();
        close();
        setRoot(first_ + ".other");
        write("other");
        open();
    }
    void openFirst() {
        close();
        setRoot(first_);
        open();
    }
    [[nodiscard]] std::size_t witnesses() const {
        return static_cast<std::size_t>(
            std::distance(fs::directory_iterator(cache()), fs::directory_iterator()));
    }

    std::string first_;
};

TEST_P(StoreRootsTest, EachRootKeepsItsStoreWhenTheyTakeTurns) {
    write("a");
    open();
    const auto uuid = store().report().uuid;
    const auto a = assign("").at("a");
    openOther();
    const auto otherUUID = store().report().uuid;
    const auto other = assign("").at("other");
    EXPECT_NE(otherUUID, uuid);
    EXPECT_EQ(store().report().rebuildReason, "");
    EXPECT_EQ(store().report().damagedFolder, "");
    for (int i = 0; i < 2; ++i) {
        openFirst();
        EXPECT_EQ(store().report().uuid, uuid);
        EXPECT_EQ(assign("").at("a"), a);
        EXPECT_EQ(pathOf(a), "a");
        openOther();
        EXPECT_EQ(store().report().uuid, otherUUID);
        EXPECT_EQ(pathOf(other), "other");
        EXPECT_EQ(store().report().rebuildReason, "");
    }
    EXPECT_EQ(witnesses(), 2U);
}

TEST_P(StoreRootsTest, TheReportNamesTheStoresOfAllRoots) {
    open();
    openOther();
    const auto report = store().report();
    ASSERT_EQ(report.stores.size(), 2U);
    std::map<std::string, StoredRoot> byRoot;
    for (const StoredRoot& stored : report.stores) {
        EXPECT_GT(stored.bytes, 0U);
        byRoot.emplace(stored.rootPath, stored);
    }
    ASSERT_TRUE(byRoot.contains(first_));
    ASSERT_TRUE(byRoot.contains(root()));
    EXPECT_EQ(byRoot.at(root()).folder, report.storeFolder);
    EXPECT_NE(byRoot.at(first_).folder, report.storeFolder);
}

TEST_P(StoreRootsTest, DamageToOneLeavesTheOthersAlone) {
    write("a");
    open();
    const auto uuid = store().report().uuid;
    const auto a = assign("").at("a");
    openOther();
    for (const std::string_view nonsense : {"nonsense", "again"}) {
        const auto before = store().report();
        close();
        writeFile(before.storeFolder + "/head", nonsense);
        open();
        EXPECT_NE(store().report().uuid, before.uuid);
        EXPECT_EQ(store().report().damagedFolder, damagedFor(before.storeFolder));
        EXPECT_EQ(readFile(damagedFor(before.storeFolder) + "/head"), nonsense);
    }
    EXPECT_EQ(witnesses(), 2U);
    openFirst();
    EXPECT_EQ(store().report().uuid, uuid);
    EXPECT_EQ(store().report().damagedFolder, "");
    EXPECT_EQ(pathOf(a), "a");
}

TEST_P(StoreRootsTest, TwoDamagedStoresAreBothKept) {
    open();
    const auto first = store().report().storeFolder;
    openOther();
    const auto other = store().report().storeFolder;
    close();
    writeFile(first + "/head", "first");
    writeFile(other + "/head", "other");
    open();
    openFirst();
    EXPECT_EQ(readFile(damagedFor(first) + "/head"), "first");
    EXPECT_EQ(readFile(damagedFor(other) + "/head"), "other");
}

TEST_P(StoreRootsTest, AMovedRootKeepsItsStore) {
    write("a");
    write("folder/b");
    open();
    const auto uuid = store().report().uuid;
    const auto a = assign("").at("a");
    const auto b = assign("folder").at("b");
    close();
    makeFolder(root() + ".parent");
    const std::string moved = root() + ".parent/moved";
    fs::rename(root(), moved);
    setRoot(moved);
    for (int i = 0; i < 2; ++i) {
        open();
        EXPECT_EQ(store().report().uuid, uuid);
        EXPECT_EQ(store().report().rebuildReason, "");
        ASSERT_EQ(store().report().stores.size(), 1U);
        EXPECT_EQ(store().report().stores.front().rootPath, moved);
        EXPECT_EQ(pathOf(a), "a");
        EXPECT_EQ(pathOf(b), "folder/b");
        close();
    }
}

TEST_P(StoreRootsTest, RootsThatExchangedTheirPathsKeepTheirStores) {
    write("a");
    open();
    const auto a = assign("").at("a");
    const auto uuid = store().report().uuid;
    openOther();
    const auto other = assign("").at("other");
    const auto otherUUID = store().report().uuid;
    close();
    fs::rename(first_, first_ + ".aside");
    fs::rename(root(), first_);
    fs::rename(first_ + ".aside", root());
    open();
    EXPECT_EQ(store().report().uuid, uuid);
    EXPECT_EQ(pathOf(a), "a");
    openFirst();
    EXPECT_EQ(store().report().uuid, otherUUID);
    EXPECT_EQ(pathOf(other), "other");
}

TEST_P(StoreRootsTest, ARootMadeAnewHasAnotherUUID) {
    write("a");
    open();
    const auto uuid = store().report().uuid;
    const auto a = assign("").at("a");
    close();
    fs::rename(root(), root() + ".old");
    fs::create_directory(root());
    write("a");
    open();
    EXPECT_NE(store().report().uuid, uuid);
    EXPECT_EQ(store().report().rebuildReason, "the root folder was made anew");
    EXPECT_EQ(store().resolveDocumentID(a, device()).error().code, ENOENT);
    close();
    setRoot(root() + ".old");
    open();
    EXPECT_EQ(store().report().uuid, uuid);
    EXPECT_EQ(pathOf(a), "a");
}

// The new folder may get the inode number of the old one.
TEST_P(StoreRootsTest, ARootDeletedAndMadeAgainHasAnotherUUIDEachTime) {
    std::vector<UUID> seen;
    for (int i = 0; i < 5; ++i) {
        write("a");
        open();
        EXPECT_THAT(seen, testing::Not(testing::Contains(store().report().uuid)));
        seen.push_back(store().report().uuid);
        close();
        fs::remove_all(root());
        fs::create_directory(root());
    }
}

TEST_P(StoreRootsTest, AStoreUnderTheNameOfAnotherRootsIsSetAside) {
    open();
    const auto uuid = store().report().uuid;
    const auto folder = store().report().storeFolder;
    openOther();
    const auto other = store().report().storeFolder;
    close();
    fs::remove_all(other);
    fs::copy(folder, other, fs::copy_options::recursive);
    open();
    EXPECT_NE(store().report().uuid, uuid);
    EXPECT_THAT(store().report().rebuildReason, testing::HasSubstr("it belongs to another folder"));
}

// As where a newer kernel tells more of a folder, which gives it another name.
TEST_P(StoreRootsTest, AStoreUnderAnUnusualNameIsFound) {
    write("a");
    open();
    const auto uuid = store().report().uuid;
    const auto a = assign("").at("a");
    const auto folder = store().report().storeFolder;
    close();
    const std::string unusual = state() + "/store-0123456789abcdef";
    fs::rename(folder, unusual);
    for (int i = 0; i < 2; ++i) {
        open();
        EXPECT_EQ(store().report().uuid, uuid);
        EXPECT_EQ(store().report().storeFolder, unusual);
        EXPECT_EQ(pathOf(a), "a");
        close();
    }
}

TEST_P(StoreRootsTest, ALostStoreTakesTheWitnessOver) {
    open();
    close();
    fs::remove_all(state());
    open();
    EXPECT_EQ(store().report().witness, "");
    EXPECT_EQ(witnesses(), 1U);
    reopen();
    EXPECT_EQ(store().report().rebuildReason, "");
}

TEST_P(StoreRootsTest, StateAndCacheFoldersAreNeverIndexed) {
    write("a");
    setState(path(".state"));
    setCache(path("caches/ours"));
    open();
    EXPECT_EQ(store().report().entries, 3U);  // the root, the file, "caches"
    for (const char* folder : {".state", "caches/ours"}) {
        EXPECT_EQ(store().pathForFileID(device(), status(folder).fileID).error().code, ENOENT);
    }
    settle();
    ASSERT_TRUE(store().reconcile());
    const auto before = *store().barrier();
    ASSERT_TRUE(store().reconcile());
    EXPECT_EQ(*store().barrier(), before);
}

TEST_P(StoreRootsTest, WhatLiesInStateAndCacheFoldersGetsNoDocument) {
    setState(path(".state"));
    setCache(path("cache"));
    write("a");
    write("cache/below/file");
    open();
    const auto last = store().report().documentIDsUsed;
    const std::string ours = fs::path(store().report().storeFolder).lexically_relative(root());
    for (const std::string& folder :
         {std::string(".state"), ours, std::string("cache"), std::string("cache/below")}) {
        auto requests = requestsFor(folder);
        ASSERT_FALSE(requests.requests.empty()) << folder;
        const auto done = store().assignDocumentIDs(requests.requests);
        ASSERT_FALSE(done) << folder;
        EXPECT_EQ(done.error().code, ENOENT) << folder;
        EXPECT_EQ(requests.requests.front().document, DocumentID{}) << folder;
    }
    // The folders themselves are in the root's listing.
    auto requests = requestsFor("");
    ASSERT_EQ(requests.requests.size(), 3U);
    EXPECT_EQ(store().assignDocumentIDs(requests.requests).error().code, ENOENT);
    EXPECT_EQ(store().report().documentIDsUsed, last);
}

TEST_P(StoreRootsTest, WhatLiesOutsideTheRootGetsNoDocument) {
    open();
    const std::string outside = root() + ".outside";
    makeFolder(outside);
    writeFile(outside + "/file", "x");
    auto requests = makeRequests(outside);
    ASSERT_EQ(requests.requests.size(), 1U);
    EXPECT_EQ(store().assignDocumentIDs(requests.requests).error().code, ENOENT);
    EXPECT_EQ(store().report().documentIDsUsed, 0U);
}

TEST_P(StoreRootsTest, TheRootItselfHasADocument) {
    open();
    const fs::path path(root());
    auto requests = makeRequests(path.parent_path());
    std::erase_if(requests.requests,
                  [&](const auto& request) { return request.name != path.filename().string(); });
    ASSERT_EQ(requests.requests.size(), 1U);
    ASSERT_TRUE(store().assignDocumentIDs(requests.requests));
    const auto document = requests.requests.front().document;
    EXPECT_NE(document, DocumentID{});
    EXPECT_EQ(pathOf(document), ".");
    ASSERT_TRUE(store().assignDocumentIDs(requests.requests));
    EXPECT_EQ(requests.requests.front().document, document);
}

TEST_P(StoreRootsTest, TheRootAsStateOrCacheFolderIsRefused) {
    const std::string state = this->state();
    setState(root());
    EXPECT_EQ(tryOpen().error().code, EINVAL);
    setState(state);
    setCache(root());
    EXPECT_EQ(tryOpen().error().code, EINVAL);
}

INSTANTIATE_TEST_SUITE_P(OnEach, StoreRootsTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

}  // namespace
}  // namespace marrowdale::native
