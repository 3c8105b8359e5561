#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/ChangesCollector.h"
#include "host/testing/FakeExtension.h"

namespace marrowdale::host {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

FileProviderItemPtr item(std::string_view identifier, std::uint64_t fileID) {
    auto item = std::make_shared<FakeItem>(identifier);
    item->fileID = fileID;
    return item;
}

std::vector<std::string> identifiers(const std::vector<FileProviderItemPtr>& items) {
    std::vector<std::string> all;
    for (const auto& item : items) {
        all.push_back(item->itemIdentifier);
    }
    return all;
}

TEST(ChangesCollectorTest, theLastWordOfAnIdentifierCounts) {
    ChangesCollector collector;
    collector.didUpdateItems({item("did=1", 1), item("did=2", 2)});
    collector.didDeleteItemsWithIdentifiers({"did=1", "did=3"});
    collector.didUpdateItems({item("did=3", 3)});
    collector.finishEnumeratingChangesUpToSyncAnchor(Data::fromText("next"), MoreComing::yes);
    const auto changes = collector.wait();
    ASSERT_TRUE(changes.has_value());
    EXPECT_THAT(identifiers(changes->updated), ElementsAre("did=2", "did=3"));
    EXPECT_THAT(changes->deleted, ElementsAre("did=1"));
    EXPECT_EQ(changes->anchor, Data::fromText("next"));
    EXPECT_EQ(changes->moreComing, MoreComing::yes);
}

TEST(ChangesCollectorTest, aDeletedFileNumberTakesTheItemOfThatNumberBack) {
    ChangesCollector collector;
    collector.didUpdateItems({item("did=1", 7)});
    collector.didDeleteItemsWithIdentifiers({"fid=7"});
    collector.didUpdateItems({item("did=2", 8)});
    collector.finishEnumeratingChangesUpToSyncAnchor({}, MoreComing::no);
    const auto changes = collector.wait();
    EXPECT_THAT(identifiers(changes->updated), ElementsAre("did=2"));
    EXPECT_THAT(changes->deleted, ElementsAre("did=1", "fid=7"));
}

TEST(ChangesCollectorTest, aDeletedFolderTakesBackWhatWasToldToBeInIt) {
    const auto in = [](std::string_view parent, std::string_view identifier, std::uint64_t file) {
        auto item = std::make_shared<FakeItem>(identifier);
        item->fileID = file;
        item->parentItemIdentifier = parent;
        return item;
    };
    ChangesCollector collector;
    collector.didUpdateItems(
        {in("fid=1", "fid=2", 2), in("fid=2", "did=3", 3), in("x", "did=4", 4)});
    collector.didDeleteItemsWithIdentifiers({"fid=1"});
    collector.didUpdateItems({in("x", "did=3", 3)});
    collector.finishEnumeratingChangesUpToSyncAnchor({}, MoreComing::no);
    const auto changes = collector.wait();
    EXPECT_THAT(identifiers(changes->updated), ElementsAre("did=4", "did=3"));
    EXPECT_THAT(changes->deleted, ElementsAre("fid=1", "fid=2"));
}

TEST(ChangesCollectorTest, anErrorIsTheAnswerWhateverCameBefore) {
    ChangesCollector collector;
    collector.didUpdateItems({item("did=1", 7)});
    std::thread provider([&] { collector.finishEnumeratingWithError(errorSyncAnchorExpired()); });
    const auto changes = collector.wait();
    provider.join();
    ASSERT_FALSE(changes.has_value());
    EXPECT_EQ(changes.error(), errorSyncAnchorExpired());
}

}  // namespace
}  // namespace marrowdale::host
