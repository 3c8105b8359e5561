// What is told of what is done to the index, step by step: what no test on a disk can bring about
// at will, because it depends on what was looked at between two changes.

#include <array>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/StoreEventsTestSupport.h"
#include "platform/linux/store/TreeChanges.h"

namespace marrowdale::native {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

// An index that holds what was told, and the events of one commit after the other.
class TreeChangesTest : public testing::Test {
  protected:
    TreeChangesTest() { (void)index_.add(noRow, {}, valuesOf(RowKind::folder, 1)); }

    [[nodiscard]] Index& index() { return index_; }
    [[nodiscard]] TreeChanges& changes() { return changes_; }

    RowNumber addFolder(RowNumber folder, const std::string& name, std::uint64_t fileID) {
        return add(folder, name, valuesOf(RowKind::folder, fileID));
    }
    RowNumber addFile(RowNumber folder, const std::string& name, std::uint64_t fileID) {
        return add(folder, name, valuesOf(RowKind::file, fileID));
    }
    RowNumber addFileOfSize(RowNumber folder, const std::string& name, std::uint64_t fileID,
                            std::uint64_t size) {
        Row values = valuesOf(RowKind::file, fileID);
        values.size = size;
        return add(folder, name, values);
    }
    RowNumber addLink(RowNumber folder, const std::string& name, std::uint64_t fileID) {
        Row values = valuesOf(RowKind::file, fileID);
        values.set(Row::severalLinks, true);
        return add(folder, name, values);
    }
    void move(RowNumber row, RowNumber folder, const std::string& name) {
        changes_.leave(row);
        ASSERT_TRUE(changes_.arrive(row, folder, name));
    }
    void drop(RowNumber row) {
        changes_.leave(row);
        changes_.remove(row);
    }
    // "WHAT PATH, file N", with "(did=N)" for a document that is gone with it.
    std::vector<std::string> commit() {
        EventBatch batch;
        changes_.flush(batch);
        EXPECT_FALSE(changes_.hasChanges());
        std::vector<std::string> texts;
        batch.forEach([&](const StoredEvent& event) {
            const auto file = raw(event.fileID);
            texts.push_back(describe(event) +
                            (file != 0 ? ", file " + std::to_string(file) : std::string()));
        });
        return texts;
    }

  private:
    static Row valuesOf(RowKind kind, std::uint64_t fileID) {
        Row values{};
        values.fileID = fileID;
        values.birth = 1;
        values.flags = static_cast<std::uint32_t>(kind);
        return values;
    }
    RowNumber add(RowNumber folder, const std::string& name, const Row& values) {
        const RowNumber row = index_.add(folder, name, values);
        EXPECT_NE(row, noRow);
        return row;
    }

