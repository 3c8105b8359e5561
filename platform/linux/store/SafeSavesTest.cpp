// How long a name is waited for: the rest is tried on real files (SafeSaveTest.cpp).

#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/EntryMerger.h"
#include "platform/linux/store/SafeSaves.h"

namespace marrowdale::native {
namespace {

constexpr FileID folder{2};
constexpr std::uint32_t document = 7;

class SafeSavesTest : public testing::Test {
  protected:
    SafeSavesTest() {
        (void)index_.add(noRow, {}, EntryMerger::valuesOf(look(raw(folder), 0040755U)));
        const RowNumber old = appear("doc", 10);
        index_.setDocument(old, document);
    }
    static EntryLook look(std::uint64_t file, std::uint32_t mode = 0100644U) {
        EntryLook look;
        look.status.fileID = FileID{file};
        look.status.mode = mode;
        look.status.linkCount = 1;
        look.status.hasBirth = true;
        look.status.birth = {static_cast<std::int64_t>(file), 0};
        look.status.changed = {1000, 0};
        look.lookedAt = {2000, 0};
        return look;
    }
    RowNumber appear(std::string_view name, std::uint64_t file) {
        return merger_.merge(rootRow, name, look(file));
    }
    void vanish(std::string_view name) { merger_.noteAbsent(rootRow, name); }
    std::vector<SafeSaves::Transfer> settleAt(std::chrono::seconds time) {
        auto transfers = saves_.settle(DeviceID{1}, SafeSaves::Knowledge::live,
                                       SafeSaves::Clock::time_point(time));
        for (const RowNumber number : index_.limboRows()) {
            changes_.remove(number);
        }
        return transfers;
    }
    [[nodiscard]] std::uint32_t documentAt(std::string_view name) const {
        const RowNumber row = index_.child(rootRow, name);
        return row == noRow ? 0 : index_.row(row).document;
    }
    void arriveBy(std::string_view name, SafeSaves::Arrival how, std::string_view from = {}) {
        saves_.arrived(folder, name, how, from);
    }

    // doc is renamed to some name, another file takes its place, and at last it is deleted.
    void saveThroughAnotherName(std::chrono::seconds deleted) {
        appear("aside", 10);
        arriveBy("aside", SafeSaves::Arrival::renamedWithin, "doc");
        appear("doc", 11);
        arriveBy("doc", SafeSaves::Arrival::renamedWithin, "temporary");
        EXPECT_TRUE(settleAt(std::chrono::seconds(100)).empty());
        EXPECT_EQ(documentAt("aside"), document) << "until it is known to be a save";
        vanish("aside");
        (void)settleAt(deleted);
    }

