#include <filesystem>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/Replica.h"
#include "host/requests/TagNames.h"
#include "host/testing/FakeExtension.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::host {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

std::shared_ptr<FakeItem> item(std::string_view identifier, std::string_view name,
                               std::uint64_t fileID) {
    auto item = std::make_shared<FakeItem>(identifier, "/root/" + std::string(name));
    item->fileID = fileID;
    return item;
}

class ReplicaTest : public ::testing::Test {
  protected:
    ReplicaTest() : replica_(Replica::open(path_).value()) {}

    [[nodiscard]] std::vector<std::string> found(const std::vector<std::string>& words,
                                                 std::int64_t limit = 100) {
        std::vector<std::string> names;
        const auto items = replica_.search(words, limit);
        for (const auto& item : items.value()) {
            names.push_back(item->filename);
        }
        return names;
    }
    void add(const std::vector<FileProviderItemPtr>& items) {
        ASSERT_TRUE(replica_.add(items).has_value());
    }

    TemporaryDirectory folder_;
    std::string path_ = folder_.path("replica");
    Replica replica_;
};

TEST_F(ReplicaTest, favoritesRecentsAndTaggedItemsAreFound) {
    auto favorite = item("did=1", "favorite", 1);
    favorite->favoriteRank = Number(std::int64_t{5});
    auto older = item("did=2", "older", 2);
    older->lastUsedDate = Date{1'000'000'000, 0};
    auto newer = item("did=3", "newer", 3);
    newer->lastUsedDate = Date{1'500'000'000, 1};
    const std::vector<std::string> red{"Red", "work"};
    const std::vector<std::string> redder{"Redder"};
    older->tagData = tagDataFor(red);
    newer->tagData = tagDataFor(redder);
    add({favorite, older, newer, item("did=4", "plain", 4)});
    using Kind = ItemCollection::Kind;
    const auto names = [&](const ItemCollection& collection, std::int64_t limit = 100) {
        std::vector<std::string> all;
        const auto items = replica_.collection(collection, limit);
        for (const auto& each : items.value()) {
            all.push_back(each->filename);
        }
        return all;
    };
    EXPECT_THAT(names({Kind::favorites}), ElementsAre("favorite"));
    EXPECT_THAT(names({Kind::recents}), ElementsAre("newer", "older"));
    EXPECT_THAT(names({Kind::recents}, 1), ElementsAre("newer"));
    EXPECT_THAT(names({Kind::tagged, "Red"}), ElementsAre("older"));
    EXPECT_THAT(names({Kind::tagged, "Re"}), IsEmpty());
    EXPECT_THAT(replica_.tags().value(),
                ElementsAre(TagCount{"Red", 1}, TagCount{"Redder", 1}, TagCount{"work", 1}));
    favorite->favoriteRank = std::nullopt;
    add({favorite});
    EXPECT_THAT(names({Kind::favorites}), IsEmpty());
}

TEST_F(ReplicaTest, anyPartOfANameOrTagIsFoundWithoutRegardToCase) {
    const std::vector<std::string> tags{"Important", "x"};
    auto tagged = item("did=1", "letter", 1);
    tagged->tagData = tagDataFor(tags);
    add({tagged, item("did=2", "Jahresbericht ÄÖ 2026", 2), item("did=3", "a%_b\"c'*", 3)});
    EXPECT_THAT(found({"port"}), ElementsAre("letter"));
    EXPECT_THAT(found({"BERICHT", "20"}), ElementsAre("Jahresbericht ÄÖ 2026"));
    EXPECT_THAT(found({"äö "}), ElementsAre("Jahresbericht ÄÖ 2026"));
    EXPECT_THAT(found({"x"}), ElementsAre("letter"));
    EXPECT_THAT(found({"\"c'"}), ElementsAre("a%_b\"c'*"));
    EXPECT_THAT(found({"%"}), ElementsAre("a%_b\"c'*"));
    EXPECT_THAT(found({"NEAR", "AND"}), IsEmpty());
    EXPECT_EQ(found({}).size(), 3U);
    EXPECT_EQ(found({}, 2).size(), 2U);
}

TEST_F(ReplicaTest, changesTakeTheirAnchorWithThem) {
    add({item("did=1", "one", 1), item("did=2", "two", 2), item("fid=3", "three", 3)});
    EXPECT_EQ(replica_.anchor().value(), std::nullopt);
    const ItemChanges changes{
        {item("did=2", "zwei", 2)}, {"did=1", "fid=3"}, Data::fromText("a"), {}};
    ASSERT_TRUE(replica_.apply(changes).has_value());
    EXPECT_THAT(found({}), ElementsAre("zwei"));
    EXPECT_EQ(replica_.anchor().value(), Data::fromText("a"));
}

TEST_F(ReplicaTest, aDeletedFileNumberTakesTheItemOfThatNumber) {
    add({item("did=1", "one", 7), item("did=2", "two", 8)});
    ASSERT_TRUE(replica_.apply({{}, {"fid=7"}, Data::fromText("a"), {}}).has_value());
    EXPECT_THAT(found({}), ElementsAre("two"));
}

TEST_F(ReplicaTest, aDeletedFolderTakesWhatIsInIt) {
    auto folder = item("fid=1", "folder", 1);
    auto inner = item("fid=2", "inner", 2);
    inner->parentItemIdentifier = "fid=1";
    auto document = item("did=3", "document", 3);
    document->parentItemIdentifier = "fid=2";
    auto moved = item("did=4", "moved", 4);
    moved->parentItemIdentifier = "fid=2";
    add({folder, inner, document, moved, item("did=5", "other", 5)});
    ASSERT_TRUE(replica_.apply({{item("did=4", "moved", 4)}, {"fid=1"}, Data::fromText("a"), {}})
                    .has_value());
    EXPECT_THAT(found({}), ElementsAre("moved", "other"));
}

TEST_F(ReplicaTest, aDomainGoesWithItsItems) {
    const std::vector<std::string> domains{"#org.example.A"};
    auto library = item("#org.example.A", "A", 1);
    library->hx_appContainerBundleIdentifier = "org.example.A";
    auto document = item("did=1", "note", 2);
    document->hx_appContainerBundleIdentifier = "org.example.A";
    add({library, document, item("did=2", "other", 3)});
    ASSERT_TRUE(replica_.removeDomains(domains).has_value());
    EXPECT_THAT(found({}), ElementsAre("other"));
}

TEST_F(ReplicaTest, itIsThereAfterItWasClosedAndClearedWhenAsked) {
    add({item("did=1", "bytes \xFF", 1)});
    ASSERT_TRUE(replica_.setAnchor(Data::fromText("a")).has_value());
    replica_ = Replica::open(folder_.path("other")).value();
    replica_ = Replica::open(path_).value();
    EXPECT_THAT(found({"bytes"}), ElementsAre("bytes \xFF"));
    EXPECT_EQ(replica_.anchor().value(), Data::fromText("a"));
    ASSERT_TRUE(replica_.clear().has_value());
    EXPECT_THAT(found({}), IsEmpty());
    EXPECT_EQ(replica_.anchor().value(), std::nullopt);
}

TEST_F(ReplicaTest, aFileThatIsNoReplicaIsReplaced) {
    for (const char* junk : {"", "junk", "SQLite format 3\0more"}) {
        replica_ = Replica::open(folder_.path("other")).value();
        writeFile(path_, junk);
        replica_ = Replica::open(path_).value();
        add({item("did=1", "one", 1)});
        EXPECT_THAT(found({"one"}), ElementsAre("one"));
    }
}

TEST_F(ReplicaTest, aFileThatCanNotBeMadeIsAnError) {
    EXPECT_FALSE(Replica::open(folder_.path("none/replica")).has_value());
}

}  // namespace
}  // namespace marrowdale::host