    PackageTypes packages_{std::array<std::string, 1>{"bundle"}};
    Index index_;
    TreeChanges changes_{index_, packages_};
};

// Deletions are told by the file's number, so whoever hears of one forgets the other names too.
TEST_F(TreeChangesTest, WhenANameGoesTheOthersAreToldOf) {
    const RowNumber a = addLink(rootRow, "a", 10);
    (void)addLink(rootRow, "b", 10);
    drop(a);
    EXPECT_THAT(commit(), ElementsAre("gone a, file 10", "changed b, file 10"));
}

TEST_F(TreeChangesTest, WhenANameIsRenamedTheOthersAreToldOf) {
    const RowNumber a = addLink(rootRow, "a", 10);
    (void)addLink(rootRow, "b", 10);
    move(a, rootRow, "c");
    EXPECT_THAT(commit(),
                ElementsAre("gone+renamed a, file 10", "renamed c, file 10", "changed b, file 10"));
}

// The last look at a name may have been when the other one was gone already.
TEST_F(TreeChangesTest, OtherNamesCountWhateverTheLinksWereAtTheLastLook) {
    const RowNumber a = addFile(rootRow, "a", 10);
    (void)addFile(rootRow, "b", 10);
    drop(a);
    EXPECT_THAT(commit(), ElementsAre("gone a, file 10", "changed b, file 10"));
}

TEST_F(TreeChangesTest, WhenAFileChangesUnderOneNameTheOthersAreToldOf) {
    const RowNumber package = addFolder(rootRow, "a.bundle", 9);
    const RowNumber inside = addLink(package, "a", 10);
    (void)addLink(rootRow, "b", 10);
    changes().changed(inside);
    EXPECT_THAT(commit(), ElementsAre("changed a.bundle, file 9", "changed b, file 10"));
    const RowNumber hidden = addLink(rootRow, ".hidden", 10);
    changes().changed(hidden);
    EXPECT_THAT(commit(), ElementsAre("changed .hidden, file 10", "changed b, file 10"));
}

// A file's size stands where a folder has its first child.
TEST_F(TreeChangesTest, AFileThatIsNotEmptyMoves) {
    const RowNumber file = addFileOfSize(rootRow, "file", 10, 1U << 20U);
    move(file, rootRow, "moved");
    EXPECT_THAT(commit(), ElementsAre("gone+renamed file, file 10", "renamed moved, file 10"));
    changes().returned(file);
    EXPECT_THAT(commit(), ElementsAre("renamed moved, file 10"));
}

TEST_F(TreeChangesTest, AnotherNameThatIsToldOfAnywayIsToldOfOnce) {
    const RowNumber a = addLink(rootRow, "a", 10);
    const RowNumber b = addLink(rootRow, "b", 10);
    drop(a);
    changes().changed(b);
    EXPECT_THAT(commit(), ElementsAre("gone a, file 10", "changed b, file 10"));
}

// Who looked for something below the folder while it was on its way took it for gone.
TEST_F(TreeChangesTest, OtherNamesOfFilesInAFolderThatMoves) {
    const RowNumber folder = addFolder(rootRow, "folder", 10);
    (void)addLink(folder, "a", 11);
    (void)addLink(rootRow, "b", 11);
    move(folder, rootRow, "moved");
    EXPECT_THAT(commit(), ElementsAre("gone+renamed folder/, file 10", "renamed moved/, file 10",
                                      "changed b, file 11"));
}

TEST_F(TreeChangesTest, AFolderThatWasAwayForAMoment) {
    const RowNumber folder = addFolder(rootRow, "folder", 10);
    (void)addLink(folder, "a", 11);
    (void)addLink(rootRow, "b", 11);
    changes().returned(folder);
    EXPECT_THAT(commit(), ElementsAre("renamed folder/, file 10", "changed b, file 11"));
}

TEST_F(TreeChangesTest, WhatIsInLimboAtACommitIsToldToBeGoneAndComesBack) {
    const RowNumber folder = addFolder(rootRow, "folder", 10);
    changes().leave(folder);
    EXPECT_THAT(commit(), ElementsAre("gone+renamed folder/, file 10"));
    EXPECT_THAT(commit(), IsEmpty());
    ASSERT_TRUE(changes().arrive(folder, rootRow, "moved"));
    EXPECT_THAT(commit(), ElementsAre("renamed moved/, file 10"));
}

TEST_F(TreeChangesTest, WhatIsInLimboAtACommitAndStandsWhereItStood) {
    const RowNumber file = addFile(rootRow, "file", 10);
    changes().leave(file);
    EXPECT_THAT(commit(), ElementsAre("gone+renamed file, file 10"));
    ASSERT_TRUE(changes().arrive(file, rootRow, "file"));
    EXPECT_THAT(commit(), ElementsAre("renamed file, file 10"));
}

// Its number may be another file's by then.
TEST_F(TreeChangesTest, WhatIsInLimboAtACommitIsToldToBeGoneOnce) {
    const RowNumber file = addFile(rootRow, "file", 10);
    index().setDocument(file, 5);
    changes().leave(file);
    EXPECT_THAT(commit(), ElementsAre("gone+renamed file, file 10"));
    changes().remove(file);
    EXPECT_THAT(commit(), ElementsAre("gone file (did=5)"));
}

// As after a restart: the row was in limbo when the store was closed.
TEST_F(TreeChangesTest, WhatWasInLimboInAnEarlierRun) {
    const RowNumber folder = addFolder(rootRow, "folder", 10);
    const RowNumber file = addFile(rootRow, "file", 11);
    index().setDocument(file, 5);
    index().putInLimbo(folder);
    index().putInLimbo(file);
    EXPECT_THAT(commit(), IsEmpty());
    ASSERT_TRUE(changes().arrive(folder, rootRow, "moved"));
    changes().remove(file);
    EXPECT_THAT(commit(), ElementsAre("gone file (did=5)", "renamed moved/, file 10"));
}

// Whoever is told knows them at the old place; the new one may be hidden from him.
TEST_F(TreeChangesTest, WhatGoesFromAFolderThatMovedIsGoneFromTheOldPlace) {
    const RowNumber folder = addFolder(rootRow, "folder", 10);
    const RowNumber file = addFile(folder, "file", 11);
    move(folder, rootRow, ".hidden");
    drop(file);
    EXPECT_THAT(commit(), ElementsAre("gone folder/file, file 11", "gone+renamed folder/, file 10",
                                      "renamed .hidden/, file 10"));
}

TEST_F(TreeChangesTest, WhatGoesWithAFolderThatItCameIntoIsGoneFromItsOldPlace) {
    const RowNumber hidden = addFolder(rootRow, ".hidden", 10);
    const RowNumber file = addFile(rootRow, "file", 11);
    index().setDocument(file, 5);
    move(file, hidden, "file");
    drop(hidden);
    EXPECT_THAT(commit(), ElementsAre("gone .hidden/, file 10", "gone file (did=5), file 11"));
}

TEST_F(TreeChangesTest, WhatGoesWithAPackageThatItCameIntoIsGoneFromItsOldPlace) {
    const RowNumber package = addFolder(rootRow, "a.bundle", 10);
    const RowNumber file = addFile(rootRow, "file", 11);
    move(file, package, "file");
    drop(package);
    EXPECT_THAT(commit(), ElementsAre("gone a.bundle, file 10", "gone file, file 11"));
}

// Rows are used again at once.
TEST_F(TreeChangesTest, ARowThatIsUsedAgainHasNoPast) {
    const RowNumber folder = addFolder(rootRow, "folder", 10);
    const RowNumber file = addFile(rootRow, "file", 11);
    move(file, folder, "file");
    drop(folder);
    const RowNumber first = addFile(rootRow, "first", 20);
    const RowNumber second = addFile(rootRow, "second", 21);
    ASSERT_TRUE(first == file || second == file);
    changes().appeared(first);
    changes().appeared(second);
    EXPECT_THAT(commit(),
                UnorderedElementsAre("gone folder/, file 10", "gone file, file 11",
                                     "appeared first, file 20", "appeared second, file 21"));
}

// One of the names may be hidden from whoever knows another.
TEST_F(TreeChangesTest, AGoneDocumentIsGoneUnderEachName) {
    const RowNumber hidden = addLink(rootRow, ".hidden", 10);
    (void)addLink(rootRow, "a", 10);
    changes().documentGone(hidden, 5);
    EXPECT_THAT(commit(), ElementsAre("gone .hidden (did=5)", "gone a (did=5)"));
}

TEST_F(TreeChangesTest, AGoneDocumentOfAFileThatMovedIsGoneAtBothPlaces) {
    const RowNumber file = addFile(rootRow, ".hidden", 10);
    move(file, rootRow, "a");
    changes().documentGone(file, 5);
    EXPECT_THAT(commit(), ElementsAre("gone+renamed .hidden (did=5), file 10", "gone a (did=5)",
                                      "renamed a, file 10"));
}

TEST_F(TreeChangesTest, AGoneDocumentInAPackageIsToldAtThePackage) {
    const RowNumber package = addFolder(rootRow, "a.bundle", 10);
    const RowNumber file = addFile(package, "file", 11);
    changes().documentGone(file, 5);
    EXPECT_THAT(commit(), ElementsAre("gone a.bundle (did=5)"));
}

// Whoever knows a link knows it by the number of what it leads to.
TEST_F(TreeChangesTest, APackageThatBecomesAFolderIsADocumentNoMore) {
    const RowNumber folder = addFolder(rootRow, "folder", 10);
    const RowNumber package = addFolder(rootRow, "a.bundle", 11);
    index().setDocument(package, 7);
    move(package, folder, "a.bundle");
    EXPECT_THAT(commit(),
                ElementsAre("gone+renamed a.bundle, file 11", "renamed folder/a.bundle, file 11"));
    move(package, folder, "a");
    move(folder, rootRow, "moved");
    EXPECT_THAT(commit(), ElementsAre("gone+renamed folder/a.bundle (did=7), file 11",
                                      "gone+renamed folder/, file 10", "renamed moved/a/, file 11",
                                      "renamed moved/, file 10"));
    EXPECT_EQ(index().row(package).document, 7U) << "it may become one again";
    move(package, folder, "b.bundle");
    EXPECT_THAT(commit(),
                ElementsAre("gone+renamed moved/a/, file 11", "renamed moved/b.bundle, file 11"));
}

TEST_F(TreeChangesTest, NorIsOneThatWasToldToBeGoneBefore) {
    const RowNumber package = addFolder(rootRow, "a.bundle", 11);
    index().setDocument(package, 7);
    changes().leave(package);
    EXPECT_THAT(commit(), ElementsAre("gone+renamed a.bundle, file 11"));
    ASSERT_TRUE(changes().arrive(package, rootRow, "a"));
    EXPECT_THAT(commit(), ElementsAre("gone a (did=7)", "renamed a/, file 11"));
}

TEST_F(TreeChangesTest, WhatMovesIntoAPackageIsADocumentNoMore) {
    const RowNumber package = addFolder(rootRow, "a.bundle", 10);
    const RowNumber file = addFile(rootRow, "file", 11);
    index().setDocument(file, 5);
    move(file, package, "file");
    EXPECT_THAT(commit(), ElementsAre("gone+renamed file, file 11", "gone file (did=5)",
                                      "changed a.bundle, file 10"));
}

TEST_F(TreeChangesTest, WhatMovesIntoAPackageAndHasANameOutsideStaysADocument) {
    const RowNumber package = addFolder(rootRow, "a.bundle", 10);
    const RowNumber file = addLink(rootRow, "file", 11);
    index().setDocument(file, 5);
    index().setDocument(addLink(rootRow, "other", 11), 5);
    move(file, package, "file");
    EXPECT_THAT(commit(), ElementsAre("gone+renamed file, file 11", "changed a.bundle, file 10",
                                      "changed other, file 11"));
}

TEST_F(TreeChangesTest, APackageThatWasChangedAndCameIntoAnother) {
    const RowNumber outer = addFolder(rootRow, "outer.bundle", 10);
    const RowNumber inner = addFolder(rootRow, "inner.bundle", 11);
    changes().changed(addFile(inner, "file", 12));
    move(inner, outer, "inner.bundle");
    EXPECT_THAT(commit(),
                ElementsAre("gone+renamed inner.bundle, file 11", "changed outer.bundle, file 10"));
}

}  // namespace
}  // namespace marrowdale::native
