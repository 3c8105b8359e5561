#include <filesystem>

#include "providers/marrowdale/fs/FSEventReaderTestWorld.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"

namespace marrowdale {
namespace {

// What becomes of each event of the feed of documents.
class FSEventReaderDocIDTest : public FSEventReaderTestWorld {
  protected:
    void SetUp() override { startReader(FSEventReaderMode::docIDBased); }

    // The number of the document at that place, given out if need be.
    std::string documentOf(std::string_view name) {
        const auto identifier = itemIdentifier(platform_, world_.url(name));
        EXPECT_TRUE(identifier && identifier->starts_with("did="));
        return identifier.value_or("did=0").substr(4);
    }
    FileEvent moved(const std::string& path) {
        FileEvent made = event("", FileEventFlag::documentMoved);
        made.path = path;
        return made;
    }
    FileEvent movedDocument(const std::string& document) {
        return moved("/.docid/1/changed/" + document + "/src=1,dst=2");
    }
};

INSTANTIATE_TEST_SUITE_P(OnEach, FSEventReaderDocIDTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(FSEventReaderDocIDTest, theItemThatHoldsTheDocumentDidChange) {
    writeFile(world_.path("a"), "");
    const std::string document = documentOf("a");
    std::filesystem::rename(world_.path("a"), world_.path("b"));
    ASSERT_TRUE(world_.store->reconcile());
    FileEvent event = movedDocument(document);
    event.fileID = FileID{1};  // the file is not compared: the document decides
    tell({event});
    EXPECT_EQ(delegate_->told, Lines{"change b 11"});
    EXPECT_EQ(delegate_->items.at(0)->fileURL.path(), world_.path("b"));
    EXPECT_EQ(delegate_->items.at(0)->itemIdentifier, "did=" + document);
    EXPECT_EQ(logged("[DEBUG] did change " + delegate_->items.at(0)->description()), 1U);
}

TEST_P(FSEventReaderDocIDTest, aPathOfAnotherFormIsSkippedWithAnError) {
    const Lines paths{"/.docid/1",
                      "/.docid/1/",
                      "/.docid/1/changed/42",
                      "/.docid/1/changed/42/src=1,dst=2 ",
                      "/.docid/1/changed/42/dst=2,src=1",
                      "/.docid/1/changed/99999999999999999999/src=1,dst=2",
                      "/elsewhere/.docid/1/changed/42/src=1,dst=2"};
    for (const std::string& path : paths) {
        tell({moved(path)});
        EXPECT_EQ(logged("[ERROR] can't parse docID path \"" + path +
                         "\"; format expected is "
                         "\"/.docid/$dev/changed/$docid/src=$src,dst=$dst\""),
                  1U)
            << path;
    }
    EXPECT_EQ(delegate_->told, Lines{});
    EXPECT_EQ(raw(reader_->lastProcessedFSEventID()), 10 + paths.size());
}

TEST_P(FSEventReaderDocIDTest, aDocumentThatIsNowhereIsSkipped) {
    tell({moved("/.docid/1/changed/4000000000/src=100,dst=200"),
          moved("/.docid/changed/-1/src=-100,dst=200")});
    EXPECT_EQ(delegate_->told, Lines{});
    EXPECT_EQ(logged("[DEBUG] can't compute url for <docID:4000000000 src:100 dst:200>"), 1U);
    EXPECT_EQ(logged("[DEBUG] can't compute url for <docID:-1 src:-100 dst:200>"), 1U);
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{12});
}

TEST_P(FSEventReaderDocIDTest, theSameLooksAreTakenAtTheResolvedPlace) {
    makeFolder(world_.path(".Trash"));
    makeFolder(world_.path("in"));
    writeFile(world_.path(".Trash/a"), "");
    writeFile(world_.path("out"), "");
    writeFile(world_.path("in/.h"), "");
    writeFile(world_.path("in/b"), "");
    reader_->stop();
    auto asked = options(FSEventReaderMode::docIDBased);
    asked.urls = {world_.url("in")};
    startReader(asked);
    const Lines documents{documentOf(".Trash/a"), documentOf("out"), documentOf("in/.h")};
    tell({movedDocument(documents[0]), movedDocument(documents[1]), movedDocument(documents[2]),
          movedDocument(documentOf("in/b"))});
    // Whoever knew it at another place is told that it went out of sight.
    EXPECT_EQ(
        delegate_->told,
        (Lines{"delete did=" + documents[0] + " " + world_.path(".Trash/a") + " 11",
               "delete did=" + documents[1] + " " + world_.path("out") + " 12",
               "delete did=" + documents[2] + " " + world_.path("in/.h") + " 13", "change b 14"}));
    const std::string dropping = "[DEBUG] dropping fsevent at ";
    EXPECT_EQ(logged(dropping + world_.path(".Trash/a") + "; URL is not monitored"), 1U);
    EXPECT_EQ(logged(dropping + world_.path("out") + "; URL is not monitored"), 1U);
    EXPECT_EQ(logged(dropping + world_.path("in/.h") + "; URL is hidden"), 1U);
}

TEST_P(FSEventReaderDocIDTest, aDocumentThatCameIntoAPackageIsGone) {
    writeFile(world_.path("a"), "");
    const std::string document = documentOf("a");
    const std::string package = world_.path("p." + native::PackageTypes().extensions().front());
    makeFolder(package);
    makeFolder(package + "/in");
    const std::string inside = package + "/in/a";
    std::filesystem::rename(world_.path("a"), inside);
    ASSERT_TRUE(world_.store->reconcile());
    tell({movedDocument(document)});
    EXPECT_EQ(delegate_->told, Lines{"delete did=" + document + " " + inside + " 11"});
    EXPECT_EQ(logged("[DEBUG] dropping fsevent at " + inside + "; URL is not monitored"), 1U);
}

TEST_P(FSEventReaderDocIDTest, aDocumentWhosePlaceEmptiedMeanwhileIsDroppedOrItsFileGone) {
    writeFile(world_.path("a"), "");
    const std::string document = documentOf("a");
    world_.fileSystem.pathAnswer = [&](DeviceID, FileID) {
        return std::optional<Expected<std::string>>(world_.path("vanished"));
    };
    FileEvent withFile = movedDocument(document);
    withFile.fileID = FileID{5};
    tell({movedDocument(document), withFile});
    EXPECT_EQ(delegate_->told, Lines{"delete fid=5 " + world_.path("vanished") + " 11"});
    EXPECT_EQ(logged("[DEBUG] dropping fsevent at \"" + world_.path("vanished") +
                     "\"; No object at path"),
              1U);
}

TEST_P(FSEventReaderDocIDTest, aDocumentThatIsNoItemIsDropped) {
    writeFile(world_.path("a"), "");
    const std::string document = documentOf("a");
    std::filesystem::create_symlink("nowhere", world_.path("link"));
    world_.fileSystem.pathAnswer = [&](DeviceID, FileID) {
        return std::optional<Expected<std::string>>(world_.path("link"));
    };
    tell({movedDocument(document)});
    EXPECT_EQ(delegate_->told, Lines{});
    EXPECT_EQ(
        logged("[DEBUG] dropping fsevent at " + world_.path("link") + "; can't create local item"),
        1U);
}

TEST_P(FSEventReaderDocIDTest, conditionsAndOtherPathsAreReadAsInAnyStream) {
    writeFile(world_.path("a"), "");
    FileEvent done = streamEvent(FileEventFlag::historyDone);
    done.id = EventID{10};
    tell({streamEvent(FileEventFlag::userDropped), event("a", FileEventFlag::changed), done});
    EXPECT_EQ(delegate_->told, (Lines{"reset", "change a 13", "history 10"}));
    EXPECT_EQ(reader_->lastProcessedFSEventID(), EventID{13});
}

}  // namespace
}  // namespace marrowdale
