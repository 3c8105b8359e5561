#include <filesystem>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/AnchorVersions.h"
#include "host/daemon/LibraryChanges.h"
#include "platform/foundation/KeyedArchive.h"
#include "platform/testing/RecordingLogSink.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::host {
namespace {

namespace fs = std::filesystem;

using ::testing::ElementsAre;

using Identifiers = std::vector<std::string>;

class LibraryChangesTest : public ::testing::Test {
  protected:
    LibraryChangesTest() {
        makeFolder(folder_.path("state"));
        makeFolder(folder_.path("data/Marrowdale"));
    }
    // The extension's list.
    void writeList(std::uint64_t version, const Identifiers& identifiers) const {
        ArchivedArray records;
        for (const std::string& identifier : identifiers) {
            records.emplace_back(ArchivedBundleRecord{identifier});
        }
        writeFile(folder_.path("data/Marrowdale/app-libraries.plist"),
                  archive(ArchivedDictionary{{"versionToken", Number(version)},
                                             {"bundleProxy", std::move(records)}})
                      ->text());
    }
    [[nodiscard]] std::string file() const { return folder_.path("state/app-libraries.changes"); }
    // What a new process knows that finds these libraries.
    [[nodiscard]] std::unique_ptr<LibraryChanges> begin(const Identifiers& identifiers,
                                                        std::uint64_t last) {
        auto changes =
            std::make_unique<LibraryChanges>(folder_.path("state"), folder_.path("data"), &log_);
        changes->begin(identifiers, EventID{last});
        return changes;
    }
    // A, known since version 1.
    [[nodiscard]] std::unique_ptr<LibraryChanges> beginWithOne() {
        auto changes = begin({"A"}, 5);
        writeList(1, {"A"});
        changes->listIsKnown();
        return changes;
    }
    // A refresh that finds B too.
    void addSecond(LibraryChanges& changes, std::uint64_t last) const {
        changes.note({"A", "B"}, EventID{last});
        writeList(2, {"A", "B"});
        changes.listIsKnown();
    }
    [[nodiscard]] static Data anchor(std::uint64_t version, std::uint64_t event) {
        return encodePropertyList(
                   PropertyList(PropertyListDictionary{{anchorLibraryVersionKey, version},
                                                       {anchorEventKey, event},
                                                       {anchorOffsetKey, std::uint64_t{3}}}))
            .value();
    }
    // "EVENT ITEM…" for such an anchor, with a "<" where it was moved; "none" where it is not
    // known.
    [[nodiscard]] static std::string bridge(const LibraryChanges& changes, std::uint64_t version,
                                            std::uint64_t event) {
        const auto bridge = changes.bridge(anchor(version, event));
        if (!bridge) {
            return "none";
        }
        EXPECT_EQ(libraryVersionIn(bridge->anchor), 0U);
        std::string text = bridge->isMoved ? "<" : "";
        text += std::to_string(raw(eventIn(bridge->anchor).value()));
        for (const std::string& each : bridge->known) {
            text += " " + each;
        }
        return text;
    }

