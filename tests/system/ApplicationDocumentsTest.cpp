// What lies in the libraries of applications: listed, identified and followed like the user's own.

#include <filesystem>
#include <map>
#include <memory>
#include <sys/stat.h>

#include <gmock/gmock.h>

#include "tests/system/ApplicationHome.h"
#include "tests/system/Service.h"

namespace marrowdale::tests {
namespace {

namespace fs = std::filesystem;

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

const std::string notesItem = "#org.example.Notes";

class ApplicationDocumentsTest : public ::testing::Test {
  protected:
    ApplicationDocumentsTest() { home_.install(notes, "Notes"); }
    [[nodiscard]] std::string inNotes(const std::string& name) const {
        return home_.library(notes) + "/" + name;
    }
    [[nodiscard]] std::string anchor(const std::string& item) const {
        return text(home_.line({"anchor", item}), "anchor");
    }
    [[nodiscard]] Json changes(const std::string& item, const std::string& since) const {
        return home_.line({"changes", item, "--since", since});
    }
    [[nodiscard]] static std::vector<std::string> identifiers(const Json& items) {
        std::vector<std::string> all;
        for (const Json& item : items) {
            all.push_back(text(item, "itemIdentifier"));
        }
        return all;
    }
    [[nodiscard]] static std::vector<std::string> names(const Json& items) {
        std::vector<std::string> all;
        for (const Json& item : items) {
            all.push_back(text(item, "filename"));
        }
        return all;
    }
    [[nodiscard]] std::string identifierAt(const std::string& path) const {
        return text(home_.line({"id", path}), "itemIdentifier");
    }
    ApplicationHome home_;
};

TEST_F(ApplicationDocumentsTest, aLibraryIsListedWithoutWhatIsHiddenInIt) {
    writeFile(inNotes("note.txt"), "note");
    makeFolder(inNotes("folder/deeper"));
    makeFolder(inNotes("Inbox"));
    makeFolder(inNotes(".Trash"));
    writeFile(inNotes(".Trash/thrown.txt"), "");
    const auto items = home_.lines({"ls", notesItem});
    EXPECT_THAT(field(items, "filename"), UnorderedElementsAre("note.txt", "folder"));
    EXPECT_THAT(field(items, "parentItemIdentifier"), ElementsAre(notesItem, notesItem));
    EXPECT_THAT(field(home_.lines({"ls", "all-directories"}), "filename"),
                UnorderedElementsAre("Notes", "note.txt", "folder", "deeper"));
    EXPECT_THAT(field(home_.lines({"ls", "working-set"}), "filename"),
                UnorderedElementsAre("Notes", "thrown.txt"));
    const Json page = home_.line({"page", notesItem});
    EXPECT_THAT(names(page.at("items")), UnorderedElementsAre("note.txt", "folder"));
    EXPECT_TRUE(page.at("nextPage").is_null());
}

TEST_F(ApplicationDocumentsTest, identifiersOfDocumentsLast) {
    writeFile(inNotes("note.txt"), "note");
    const std::string identifier = identifierAt(inNotes("note.txt"));
    EXPECT_TRUE(identifier.starts_with("did="));
    fs::rename(inNotes("note.txt"), inNotes("renamed.txt"));
    EXPECT_EQ(home_.pathOf(identifier), inNotes("renamed.txt"));
    fs::rename(inNotes("renamed.txt"), home_.document("mine.txt"));
    EXPECT_EQ(home_.pathOf(identifier), home_.document("mine.txt"));
}

TEST_F(ApplicationDocumentsTest, whatHappensInALibraryIsInTheFeeds) {
    for (const bool isServed : {false, true}) {
        std::optional<Service> service;
        if (isServed) {
            service.emplace(home_);
        }
        const std::string set = anchor("working-set");
        const std::string library = anchor(notesItem);
        const std::string root = anchor("root");
        const std::string name = isServed ? "served.txt" : "alone.txt";
        writeFile(inNotes(name), "");
        EXPECT_THAT(names(changes("working-set", set).at("updated")), Contains(name));
        EXPECT_THAT(names(changes(notesItem, library).at("updated")), ElementsAre(name));
        EXPECT_THAT(names(changes("root", root).at("updated")), IsEmpty());
        const std::string identifier = identifierAt(inNotes(name));
        fs::remove(inNotes(name));
        EXPECT_THAT(changes("working-set", set).at("deleted"), Contains(identifier));
    }
}

TEST_F(ApplicationDocumentsTest, clientsOfAServiceAreToldOfApplicationsThatComeAndGo) {
    const Service service(home_);
    const std::string root = anchor("root");
    const std::string set = anchor("working-set");
    const std::string otherSet = anchor("working-set");
    home_.install(sketch, "Sketch");
    fs::remove(home_.entry(notes));
    ASSERT_EQ(home_.run({"refresh"}).exitCode, 0);
    for (const auto& [container, since] : {std::pair("root", root), std::pair("working-set", set),
                                           std::pair("working-set", otherSet)}) {
        const Json answer = changes(container, since);
        EXPECT_THAT(identifiers(answer.at("updated")), Contains("#" + sketch)) << container;
        EXPECT_THAT(answer.at("deleted"), Contains(notesItem)) << container << answer;
        const Json next = changes(container, text(answer, "anchor"));
        EXPECT_THAT(next.at("updated"), IsEmpty()) << container;
        EXPECT_THAT(next.at("deleted"), IsEmpty()) << container;
    }
}

// With the service goes who waited for its clients; what they may have been told of stays.
TEST_F(ApplicationDocumentsTest, anchorsOfOlderListsHoldWhenTheServiceIsKilled) {
    writeFile(inNotes("note.txt"), "");
    auto service = std::make_unique<Service>(home_);
    std::map<std::string, std::string> anchors;
    for (const std::string container : {"root", "working-set", "all-directories"}) {
        anchors[container] = anchor(container);
    }
    home_.install(sketch, "Sketch");
    makeFolder(home_.library(sketch) + "/drawings");
    ASSERT_EQ(home_.run({"refresh"}).exitCode, 0);
    fs::remove(home_.entry(notes));
    ASSERT_EQ(home_.run({"refresh"}).exitCode, 0);
    service->kill();
    service = std::make_unique<Service>(home_);
    for (const auto& [container, since] : anchors) {
        const Json answer = changes(container, since);
        EXPECT_THAT(identifiers(answer.at("updated")), Contains("#" + sketch)) << container;
        EXPECT_THAT(answer.at("deleted"), Contains(notesItem)) << container;
        if (container != "root") {
            EXPECT_THAT(names(answer.at("updated")), Contains("drawings")) << container;
        }
        const Json next = changes(container, text(answer, "anchor"));
        EXPECT_THAT(next.at("updated"), IsEmpty()) << container;
        EXPECT_THAT(next.at("deleted"), IsEmpty()) << container;
    }
}

TEST_F(ApplicationDocumentsTest, anchorsHoldWhenApplicationsComeWhileNothingRuns) {
    const std::string root = anchor("root");
    const std::string set = anchor("working-set");
    home_.install(sketch, "Sketch");
    writeFile(home_.library(sketch) + "/drawing.png", "");
    EXPECT_THAT(identifiers(changes("root", root).at("updated")),
                UnorderedElementsAre("#" + sketch, notesItem));
    const Json answer = changes("working-set", set);
    EXPECT_THAT(names(answer.at("updated")), Contains("drawing.png"));
    fs::remove(home_.entry(sketch));
    EXPECT_THAT(changes("working-set", text(answer, "anchor")).at("deleted"),
                ElementsAre("#" + sketch));
    EXPECT_THAT(changes("working-set", set).at("deleted"), Contains("#" + sketch))
        << "or never told of it";
}

TEST_F(ApplicationDocumentsTest, anAnchorOfAnOlderListIsExpiredWhereItsChangesWereLost) {
    const std::string root = anchor("root");
    home_.install(sketch, "Sketch");
    EXPECT_EQ(home_.run({"apps"}).exitCode, 0);
    std::size_t removed = 0;
    for (const auto& each : fs::recursive_directory_iterator(home_.path(".local/state"))) {
        if (each.path().filename() == "app-libraries.changes") {
            removed += fs::remove(each.path()) ? 1U : 0U;
            break;
        }
    }
    ASSERT_EQ(removed, 1U);
    EXPECT_EQ(home_.error({"changes", "root", "--since", root}, 1).at("name"), "syncAnchorExpired");
}

TEST_F(ApplicationDocumentsTest, anAnchorOfTheWorkingSetIsExpiredWhenTheListWasLost) {
    const std::string set = anchor("working-set");
    EXPECT_THAT(changes("working-set", set).at("deleted"), IsEmpty());
    fs::remove(home_.path(".local/share/Marrowdale/app-libraries.plist"));
    EXPECT_EQ(home_.error({"changes", "working-set", "--since", set}, 1).at("name"),
              "syncAnchorExpired");
    EXPECT_THAT(field(home_.lines({"apps"}), "itemIdentifier"), ElementsAre(notesItem));
}

TEST_F(ApplicationDocumentsTest, whoWatchesIsToldOfWhatHappensInANewLibrary) {
    const Service service(home_);
    ChildProcess watch(home_.command({"--json", "watch"}));
    home_.install(sketch, "Sketch");
    ASSERT_EQ(home_.run({"refresh"}).exitCode, 0);
    std::string output;
    int number = 0;
    const auto isTold = [&] {
        const std::size_t before = output.size();
        writeFile(home_.library(sketch) + "/" + std::to_string(++number), "");
        constexpr std::chrono::seconds aWhile{2};
        output = watch.readOutput(before + 1, aWhile);
        return output.substr(before).contains("WorkingSet");
    };
    // What the application's coming brought is told first.
    EXPECT_TRUE(waitUntil(isTold));
    EXPECT_TRUE(waitUntil(isTold));
}

TEST_F(ApplicationDocumentsTest, aSearchFindsDocumentsOfApplicationsWhileTheyAreThere) {
    writeFile(inNotes("minutes.txt"), "");
    writeFile(home_.document("minutes of mine.txt"), "");
    const Service service(home_);
    EXPECT_THAT(field(home_.lines({"search", "minutes"}), "filename"),
                UnorderedElementsAre("minutes.txt", "minutes of mine.txt"));
    fs::remove(home_.entry(notes));
    ASSERT_EQ(home_.run({"refresh"}).exitCode, 0);
    EXPECT_THAT(field(home_.lines({"search", "minutes"}), "filename"),
                ElementsAre("minutes of mine.txt"));
    home_.install(notes, "Notes");
    ASSERT_EQ(home_.run({"refresh"}).exitCode, 0);
    EXPECT_THAT(field(home_.lines({"search", "minutes"}), "filename"),
                UnorderedElementsAre("minutes.txt", "minutes of mine.txt"));
}

TEST_F(ApplicationDocumentsTest, documentsMoveBetweenALibraryAndTheUsersOwn) {
    makeFolder(home_.document("sub"));
    writeFile(inNotes("note.txt"), "note");
    const std::string identifier = identifierAt(inNotes("note.txt"));
    const Json moved = home_.line({"move", identifier, "--to", home_.identifierOf("sub")});
    EXPECT_EQ(moved.at("itemIdentifier"), identifier);
    EXPECT_EQ(moved.at("path"), home_.document("sub/note.txt"));
    EXPECT_EQ(home_.line({"move", identifier, "--to", notesItem}).at("path"), inNotes("note.txt"));
    const Json trashed = home_.line({"trash", identifier});
    EXPECT_EQ(trashed.at("path"), inNotes(".Trash/note.txt"));
    EXPECT_EQ(home_.line({"untrash", identifier}).at("path"), inNotes("note.txt"));
}

TEST_F(ApplicationDocumentsTest, aLibraryItselfCanNeitherBeRenamedNorMovedNorRemoved) {
    for (const Arguments& action :
         {Arguments{"rename", notesItem, "x"}, Arguments{"move", notesItem, "--to", "root"},
          Arguments{"trash", notesItem}, Arguments{"delete", notesItem}}) {
        EXPECT_EQ(home_.error(action, 1).at("name"), "writeNoPermission") << action[0];
    }
    EXPECT_TRUE(fs::is_directory(home_.library(notes)));
}

TEST_F(ApplicationDocumentsTest, anApplicationCanNotMisleadAService) {
    const Service service(home_);
    writeFile(inNotes("note.txt"), "");
    for (int round = 0; round < 3; ++round) {
        writeFile(inNotes("Inbox"), "");
        fs::remove_all(inNotes(".Trash"));
        fs::create_directory_symlink(home_.root(), inNotes(".Trash"));
        ASSERT_EQ(::mkfifo(inNotes("pipe").c_str(), 0600), 0);
        EXPECT_EQ(home_.run({"ls", notesItem}).exitCode, 0);
        EXPECT_EQ(home_.run({"purge", "--older-than", "2100-01-01T00:00:00Z"}).exitCode, 0);
        fs::rename(home_.library(notes), home_.path("away"));
        ASSERT_EQ(::mkfifo(home_.library(notes).c_str(), 0600), 0);
        EXPECT_THAT(home_.lines({"ls"}), ::testing::SizeIs(::testing::Le(1U)));
        fs::remove(home_.library(notes));
        fs::rename(home_.path("away"), home_.library(notes));
        fs::remove(inNotes("Inbox"));
        fs::remove(inNotes("pipe"));
    }
    ASSERT_EQ(home_.run({"refresh"}).exitCode, 0);
    EXPECT_THAT(field(home_.lines({"ls", notesItem}), "filename"), ElementsAre("note.txt"));
}

}  // namespace
}  // namespace marrowdale::tests