    Index index_;
    PackageTypes packages_;
    TreeChanges changes_{index_, packages_};
    OwnMoves own_;
    SafeSaves saves_{index_, changes_, own_};
    EntryMerger merger_{index_, changes_, saves_};
};

TEST_F(SafeSavesTest, WhatLeftByOurOwnDoingWasNotSaved) {
    OwnMoves::Note removal(&own_, OwnMoves::Kind::isRemoved, {folder, "doc", FileID{10}});
    removal.wasDone();
    vanish("doc");
    EXPECT_TRUE(settleAt(std::chrono::seconds(100)).empty());
    appear("doc", 11);
    arriveBy("doc", SafeSaves::Arrival::renamedWithin, "temporary");
    EXPECT_TRUE(settleAt(std::chrono::seconds(101)).empty());
    EXPECT_EQ(documentAt("doc"), 0U);
    EXPECT_FALSE(own_.hasRemovals());
}

TEST_F(SafeSavesTest, WhatCameByOurOwnDoingSavesNothing) {
    vanish("doc");
    EXPECT_TRUE(settleAt(std::chrono::seconds(100)).empty());
    OwnMoves::Note arrival(&own_, OwnMoves::Kind::arrives, {folder, "doc", FileID{11}});
    arrival.wasDone();
    appear("doc", 11);
    arriveBy("doc", SafeSaves::Arrival::renamedWithin, "temporary");
    EXPECT_TRUE(settleAt(std::chrono::seconds(101)).empty());
}

TEST_F(SafeSavesTest, WhatWasNotDoneAfterAllIsNoReason) {
    {
        const OwnMoves::Note refused(&own_, OwnMoves::Kind::leaves, {folder, "doc", FileID{10}});
    }
    {
        const OwnMoves::Note refused(&own_, OwnMoves::Kind::arrives, {folder, "doc", FileID{11}});
    }
    vanish("doc");
    EXPECT_TRUE(settleAt(std::chrono::seconds(100)).empty());
    appear("doc", 11);
    arriveBy("doc", SafeSaves::Arrival::renamedWithin, "temporary");
    EXPECT_EQ(settleAt(std::chrono::seconds(101)).size(), 1U);
}

TEST_F(SafeSavesTest, AFileRenamedOntoAnUnlinkedNameInTime) {
    vanish("doc");
    EXPECT_TRUE(settleAt(std::chrono::seconds(100)).empty());
    appear("doc", 11);
    arriveBy("doc", SafeSaves::Arrival::renamedWithin, "temporary");
    EXPECT_EQ(settleAt(std::chrono::seconds(115)).size(), 1U);
    EXPECT_EQ(documentAt("doc"), document);
}

TEST_F(SafeSavesTest, AFileRenamedOntoAnUnlinkedNameTooLate) {
    vanish("doc");
    (void)settleAt(std::chrono::seconds(100));
    appear("doc", 11);
    arriveBy("doc", SafeSaves::Arrival::renamedWithin, "temporary");
    EXPECT_TRUE(settleAt(std::chrono::seconds(116)).empty());
    EXPECT_EQ(documentAt("doc"), 0U);
}

TEST_F(SafeSavesTest, TheEarlierFileIsDeletedInTime) {
    saveThroughAnotherName(std::chrono::seconds(115));
    EXPECT_EQ(documentAt("doc"), document);
}

TEST_F(SafeSavesTest, TheEarlierFileIsDeletedTooLate) {
    saveThroughAnotherName(std::chrono::seconds(116));
    EXPECT_EQ(documentAt("doc"), 0U);
}

TEST_F(SafeSavesTest, WhatWasGivenOutBetweenTwoSavesDoesNotTakeTheName) {
    appear("doc", 11);
    index_.setDocument(index_.child(rootRow, "doc"), document + 1);  // somebody asked
    appear("doc", 12);
    arriveBy("doc", SafeSaves::Arrival::renamedWithin, "temporary");
    const auto transfers = settleAt(std::chrono::seconds(100));
    ASSERT_EQ(transfers.size(), 1U);
    EXPECT_EQ(transfers.front().document, document);
    EXPECT_EQ(documentAt("doc"), document);
    EXPECT_TRUE(index_.rowsOfDocument(document + 1).empty());
}

TEST_F(SafeSavesTest, NorDoesItWhenTheNameIsTakenLater) {
    appear("doc", 11);
    index_.setDocument(index_.child(rootRow, "doc"), document + 1);
    vanish("doc");
    EXPECT_TRUE(settleAt(std::chrono::seconds(100)).empty());
    appear("doc", 12);
    arriveBy("doc", SafeSaves::Arrival::renamedWithin, "temporary");
    EXPECT_EQ(settleAt(std::chrono::seconds(101)).size(), 1U);
    EXPECT_EQ(documentAt("doc"), document);
    // The next save finds it there.
    appear("doc", 13);
    arriveBy("doc", SafeSaves::Arrival::renamedWithin, "temporary");
    EXPECT_EQ(settleAt(std::chrono::seconds(102)).size(), 1U);
    EXPECT_EQ(documentAt("doc"), document);
}

// A request had what was found committed, and the process was killed before the decision.
TEST_F(SafeSavesTest, ANameThatWasLeftInTheRunBeforeIsDecidedAbout) {
    appear("doc", 11);
    ASSERT_EQ(index_.limboRows().size(), 1U);
    TreeChanges changes(index_, packages_);
    SafeSaves saves(index_, changes, own_);
    changes.recallDepartures();
    const auto transfers = saves.settle(DeviceID{1}, SafeSaves::Knowledge::result,
                                        SafeSaves::Clock::time_point(std::chrono::seconds(1)));
    ASSERT_EQ(transfers.size(), 1U);
    EXPECT_EQ(transfers.front().document, document);
    EXPECT_EQ(documentAt("doc"), document);
}

TEST_F(SafeSavesTest, AnUnlinkedNameThatIsMadeAnew) {
    vanish("doc");
    (void)settleAt(std::chrono::seconds(100));
    appear("doc", 11);
    arriveBy("doc", SafeSaves::Arrival::made);
    EXPECT_TRUE(settleAt(std::chrono::seconds(101)).empty());
    EXPECT_EQ(documentAt("doc"), 0U);
}

TEST_F(SafeSavesTest, AFileThatComesBackInTimeHasItsIdentifierBack) {
    vanish("doc");
    (void)settleAt(std::chrono::seconds(100));
    EXPECT_EQ(documentAt("doc"), 0U);
    appear("elsewhere", 10);
    EXPECT_EQ(documentAt("elsewhere"), document);
}

TEST_F(SafeSavesTest, AnotherFileOfThatNumberDoesNot) {
    vanish("doc");
    (void)settleAt(std::chrono::seconds(100));
    auto other = look(10);
    other.status.birth = {99, 0};
    (void)merger_.merge(rootRow, "elsewhere", other);
    EXPECT_EQ(documentAt("elsewhere"), 0U);
}

// The name at which it comes to rest may be hidden from whoever knows another one.
TEST_F(SafeSavesTest, ADocumentLeavesEachNameOfItsFile) {
    EntryLook linked = look(10);
    linked.status.linkCount = 2;
    ASSERT_NE(merger_.merge(rootRow, "doc.bak", linked), noRow);
    vanish("doc");
    ASSERT_NE(merger_.merge(rootRow, "doc~", linked), noRow);
    arriveBy("doc~", SafeSaves::Arrival::renamedWithin, "doc");
    appear("doc", 11);
    arriveBy("doc", SafeSaves::Arrival::made);
    EXPECT_EQ(settleAt(std::chrono::seconds(100)).size(), 1U);
    EXPECT_EQ(documentAt("doc"), document);
    EventBatch batch;
    changes_.flush(batch);
    std::vector<std::string> left;
    batch.forEach([&](const StoredEvent& event) {
        if (event.goneDocument == DocumentID{document}) {
            left.emplace_back(event.path);
        }
    });
    EXPECT_THAT(left, testing::UnorderedElementsAre("doc.bak", "doc~"));
}

}  // namespace
}  // namespace marrowdale::native
