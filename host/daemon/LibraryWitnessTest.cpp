#include <filesystem>

#include <gtest/gtest.h>

#include "host/daemon/LibraryWitness.h"
#include "platform/foundation/KeyedArchive.h"
#include "platform/testing/RecordingLogSink.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::host {
namespace {

namespace fs = std::filesystem;

class LibraryWitnessTest : public ::testing::Test {
  protected:
    LibraryWitnessTest() {
        makeFolder(folder_.path("state"));
        makeFolder(folder_.path("data/Marrowdale"));
    }
    [[nodiscard]] std::string list() const {
        return folder_.path("data/Marrowdale/app-libraries.plist");
    }
    [[nodiscard]] std::string workingSetList() const {
        return folder_.path("data/Marrowdale/searchable-app-libraries.plist");
    }
    void writeList(std::uint64_t version, const std::string& content = "a") const {
        writeFile(list(), archive(ArchivedDictionary{{"versionToken", Number(version)},
                                                     {"bundleProxy", content}})
                              ->text());
    }
    LibraryWitness open() {
        return {folder_.path("state"), folder_.path("data"), packages_, &log_};
    }
    // What a run of the program leaves.
    UUID run() {
        LibraryWitness witness(folder_.path("state"), folder_.path("data"), packages_, &log_);
        witness.lookAgain();
        return witness.marked({});
    }
    std::vector<std::string> packages_;
    TemporaryDirectory folder_;
    std::shared_ptr<RecordingLogSink> sink_ = std::make_shared<RecordingLogSink>();
    Log log_{sink_, LogLevel::debug};
};

TEST_F(LibraryWitnessTest, theMarkStaysWhileTheListGoesOn) {
    const UUID mark = run();  // there is no list yet
    EXPECT_EQ(run(), mark);
    writeList(1);
    EXPECT_EQ(run(), mark);
    EXPECT_EQ(run(), mark);
    writeList(2);
    EXPECT_EQ(run(), mark);
    writeList(9, "by others");
    EXPECT_EQ(run(), mark);
    EXPECT_TRUE(fs::exists(list()));
}

TEST_F(LibraryWitnessTest, historiesKeepTheirDifferencesUnderIt) {
    const UUID one = UUID::random();
    const UUID other = UUID::random();
    const LibraryWitness& witness = open();
    EXPECT_EQ(witness.marked(one), witness.marked(one));
    EXPECT_NE(witness.marked(one), witness.marked(other));
    EXPECT_NE(witness.marked(one), one);
}

TEST_F(LibraryWitnessTest, aListThatIsGoneDamagedOlderOrOtherIsMadeAnew) {
    const std::vector<std::function<void()>> accidents{
        [this] { fs::remove(list()); }, [this] { writeFile(list(), "junk"); },
        [this] { writeFile(list(), ""); }, [this] { writeList(4); },
        [this] { writeList(5, "other"); }};
    for (const auto& accident : accidents) {
        writeList(5);
        const UUID mark = run();
        writeFile(workingSetList(), "what was known");
        accident();
        EXPECT_NE(run(), mark);
        EXPECT_FALSE(fs::exists(list()));
        EXPECT_FALSE(fs::exists(workingSetList()));
    }
    EXPECT_EQ(sink_->countContaining("the list of app libraries is not the one that it was"),
              accidents.size());
}

TEST_F(LibraryWitnessTest, aListThatIsLostWhileItIsWatchedChangesTheMarkOnceAndIsCleanedUpLater) {
    writeList(5);
    const UUID before = run();
    UUID after;
    {
        LibraryWitness witness(folder_.path("state"), folder_.path("data"), packages_, &log_);
        writeList(1);
        witness.lookAgain();
        after = witness.marked({});
        EXPECT_NE(after, before);
        writeList(2);
        witness.lookAgain();
        EXPECT_EQ(witness.marked({}), after);
    }
    EXPECT_NE(run(), after);
    EXPECT_FALSE(fs::exists(list()));
}

TEST_F(LibraryWitnessTest, withoutWhatWasSeenTheMarkIsAnotherAndTheListStays) {
    writeList(5);
    const UUID mark = run();
    for (const char* damage : {"", "junk"}) {
        writeFile(folder_.path("state/app-libraries.witness"), damage);
        const UUID other = run();
        EXPECT_NE(other, mark);
        EXPECT_EQ(run(), other);
    }
    EXPECT_TRUE(fs::exists(list()));
}

TEST_F(LibraryWitnessTest, otherPackagesThanBeforeChangeTheMarkAndNotTheList) {
    writeList(5);
    const UUID none = run();
    packages_ = {"note"};
    const UUID one = run();
    EXPECT_NE(one, none);
    EXPECT_EQ(run(), one);
    packages_ = {"note", "sketch"};
    EXPECT_NE(run(), one);
    EXPECT_TRUE(fs::exists(list()));
}

TEST_F(LibraryWitnessTest, aStateThatCantBeWrittenIsToldAndNeverTrusted) {
    makeFolder(folder_.path("state/app-libraries.witness/in the way"));
    EXPECT_NE(run(), run());
    EXPECT_GE(sink_->countContaining("can't remember the list of app libraries; "), 2U);
}

}  // namespace
}  // namespace marrowdale::host
