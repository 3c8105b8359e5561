#include <cerrno>
#include <filesystem>
#include <set>

#include "platform/testing/ForwardingFileSystem.h"
#include "providers/marrowdale/fs/FSEventReaderTestWorld.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"

namespace marrowdale {
namespace {

// What becomes of each event of a stream by path.
class FSEventReaderEventsTest : public FSEventReaderTestWorld {
  protected:
    void SetUp() override { startReader(); }
};

INSTANTIATE_TEST_SUITE_P(OnEach, FSEventReaderEventsTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(FSEventReaderEventsTest, anItemThatStandsThereDidChange) {
    writeFile(world_.path("a"), "hello");
    makeFolder(world_.path("folder/sub"));
    tell({event("a", FileEventFlag::appeared, fileIDOf("a")),
          event("folder/sub", FileEventFlag::renamed, fileIDOf("folder/sub"))});
    EXPECT_EQ(delegate_->told, (Lines{"change a 11", "change sub 12"}));
    const LocalItem& item = *delegate_->items.front();
    EXPECT_EQ(item.itemIdentifier, itemIdentifier(platform_, world_.url("a")));
    EXPECT_EQ(item.documentSize, 5U);
    EXPECT_EQ(logged("[DEBUG] did change " + item.description()), 1U);
    EXPECT_EQ(delegate_->items.back()->itemIdentifier,
              "fid=" + std::to_string(raw(fileIDOf("folder/sub"))));
}

TEST_P(FSEventReaderEventsTest, theRootItselfIsMonitored) {
    tell({event("", FileEventFlag::changed, fileIDOf(""))});
    EXPECT_EQ(delegate_->told, Lines{"change Documents 11"});
}

TEST_P(FSEventReaderEventsTest, anItemIsMadeAnewForEachEvent) {
    writeFile(world_.path("a"), "1");
    tell({event("a", FileEventFlag::changed)});
    writeFile(world_.path("a"), "22");
    tell({event("a", FileEventFlag::changed)});
    ASSERT_EQ(delegate_->items.size(), 2U);
    EXPECT_EQ(delegate_->items[0]->documentSize, 1U);
    EXPECT_EQ(delegate_->items[1]->documentSize, 2U);
}

// Both ways to read it must fail before an item that stands there is left out.
TEST_P(FSEventReaderEventsTest, whatALookFailsForIsAskedForValueByValue) {
    writeFile(world_.path("a"), "1");
    world_.fileSystem.lookFault = [&](const URL& url) {
        return url == world_.url("a") ? std::optional(errorWithPOSIXCode(EIO)) : std::nullopt;
    };
    tell({event("a", FileEventFlag::changed, fileIDOf("a"))});
    EXPECT_EQ(delegate_->told, Lines{"change a 11"});
}

TEST_P(FSEventReaderEventsTest, documentsOfABatchAreGivenOutTogether) {
    for (const char* name : {"a", "b", "c"}) {
        writeFile(world_.path(name), "");
    }
    tell({event("a", FileEventFlag::appeared), event("b", FileEventFlag::appeared),
          event("c", FileEventFlag::appeared)});
    std::set<std::string> identifiers;
    for (const auto& item : delegate_->items) {
        EXPECT_TRUE(item->itemIdentifier.starts_with("did=")) << item->itemIdentifier;
        identifiers.insert(item->itemIdentifier);
    }
    EXPECT_EQ(identifiers.size(), 3U);
}

TEST_P(FSEventReaderEventsTest, itemsCarryTheBundleIdentifierOfTheirLibrary) {
    makeFolder(world_.path("app/Documents"));
    writeFile(world_.path("app/Documents/a"), "");
    world_.addLibrary("org.example.Notes", "Notes", world_.path("app"));
    tell({event("app/Documents/a", FileEventFlag::changed)});
    ASSERT_EQ(delegate_->items.size(), 1U);
    EXPECT_EQ(delegate_->items[0]->hx_lumenoDomainIdentifier, "org.example.Notes");
}

TEST_P(FSEventReaderEventsTest, namesAreBytes) {
    writeFile(world_.path("weird\n\xff%41"), "");
    tell({event("weird\n\xff%41", FileEventFlag::changed, fileIDOf("weird\n\xff%41")),
          gone("gone\n\xff", FileID{9})});
    EXPECT_EQ(delegate_->told, (Lines{"change weird\n\xff%41 11",
                                      "delete fid=9 " + world_.path("gone\n\xff") + " 12"}));
}

TEST_P(FSEventReaderEventsTest, anEventWithoutAFileIsAChangeOfWhatStandsThere) {
    writeFile(world_.path("a"), "");
    tell({event("a", FileEventFlag::changed), event("a", FileEventFlag::gone)});
    EXPECT_EQ(delegate_->told, (Lines{"change a 11", "change a 12"}));
}

TEST_P(FSEventReaderEventsTest, theEventOfAnotherFileIsDropped) {
    writeFile(world_.path("a"), "");
    const FileID other{raw(fileIDOf("a")) + 1};
    tell({event("a", FileEventFlag::changed, other)});
    EXPECT_EQ(delegate_->told, Lines{});
    EXPECT_EQ(
        logged("[DEBUG] dropping fsevent at " + world_.path("a") + "; fileObjectIDs don't match (" +
               std::to_string(raw(fileIDOf("a"))) + " vs " + std::to_string(raw(other)) + ")"),
        1U);
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{11});
}

TEST_P(FSEventReaderEventsTest, aLinksOwnFileIsComparedAndNotItsTargets) {
    writeFile(world_.path("target"), "");
    std::filesystem::create_symlink("target", world_.path("link"));
    tell({event("link", FileEventFlag::changed, fileIDOf("link")),
          event("link", FileEventFlag::changed, fileIDOf("target"))});
    EXPECT_EQ(delegate_->told, Lines{"change link 11"});
    EXPECT_EQ(world_.sink->countContaining("; fileObjectIDs don't match ("), 1U);
}

TEST_P(FSEventReaderEventsTest, aLinkThatLeadsNowhereIsNoItem) {
    std::filesystem::create_symlink("nowhere", world_.path("link"));
    tell({event("link", FileEventFlag::appeared, fileIDOf("link"))});
    EXPECT_EQ(delegate_->told, Lines{});
    EXPECT_EQ(
        logged("[DEBUG] dropping fsevent at " + world_.path("link") + "; can't create local item"),
        1U);
}

TEST_P(FSEventReaderEventsTest, whatCannotBeLookedAtIsNeitherChangedNorGone) {
    writeFile(world_.path("a"), "");
    world_.fileSystem.resourceAnswer = [](const URL&, ResourceKey) {
        return std::optional<Expected<ResourceValue>>(Unexpected(errorWithPOSIXCode(EIO)));
    };
    tell({event("a", FileEventFlag::changed, FileID{5}), gone("a", FileID{5})});
    EXPECT_EQ(delegate_->told, Lines{});
    EXPECT_EQ(
        logged("[DEBUG] dropping fsevent at " + world_.path("a") + "; can't create local item"),
        2U);
}

TEST_P(FSEventReaderEventsTest, whereNothingStandsTheEventsFileIsGone) {
    writeFile(world_.path("file"), "");
    tell({event("a", FileEventFlag::changed, FileID{5}), event("file/below", 0, FileID{6})});
    EXPECT_EQ(delegate_->told, (Lines{"delete fid=5 " + world_.path("a") + " 11",
                                      "delete fid=6 " + world_.path("file/below") + " 12"}));
    EXPECT_EQ(logged("[DEBUG] did delete fid=5"), 1U);
}

TEST_P(FSEventReaderEventsTest, nothingThereAndNoFileInTheEventIsDropped) {
    tell({event("a", FileEventFlag::changed), event("a", FileEventFlag::gone)});
    EXPECT_EQ(delegate_->told, Lines{});
    EXPECT_EQ(logged("[DEBUG] dropping fsevent at \"" + world_.path("a") + "\"; No object at path"),
              2U);
}

TEST_P(FSEventReaderEventsTest, aFileIDUsesAll64Bits) {
    tell({gone("a", FileID{~std::uint64_t{0}})});
    EXPECT_EQ(delegate_->told,
              Lines{"delete fid=18446744073709551615 " + world_.path("a") + " 11"});
}

TEST_P(FSEventReaderEventsTest, aGoneDocumentIsToldRightBehindItsFile) {
    tell({gone("a", FileID{5}, 77), gone("b", FileID{6})});
    EXPECT_EQ(delegate_->told, (Lines{"delete fid=5 " + world_.path("a") + " 11",
                                      "delete did=77 " + world_.path("a") + " 11",
                                      "delete fid=6 " + world_.path("b") + " 12"}));
    EXPECT_EQ(logged("[DEBUG] did delete did=77"), 1U);
}

TEST_P(FSEventReaderEventsTest, aGoneDocumentWithoutAFileIsToldAlone) {
    FileEvent alone = event("a", FileEventFlag::gone);
    alone.goneDocument = DocumentID{77};
    tell({alone});
    EXPECT_EQ(delegate_->told, Lines{"delete did=77 " + world_.path("a") + " 11"});
}

TEST_P(FSEventReaderEventsTest, aFileWhosePlaceWasTakenIsGoneAndNotChanged) {
    writeFile(world_.path("a"), "");
    const FileID other{raw(fileIDOf("a")) + 1};
    tell({gone("a", other, 77)});
    const std::string fid = "fid=" + std::to_string(raw(other));
    EXPECT_EQ(delegate_->told, (Lines{"delete " + fid + " " + world_.path("a") + " 11",
                                      "delete did=77 " + world_.path("a") + " 11"}));
    Lines decisions;
    for (const std::string& line : world_.sink->lines()) {
        if (line.starts_with("[DEBUG] d")) {
            decisions.push_back(line);
        }
    }
    EXPECT_EQ(
        decisions,
        (Lines{"[DEBUG] dropping fsevent at " + world_.path("a") + "; fileObjectIDs don't match (" +
                   std::to_string(raw(fileIDOf("a"))) + " vs " + std::to_string(raw(other)) + ")",
               "[DEBUG] did delete " + fid, "[DEBUG] did delete did=77"}));
}

TEST_P(FSEventReaderEventsTest, aFileWhosePlaceWasTakenByWhatIsNoItemIsGoneToo) {
    std::filesystem::create_symlink("nowhere", world_.path("a"));
    const FileID other{raw(fileIDOf("a")) + 1};
    tell({gone("a", other)});
    EXPECT_EQ(delegate_->told,
              Lines{"delete fid=" + std::to_string(raw(other)) + " " + world_.path("a") + " 11"});
    EXPECT_EQ(world_.sink->countContaining("; can't create local item"), 1U);
}

TEST_P(FSEventReaderEventsTest, aGoneFileThatIsThereAgainDidChange) {
    writeFile(world_.path("a"), "");
    tell({gone("a", fileIDOf("a"))});
    EXPECT_EQ(delegate_->told, Lines{"change a 11"});
    const auto document = static_cast<std::uint32_t>(delegate_->items.back()->docID.value());
    tell({gone("a", fileIDOf("a"), document)});
    EXPECT_EQ(delegate_->told, (Lines{"change a 11", "change a 12"}));
}

TEST_P(FSEventReaderEventsTest, aDocumentIsGoneWhereItsFilesNumberWasGivenToAnother) {
    writeFile(world_.path("a"), "");
    tell({gone("a", fileIDOf("a"), 77)});
    EXPECT_EQ(delegate_->told, (Lines{"change a 11", "delete did=77 " + world_.path("a") + " 11"}));
}

// Whoever knew the document where it was in sight is told by nothing else.
TEST_P(FSEventReaderEventsTest, whatWasOutOfSightOnlyBetweenTwoLooksIsToldWhenItIsGone) {
    tell({event(".Trash/a", FileEventFlag::renamed, FileID{5}), gone(".Trash/a", FileID{5}, 7),
          event(".Trash/folder", FileEventFlag::renamed | FileEventFlag::isFolder, FileID{6}),
          gone(".Trash/folder/b", FileID{8}, 9), gone(".Trash/folder/c", FileID{9}),
          gone(".Trash/folder 2", FileID{8}, 10)});
    FileEvent folder = gone(".Trash/folder", FileID{6});
    folder.flags |= FileEventFlag::isFolder;
    tell({folder});
    EXPECT_EQ(delegate_->told, (Lines{"delete did=7 " + world_.path(".Trash/a") + " 12",
                                      "delete did=9 " + world_.path(".Trash/folder/b") + " 14",
                                      "delete fid=6 " + world_.path(".Trash/folder") + " 17"}));
    tell({gone(".Trash/a", FileID{5}, 11), gone(".Trash/folder/b", FileID{8}, 12)});
    EXPECT_EQ(delegate_->told.size(), 3U);
}

TEST_P(FSEventReaderEventsTest, whatIsGoneFromWhereItWasSeenOutOfSightIsDropped) {
    makeFolder(world_.path(".Trash/folder"));
    tell({event(".Trash/folder", FileEventFlag::renamed | FileEventFlag::isFolder,
                fileIDOf(".Trash/folder")),
          gone(".Trash/folder/b", FileID{8}, 9), gone(".Trash/folder", fileIDOf(".Trash/folder"))});
    EXPECT_EQ(delegate_->told, Lines{});
}

TEST_P(FSEventReaderEventsTest, hiddenPathsAreDropped) {
    makeFolder(world_.path(".Trash"));
    writeFile(world_.path(".Trash/a"), "");
    writeFile(world_.path(".hidden"), "");
    tell({event(".Trash/a", FileEventFlag::appeared, fileIDOf(".Trash/a")),
          event(".hidden", FileEventFlag::appeared), gone("sub/.x/y", FileID{5})});
    EXPECT_EQ(delegate_->told, Lines{});
    for (const char* name : {".Trash/a", ".hidden", "sub/.x/y"}) {
        EXPECT_EQ(logged("[DEBUG] dropping fsevent at " + world_.path(name) + "; URL is hidden"),
                  1U);
    }
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{13});
}

TEST_P(FSEventReaderEventsTest, dotsWithinANameHideNothing) {
    writeFile(world_.path("a.b."), "");
    tell({event("a.b.", FileEventFlag::appeared)});
    EXPECT_EQ(delegate_->told, Lines{"change a.b. 11"});
}

TEST_P(FSEventReaderEventsTest, pathsOutsideTheFoldersAreDropped) {
    FileEvent outside = event("", FileEventFlag::changed, FileID{5});
    outside.path = world_.root() + "2/a";
    FileEvent above = event("", FileEventFlag::gone, FileID{5});
    above.path = directory_.path("none");
    FileEvent hiddenOutside = event("", FileEventFlag::gone, FileID{5});
    hiddenOutside.path = directory_.path(".none");
    FileEvent climbing = event("../none", FileEventFlag::gone, FileID{5});
    tell({outside, above, hiddenOutside, climbing});
    EXPECT_EQ(delegate_->told, Lines{});
    for (const auto& event : {outside, above, hiddenOutside, climbing}) {
        EXPECT_EQ(logged("[DEBUG] dropping fsevent at " + *event.path + "; URL is not monitored"),
                  1U);
    }
}

TEST_P(FSEventReaderEventsTest, aFolderIsNotHiddenByWhatIsAboveIt) {
    makeFolder(world_.path(".var/app/org.example/Documents"));
    writeFile(world_.path(".var/app/org.example/Documents/a"), "");
    reader_->stop();
    auto asked = options();  // the storage root, in which the path is hidden, is watched as well
    asked.urls.push_back(world_.url(".var/app/org.example/Documents"));
    startReader(asked);
    tell({event(".var/app/org.example/Documents/a", FileEventFlag::changed),
          event(".var/app/org.example/b", FileEventFlag::changed),
          gone(".var/app/org.example/Documents/.x", FileID{5})});
    EXPECT_EQ(delegate_->told, Lines{"change a 11"});
    EXPECT_EQ(world_.sink->countContaining("; URL is hidden"), 2U);
}

TEST_P(FSEventReaderEventsTest, theFileSystemsRootCanBeWatched) {
    reader_->stop();
    auto asked = options();
    asked.urls = {URL::fileURL("/")};
    startReader(asked);
    FileEvent hidden = event("", FileEventFlag::gone, FileID{5});
    hidden.path = "/.none";
    FileEvent seen = event("", FileEventFlag::gone, FileID{5});
    seen.path = "/none-of-that-name";
    tell({hidden, seen});
    EXPECT_EQ(delegate_->told, Lines{"delete fid=5 /none-of-that-name 12"});
}

TEST_P(FSEventReaderEventsTest, anEventWithoutAPathIsIgnoredWithAnError) {
    FileEvent empty = event("", FileEventFlag::changed);
    empty.path = "";
    tell({streamEvent(FileEventFlag::changed), empty});
    EXPECT_EQ(delegate_->told, Lines{});
    EXPECT_EQ(logged("[ERROR] ignore event (changed) \"\" fileID:unspecified eventID:12 because no "
                     "path can be extracted"),
              1U);
    EXPECT_EQ(logged("[ERROR] ignore event (changed) \"\" fileID:unspecified eventID:11 because no "
                     "path can be extracted"),
              1U);
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{12});
}