    TemporaryDirectory folder_;
    std::shared_ptr<RecordingLogSink> sink_ = std::make_shared<RecordingLogSink>();
    Log log_{sink_, LogLevel::debug};
};

TEST_F(LibraryChangesTest, OtherAnchorsAreLeftAlone) {
    const auto changes = beginWithOne();
    EXPECT_EQ(bridge(*changes, 0, 9), "none") << "knows of no library";
    EXPECT_EQ(bridge(*changes, 2, 9), "none") << "ahead of the list";
    EXPECT_FALSE(changes->bridge(Data::fromText("no anchor")));
    EXPECT_EQ(bridge(*changes, 1, 9), "9 #A");
}

TEST_F(LibraryChangesTest, TheHolderMayKnowWhatWent) {
    const auto changes = beginWithOne();
    changes->note({"B"}, EventID{20});
    writeList(2, {"B"});
    changes->listIsKnown();
    changes->note({"C"}, EventID{30});
    writeList(3, {"C"});
    changes->listIsKnown();
    EXPECT_EQ(bridge(*changes, 1, 9), "9 #A #B #C");
    EXPECT_EQ(bridge(*changes, 2, 25), "25 #B #C");
    EXPECT_EQ(bridge(*changes, 3, 35), "35 #C");
}

TEST_F(LibraryChangesTest, AnAnchorFromBehindTheComingOfALibraryIsMovedBeforeIt) {
    const auto changes = beginWithOne();
    changes->note({"A", "B"}, EventID{20});
    // Before the list has it, whoever asks is answered of version 1, and of events behind 20.
    EXPECT_EQ(bridge(*changes, 1, 25), "<20 #A #B");
    writeList(2, {"A", "B"});
    EXPECT_EQ(bridge(*changes, 1, 25), "<20 #A #B");
    changes->listIsKnown();
    EXPECT_EQ(bridge(*changes, 1, 25), "<20 #A #B");
    EXPECT_EQ(bridge(*changes, 1, 20), "20 #A #B");
    EXPECT_EQ(bridge(*changes, 2, 25), "25 #A #B");
    const auto moved = changes->bridge(anchor(1, 25));
    EXPECT_EQ(moved->anchor, withoutLibraryVersion(withEvent(anchor(1, 25), EventID{20})));
    EXPECT_NE(moved->anchor, withoutLibraryVersion(anchor(1, 20))) << "its offset is another's";
}

// The registry may have been read before the change by whoever writes the next version.
TEST_F(LibraryChangesTest, TheNextVersionNeedNotHaveTheChange) {
    const auto changes = beginWithOne();
    changes->note({"A", "B"}, EventID{20});
    changes->note({"A", "B", "C"}, EventID{30});
    writeList(2, {"A", "B"});
    changes->listIsKnown();
    EXPECT_EQ(bridge(*changes, 2, 35), "<20 #A #B #C");
    writeList(3, {"A", "B", "C"});
    changes->listIsKnown();
    EXPECT_EQ(bridge(*changes, 2, 35), "<20 #A #B #C");
    EXPECT_EQ(bridge(*changes, 3, 35), "35 #A #B #C");
}

TEST_F(LibraryChangesTest, TheNextProcessKnowsIt) {
    addSecond(*beginWithOne(), 20);
    EXPECT_EQ(bridge(*begin({"A", "B"}, 40), 1, 25), "<20 #A #B");
    // What changed while none ran came behind the last event.
    const auto later = begin({"B"}, 50);
    EXPECT_EQ(bridge(*later, 2, 45), "45 #A #B");
    writeList(3, {"B"});
    later->listIsKnown();
    EXPECT_EQ(bridge(*begin({"B"}, 60), 2, 45), "45 #A #B");
    EXPECT_EQ(bridge(*begin({"B"}, 60), 3, 55), "55 #B");
}

TEST_F(LibraryChangesTest, KilledBeforeTheListHasIt) {
    beginWithOne()->note({"A", "B"}, EventID{20});
    const auto next = begin({"A", "B"}, 40);
    writeList(2, {"A", "B"});
    next->listIsKnown();
    EXPECT_EQ(bridge(*next, 1, 25), "<20 #A #B");
    EXPECT_EQ(bridge(*next, 2, 45), "45 #A #B");
}

TEST_F(LibraryChangesTest, WithoutWhatWasNotedTheNewestVersionAloneIsKnown) {
    addSecond(*beginWithOne(), 20);
    for (const std::string bytes : {"", "no list", "bplist00"}) {
        bytes.empty() ? static_cast<void>(fs::remove(file())) : writeFile(file(), bytes);
        const auto changes = begin({"A", "B"}, 40);
        EXPECT_EQ(bridge(*changes, 1, 15), "none") << bytes;
        EXPECT_EQ(bridge(*changes, 2, 25), "25 #A #B") << bytes;
    }
    const auto other = begin({"A"}, 50);
    EXPECT_EQ(bridge(*other, 2, 25), "25 #A #B") << "B went while none ran";
}

TEST_F(LibraryChangesTest, AnotherListBeginsAnew) {
    for (std::uint64_t version = 1; version < 9; ++version) {
        const auto changes = begin({std::to_string(version)}, version);
        writeList(version, {std::to_string(version)});
        changes->listIsKnown();
    }
    fs::remove(folder_.path("data/Marrowdale/app-libraries.plist"));
    const auto changes = begin({"A"}, 40);
    writeList(1, {"A"});
    changes->listIsKnown();
    EXPECT_EQ(bridge(*changes, 1, 45), "45 #A");
}

TEST_F(LibraryChangesTest, OnlySoManyAreRemembered) {
    const auto changes = beginWithOne();
    for (std::uint64_t i = 0; i < LibraryChanges::most + 1; ++i) {
        changes->note({"A", std::to_string(i)}, EventID{10 + i});
        writeList(2 + i, {std::to_string(i), "A"});
        changes->listIsKnown();
    }
    EXPECT_EQ(bridge(*changes, 1, 7), "none");
    EXPECT_NE(bridge(*changes, 2, 7), "none");
}

TEST_F(LibraryChangesTest, WhereNoOtherFileCanBeMadeTheOneThatIsThereIsWritten) {
    const auto changes = beginWithOne();
    makeFolder(folder_.path("state/.app-libraries.changes.new/in the way"));
    addSecond(*changes, 20);
    EXPECT_EQ(bridge(*begin({"A", "B"}, 40), 1, 25), "<20 #A #B");
    EXPECT_TRUE(sink_->lines().empty());
}

TEST_F(LibraryChangesTest, WhatCantBeWrittenIsNotLeftAsItWas) {
    const auto changes = beginWithOne();
    makeFolder(folder_.path("state/.app-libraries.changes.new/in the way"));
    fs::remove(file());
    fs::create_symlink(folder_.path("elsewhere"), file());
    changes->note({"A", "B"}, EventID{20});
    EXPECT_FALSE(fs::is_symlink(file()));
    EXPECT_EQ(sink_->countContaining("[ERROR] can't note how the app libraries change; "), 1U);
    EXPECT_EQ(bridge(*changes, 1, 25), "<20 #A #B") << "in this run";
    fs::remove_all(folder_.path("state/.app-libraries.changes.new"));
    writeList(2, {"A", "B"});
    changes->listIsKnown();
    EXPECT_EQ(bridge(*begin({"A", "B"}, 40), 1, 25), "<20 #A #B");
}

}  // namespace
}  // namespace marrowdale::host
