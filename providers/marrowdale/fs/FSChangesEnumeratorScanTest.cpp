#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <set>

#include "platform/testing/EmptyFileSystem.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/fs/FSChangesEnumeratorTestWorld.h"
#include "providers/marrowdale/fs/FSWalkCursors.h"

namespace marrowdale {
namespace {

// The walk of a renamed folder.
class FSChangesEnumeratorScanTest : public FSChangesEnumeratorTestWorld {
  protected:
    // A folder "new" that came from elsewhere in the trees, with so many files, and its event as
    // the whole history.
    void makeMovedFolder(int files) {
        makeFolder(world_.path("new"));
        for (int i = 0; i < files; ++i) {
            writeFile(world_.path("new/f" + std::to_string(i)), "");
        }
        moved_ = movedHere("new");
        passes_.pathHistory = {*moved_, done()};
        passes_.documentHistory = {doneAt(token_.streamEventID)};
        passes_.folderHistory = {doneAt(1)};
    }
    void run(std::string_view container = workingSet) {
        begin(container);
        ASSERT_TRUE(observer_->waitForFinish());
    }
    // Names of what the request told, in order.
    [[nodiscard]] Lines updated() const {
        Lines names;
        for (const auto& item : observer_->updates()) {
            names.push_back(item->filename);
        }
        return names;
    }
    // Goes on until nothing more comes; all names that were told from here on.
    std::multiset<std::string> restOfScan() {
        std::multiset<std::string> told;
        while (observer_->calls().back() == "finish, more") {
            goOn();
            for (const auto& name : updated()) {
                told.insert(name);
            }
        }
        EXPECT_EQ(observer_->calls().back(), "finish");
        return told;
    }
    // As if another process went on: no walk of this one is remembered.
    void forgetCursors() {
        auto& cursors = platform_.shared.get<FSWalkCursors>("marrowdale.walk-cursors");
        for (std::uint64_t i = 0; i < FSWalkCursors::capacity; ++i) {
            cursors.remember({.deviceUUID = {},
                              .streamEventID = i,
                              .offset = 0,
                              .container = "none",
                              .roots = {}},
                             {});
        }
    }