TEST_P(FSEventReaderEventsTest, aStreamByPathTakesTheFeedsPathsForPlaces) {
    FileEvent feed = event("", FileEventFlag::documentMoved);
    feed.path = "/.docid/1/changed/42/src=1,dst=2";
    tell({feed});
    EXPECT_EQ(logged("[DEBUG] dropping fsevent at " + *feed.path + "; URL is not monitored"), 1U);
}

TEST_P(FSEventReaderEventsTest, anEventIsLoggedInASectionOfItsOwn) {
    writeFile(world_.path("a"), "");
    world_.sink->clear();
    const FileID file = fileIDOf("a");
    tell(
        {event("a", FileEventFlag::appeared | FileEventFlag::changed, file), gone("b", FileID{5})});
    const std::string first = " fsevents: (appeared/changed) \"" + world_.path("a") +
                              "\" fileID:" + std::to_string(raw(file)) + " eventID:11";
    const std::string second = " fsevents: (gone) \"" + world_.path("b") + "\" fileID:5 eventID:12";
    EXPECT_EQ(world_.sink->lines(),
              (Lines{"[DEBUG] fsevent: received 2 events", "[DEBUG] ┏0 " + first,
                     "[DEBUG] did change " + delegate_->items.at(0)->description(), "[DEBUG] ┗0",
                     "[DEBUG] ┏1 " + second, "[DEBUG] did delete fid=5", "[DEBUG] ┗1"}));
}