    std::optional<FileEvent> moved_;
};

INSTANTIATE_TEST_SUITE_P(OnEach, FSChangesEnumeratorScanTest,
                         ::testing::ValuesIn(testFileSystems()), testFileSystemName);

TEST_P(FSChangesEnumeratorScanTest, theWorkingSetIsToldEverythingInTheFolder) {
    makeMovedFolder(2);
    makeFolder(world_.path("new/sub"));
    writeFile(world_.path("new/sub/deep"), "");
    writeFile(world_.path("new/.hidden"), "");
    const std::string package = "doc." + native::PackageTypes().extensions().front();
    makeFolder(world_.path("new/" + package));
    writeFile(world_.path("new/" + package + "/inside"), "");
    run();
    Lines names = updated();
    EXPECT_EQ(names.front(), "new");
    std::ranges::sort(names);
    EXPECT_EQ(names, (Lines{"deep", package, "f0", "f1", "new", "sub"}));
    EXPECT_EQ(observer_->calls().size(), 3U);
    EXPECT_EQ(observer_->calls().back(), "finish");
    EXPECT_EQ(anchor()->offset, 0U);
    EXPECT_EQ(
        world_.sink->countContaining(" scanning folder " + world_.path("new") + " from offset 0"),
        1U);
    for (const auto& item : observer_->updates()) {
        const auto local = std::static_pointer_cast<const LocalItem>(item);
        EXPECT_EQ(world_.sink->countContaining("forward update of " + local->description()), 1U);
    }
}

TEST_P(FSChangesEnumeratorScanTest, allDirectoriesAreToldTheFoldersInIt) {
    makeMovedFolder(300);
    makeFolder(world_.path("new/sub/deeper"));
    run(allDirectories);
    Lines names = updated();
    std::ranges::sort(names);
    EXPECT_EQ(names, (Lines{"deeper", "new", "sub"}));
    EXPECT_EQ(observer_->calls().back(), "finish");
}

TEST_P(FSChangesEnumeratorScanTest, theRootAndOrdinaryFoldersAreToldTheFolderAlone) {
    makeMovedFolder(2);
    run(root);
    EXPECT_EQ(updated(), Lines{"new"});
    makeFolder(world_.path("new/inner"));
    writeFile(world_.path("new/inner/x"), "");
    passes_.pathHistory = {movedHere("new/inner"), done()};
    run(itemAt("new")->itemIdentifier);
    EXPECT_EQ(updated(), Lines{"inner"});
}

TEST_P(FSChangesEnumeratorScanTest, onlyARenamedFolderIsWalked) {
    makeMovedFolder(2);
    writeFile(world_.path("file"), "");
    passes_.pathHistory = {
        event("new", FileEventFlag::appeared, fileIDOf("new")),
        event("new", FileEventFlag::changed, fileIDOf("new")),
        event("new", FileEventFlag::renamed | FileEventFlag::gone, fileIDOf("new")),
        event("file", FileEventFlag::renamed, fileIDOf("file")), done()};
    run();
    EXPECT_EQ(updated(), (Lines{"new", "new", "new", "file"}));
}

TEST_P(FSChangesEnumeratorScanTest, aLargeFolderComesInBatchesAndTheFolderOnce) {
    makeMovedFolder(450);
    const std::uint64_t since = token_.streamEventID;
    run();
    EXPECT_EQ(updated().size(), 200U);
    EXPECT_EQ(updated().front(), "new");
    EXPECT_EQ(observer_->calls().back(), "finish, more");
    FSChangeToken expected = token_;
    expected.streamEventID = since;
    expected.offset = 199;
    EXPECT_EQ(anchor(), expected);
    std::multiset<std::string> told;
    for (const auto& name : updated()) {
        told.insert(name);
    }
    goOn();
    EXPECT_EQ(updated().size(), 200U);
    EXPECT_EQ(anchor()->offset, 399U);
    EXPECT_EQ(
        world_.sink->countContaining(" scanning folder " + world_.path("new") + " from offset 199"),
        1U);
    for (const auto& name : updated()) {
        told.insert(name);
    }
    goOn();
    EXPECT_EQ(updated().size(), 51U);
    EXPECT_EQ(observer_->calls().back(), "finish");
    for (const auto& name : updated()) {
        told.insert(name);
    }
    EXPECT_EQ(told.size(), 451U);
    EXPECT_EQ(std::set(told.begin(), told.end()).size(), 451U);
}

TEST_P(FSChangesEnumeratorScanTest, anotherProcessGoesOnByTheOffsetAlone) {
    makeMovedFolder(450);
    run();
    std::set<std::string> told;
    for (const auto& name : updated()) {
        told.insert(name);
    }
    while (observer_->calls().back() == "finish, more") {
        forgetCursors();
        goOn();
        for (const auto& name : updated()) {
            EXPECT_TRUE(told.insert(name).second) << name;
        }
    }
    EXPECT_EQ(told.size(), 451U);
}

TEST_P(FSChangesEnumeratorScanTest, aFolderThatIsThe200thChangeIsToldAgainAndWalkedNext) {
    makeMovedFolder(3);
    auto events = deletions(1000, 199);
    const auto before = events.back().id;
    events.push_back(movedHere("new"));
    const auto folderEvent = events.back();
    events.push_back(done());
    passes_.pathHistory = events;
    run();
    EXPECT_EQ(updated(), Lines{"new"});
    EXPECT_EQ(anchor()->streamEventID, raw(before));
    EXPECT_EQ(anchor()->offset, 0U);
    passes_.pathHistory = {folderEvent, done()};
    goOn();
    Lines names = updated();
    std::ranges::sort(names);
    EXPECT_EQ(names, (Lines{"f0", "f1", "f2", "new"}));
    EXPECT_EQ(observer_->calls().back(), "finish");
}

TEST_P(FSChangesEnumeratorScanTest, aScanThatEndsWithThe200thChangeEndsWithAnEmptyRequest) {
    makeMovedFolder(199);
    run();
    EXPECT_EQ(updated().size(), 200U);
    EXPECT_EQ(anchor()->offset, 199U);
    goOn();
    EXPECT_EQ(observer_->calls(), Lines{"finish"});
    EXPECT_EQ(anchor()->offset, 0U);
}

TEST_P(FSChangesEnumeratorScanTest, aDeletionUnderTheFolderStartsTheScanOverOnce) {
    makeMovedFolder(450);
    run();
    Lines first = updated();
    std::filesystem::remove(world_.path("new/" + first.at(5)));
    const FileEvent deletion = gone("new/" + first.at(5), FileID{77});
    passes_.folderHistory = {deletion, done()};
    goOn();
    EXPECT_EQ(updated().front(), "new");
    EXPECT_EQ(updated().size(), 200U);
    EXPECT_EQ(
        world_.sink->countContaining(" scanning folder " + world_.path("new") + " from offset 0"),
        2U);
    EXPECT_EQ(static_cast<std::uint32_t>(anchor()->offset), 199U);
    std::multiset<std::string> told;
    for (const auto& name : updated()) {
        told.insert(name);
    }
    told.merge(restOfScan());
    EXPECT_EQ(told.size(), 450U);
    EXPECT_EQ(std::set(told.begin(), told.end()).size(), 450U);
    EXPECT_EQ(world_.sink->countContaining("is gone, its scan starts over"), 1U);
}

TEST_P(FSChangesEnumeratorScanTest, whatLeftTheFolderAndCameBackStartsTheScanOverToo) {
    makeMovedFolder(300);
    run();
    passes_.folderHistory = {
        event("new/f1", FileEventFlag::renamed | FileEventFlag::gone, fileIDOf("new/f1")), done()};
    goOn();
    EXPECT_EQ(updated().front(), "new");
}

TEST_P(FSChangesEnumeratorScanTest, whereNobodyKnowsWhatWasDeletedTheScanStartsOver) {
    makeMovedFolder(300);
    run();
    passes_.folderHistory = {streamEvent(FileEventFlag::userDropped), done()};
    goOn();
    EXPECT_EQ(updated().front(), "new");
}

TEST_P(FSChangesEnumeratorScanTest, theOffsetIsNoneOfALaterFoldersEvent) {
    makeMovedFolder(3);
    token_.offset = 2;
    passes_.pathHistory = {gone("elsewhere", FileID{5}), movedHere("new"), done()};
    run();
    EXPECT_EQ(updated().size(), 4U);
}

TEST_P(FSChangesEnumeratorScanTest, theOffsetIsNoneOfAFolderBehindAnEventThatWasDropped) {
    makeMovedFolder(3);
    token_.offset = 2;
    passes_.pathHistory = {event(".hidden", FileEventFlag::changed, FileID{5}), movedHere("new"),
                           done()};
    run();
    EXPECT_EQ(updated().size(), 4U);
}

TEST_P(FSChangesEnumeratorScanTest, changesBehindTheFolderCountOnTopOfTheScan) {
    makeMovedFolder(100);
    auto events = deletions(1000, 99);
    events.insert(events.begin(), *moved_);
    events.push_back(gone("last", FileID{5}));
    passes_.pathHistory = events;
    run();
    EXPECT_EQ(updated().size(), 101U);
    EXPECT_EQ(observer_->deletions().size(), 99U);
    EXPECT_EQ(anchor()->streamEventID, raw(events.at(99).id));
    EXPECT_EQ(anchor()->offset, 0U);
}

TEST_P(FSChangesEnumeratorScanTest, anObserverThatStopsTheRequestEndsTheScan) {
    makeMovedFolder(300);
    passes_.pathHistory.clear();
    within_ = [this](const std::string& line) {
        if (line != "update new") {
            enumerator_->stop();
        }
    };
    begin();
    tell({*moved_, done()});
    const auto calls = observer_->calls();
    ASSERT_EQ(calls.size(), 2U);
    EXPECT_EQ(calls.front(), "update new");
    EXPECT_EQ(observer_->finishes(), 0U);
}

// A folder in which no identifier can be made durable.
class FullDisk : public DirectoryEnumerator {
  public:
    Expected<std::uint64_t> skip(std::uint64_t count) override { return count; }
    Expected<std::uint64_t> next(std::uint64_t /*limit*/, std::vector<URL>& /*urls*/) override {
        return Unexpected(errorWithPOSIXCode(ENOSPC));
    }
    DirectoryPosition position() const override { return {}; }
};
class FullDiskFileSystem : public ForwardingFileSystem {
  public:
    using ForwardingFileSystem::ForwardingFileSystem;
    Expected<std::unique_ptr<DirectoryEnumerator>> enumerateDirectory(
        const DirectoryEnumerationRequest& /*request*/) override {
        return std::make_unique<FullDisk>();
    }
};

TEST_P(FSChangesEnumeratorScanTest, aFolderThatCantBeReadAsAWholeEndsTheRequestWithTheError) {
    makeMovedFolder(3);
    FullDiskFileSystem files(world_.fileSystem);
    const Platform full = withFileSystem(platform_, files);
    observer_ = std::make_shared<CollectingChangeObserver>();
    passes_.pathHistory = {gone("a", FileID{5}), *moved_, done()};
    enumerator_ = FSChangesEnumerator::make(full, token_, std::string(workingSet),
                                            {world_.manager.documentStorageURL()}, observer_);
    enumerator_->start();
    ASSERT_TRUE(observer_->waitForFinish());
    EXPECT_EQ(observer_->calls(),
              (Lines{"delete fid=5", "update new", "error " + std::to_string(ENOSPC)}));
    settle();
}

}  // namespace
}  // namespace marrowdale