TEST_P(FSEventReaderEventsTest, theIdentifierNeverGoesBack) {
    tell({gone("a", FileID{1}), gone("b", FileID{2})});
    FileEvent older = gone("c", FileID{3});
    older.id = EventID{3};
    tell({older});
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{12});
    EXPECT_EQ(delegate_->told.size(), 3U);
}

struct StreamCondition {
    std::uint32_t flags;
    std::vector<std::string> told;
    std::uint64_t counted;
};

// Each combination of the conditions that concern the stream as a whole, on an event of its own.
TEST_P(FSEventReaderEventsTest, everyCombinationOfConditionsIsTold) {
    using namespace FileEventFlag;
    const Lines reset{"reset"};
    const Lines done{"history 11"};
    const Lines both{"reset", "history 11"};
    const std::vector<StreamCondition> table{
        {userDropped, reset, 11},
        {kernelDropped, reset, 11},
        {userDropped | kernelDropped, reset, 11},
        {historyDone, done, 11},
        {userDropped | historyDone, both, 11},
        {kernelDropped | historyDone, both, 11},
        {userDropped | kernelDropped | historyDone, both, 11},
        {eventIDsWrapped, reset, 10},
        {eventIDsWrapped | userDropped, reset, 10},
        {eventIDsWrapped | kernelDropped, reset, 10},
        {eventIDsWrapped | userDropped | kernelDropped, reset, 10},
        {eventIDsWrapped | historyDone, reset, 10},
        {eventIDsWrapped | userDropped | historyDone, reset, 10},
        {eventIDsWrapped | kernelDropped | historyDone, reset, 10},
        {eventIDsWrapped | userDropped | kernelDropped | historyDone, reset, 10},
    };
    for (const StreamCondition& condition : table) {
        reader_->stop();
        startReader();
        delegate_->told.clear();
        world_.sink->clear();
        tell({{.id = EventID{11},
               .flags = condition.flags,
               .path = {},
               .fileID = {},
               .goneDocument = {}}});
        EXPECT_EQ(delegate_->told, condition.told) << condition.flags;
        EXPECT_EQ(raw(reader_->lastProcessedFSEventID()), condition.counted) << condition.flags;
        const bool wrapped = (condition.flags & eventIDsWrapped) != 0;
        const bool dropped = (condition.flags & (userDropped | kernelDropped)) != 0;
        const bool ended = (condition.flags & historyDone) != 0;
        EXPECT_EQ(logged("[INFO] fsevents id wrapped"), wrapped ? 1U : 0U);
        EXPECT_EQ(logged("[DEBUG] dropped fsevents"), dropped && !wrapped ? 1U : 0U);
        EXPECT_EQ(logged("[DEBUG] done processing history"), ended && !wrapped ? 1U : 0U);
        EXPECT_EQ(world_.sink->countOfLevel(LogLevel::error), 0U) << condition.flags;
    }
}

TEST_P(FSEventReaderEventsTest, conditionsOnTheEventOfAnItemAreToldFirst) {
    writeFile(world_.path("a"), "");
    tell({event("a", FileEventFlag::changed | FileEventFlag::historyDone),
          event("a", FileEventFlag::changed | FileEventFlag::userDropped),
          event("a", FileEventFlag::changed | FileEventFlag::eventIDsWrapped)});
    EXPECT_EQ(delegate_->told,
              (Lines{"history 11", "change a 11", "reset", "change a 12", "reset"}));
}

TEST_P(FSEventReaderEventsTest, aQuietReaderStillTellsOfLostAndUnreadableEvents) {
    reader_->stop();
    world_.sink->clear();
    auto asked = options();
    asked.verbose = false;
    startReader(asked);
    tell({streamEvent(FileEventFlag::kernelDropped), streamEvent(FileEventFlag::changed)});
    EXPECT_EQ(world_.sink->lines(),
              (Lines{"[DEBUG] dropped fsevents",
                     "[ERROR] ignore event (changed) \"\" fileID:unspecified eventID:12 because no "
                     "path can be extracted"}));
}

}  // namespace
}  // namespace marrowdale
