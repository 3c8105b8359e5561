#include <gtest/gtest.h>

#include "host/daemon/LocalActions.h"
#include "host/requests/TagNames.h"
#include "host/testing/FakeExtension.h"
#include "platform/testing/TemporaryDirectory.h"

namespace marrowdale::host {
namespace {

using Kind = ItemAction::Kind;

class Quiet final : public ActionObserver {
  public:
    void progressed(const ActionProgress& /*progress*/) override {}
    void warned(const std::string& /*text*/) override {}
};

class LocalActionsTest : public ::testing::Test {
  protected:
    LocalActionsTest() {
        add("did=1", "/root/Documents/a", everything);
        extension_.items["did=1"]->parentItemIdentifier = "fid=2";
        add("fid=2", "/root/Documents/sub", everything).folder = true;
        add("#org.example.Notes", "/app/Documents", allowsReading | allowsWriting);
        add(VantrelRootContainerItemIdentifier, "/root/Documents", allowsReading).folder = true;
        extension_.actionItem = "did=1";
    }
    FakeItem& add(std::string_view identifier, std::string_view path, std::uint64_t capabilities) {
        FakeItem& item = extension_.add(identifier, path);
        item.capabilities = capabilities;
        return item;
    }
    static ItemAction action(Kind kind, std::string_view item) {
        ItemAction action;
        action.kind = kind;
        action.item = item;
        action.parent = "fid=2";
        action.name = "new";
        action.date = Date{1, 0};
        action.path = "/elsewhere/document";
        return action;
    }
    Expected<FileProviderItemPtr> perform(const ItemAction& action) {
        Quiet observer;
        return actions_.perform(action, observer, {});
    }
    void trash(bool isTrashed) { extension_.items["did=1"]->isTrashed = isTrashed; }

    static constexpr std::uint64_t everything = 63;
    TemporaryDirectory state_;
    FakeExtension extension_;
    LocalActions actions_{extension_, "/root/Documents", state_.path()};
};

TEST_F(LocalActionsTest, everyActionReachesTheExtension) {
    ItemAction untrash = action(Kind::untrash, "did=1");
    for (const auto& [kind, line] :
         {std::pair(Kind::import, "import /elsewhere/document fid=2"),
          std::pair(Kind::create, "create new fid=2"), std::pair(Kind::rename, "rename did=1 new"),
          std::pair(Kind::move, "move did=1 fid=2 new"), std::pair(Kind::trash, "trash did=1"),
          std::pair(Kind::untrash, "untrash did=1 fid=2"), std::pair(Kind::remove, "delete did=1"),
          std::pair(Kind::tag, "tag did=1"), std::pair(Kind::favorite, "favorite did=1"),
          std::pair(Kind::used, "used did=1 1970-01-01T00:00:01.000000000Z"),
          std::pair(Kind::purge, "purge 1970-01-01T00:00:01.000000000Z")}) {
        const auto done = perform(action(kind, "did=1"));
        ASSERT_TRUE(done) << line;
        EXPECT_EQ(extension_.actions.back(), line);
        EXPECT_EQ(*done == nullptr, kind == Kind::remove || kind == Kind::purge) << line;
    }
}

TEST_F(LocalActionsTest, whatAnItemDoesNotAllowNeverReachesTheExtension) {
    for (const std::string_view item :
         {std::string_view("#org.example.Notes"), VantrelRootContainerItemIdentifier}) {
        for (const Kind kind :
             {Kind::rename, Kind::move, Kind::trash, Kind::untrash, Kind::remove}) {
            const auto done = perform(action(kind, item));
            ASSERT_FALSE(done);
            EXPECT_EQ(done.error(), errorFileWriteNoPermission());
        }
    }
    for (const Kind kind : {Kind::import, Kind::create, Kind::move}) {
        ItemAction intoRoot = action(kind, "did=1");
        intoRoot.parent = VantrelRootContainerItemIdentifier;
        EXPECT_EQ(perform(intoRoot).error(), errorFileWriteNoPermission());
    }
    EXPECT_TRUE(extension_.actions.empty());
    // Metadata is kept with app libraries too, and what is not there is the extension's to refuse.
    EXPECT_TRUE(perform(action(Kind::tag, "#org.example.Notes")));
    EXPECT_TRUE(perform(action(Kind::trash, "did=99")));
    EXPECT_EQ(extension_.actions.back(), "trash did=99");
}

TEST_F(LocalActionsTest, theParentOfTheUsersOwnDocumentsIsRememberedAcrossProcesses) {
    ASSERT_TRUE(perform(action(Kind::trash, "did=1")));
    trash(true);
    ItemAction back = action(Kind::untrash, "did=1");
    back.parent.reset();
    LocalActions later(extension_, "/root/Documents", state_.path());
    Quiet observer;
    ASSERT_TRUE(later.perform(back, observer, {}));
    EXPECT_EQ(extension_.actions.back(), "untrash did=1 fid=2");
    // Once it is back nothing is remembered, and the root takes what has no other place.
    ASSERT_TRUE(perform(back));
    EXPECT_EQ(extension_.actions.back(),
              "untrash did=1 " + std::string(VantrelRootContainerItemIdentifier));
}

TEST_F(LocalActionsTest, aParentThatIsGoneGivesWayToTheRoot) {
    ASSERT_TRUE(perform(action(Kind::trash, "did=1")));
    trash(true);
    extension_.items.erase("fid=2");
    ItemAction back = action(Kind::untrash, "did=1");
    back.parent.reset();
    ASSERT_TRUE(perform(back));
    EXPECT_EQ(extension_.actions.back(),
              "untrash did=1 " + std::string(VantrelRootContainerItemIdentifier));
}

TEST_F(LocalActionsTest, aTrashThatFailedLeavesNothingRemembered) {
    extension_.actionError = errorWithPOSIXCode(5);
    EXPECT_FALSE(perform(action(Kind::trash, "did=1")));
    EXPECT_EQ(PutBackParents(state_.path() + "/put-back").parentOf("did=1"), std::nullopt);
}

TEST_F(LocalActionsTest, thePlacesOfAppLibrariesAreLeftToTheProvider) {
    add("did=5", "/app/Documents/a", everything).isTrashed = true;
    ItemAction back = action(Kind::untrash, "did=5");
    back.parent.reset();
    ASSERT_TRUE(perform(back));
    EXPECT_EQ(extension_.actions.back(), "untrash did=5 -");
}

TEST_F(LocalActionsTest, aPurgeForgetsWhatIsNoLongerInTheTrash) {
    const PutBackParents parents(state_.path() + "/put-back");
    ASSERT_TRUE(parents.remember("did=1", "fid=2"));
    ASSERT_TRUE(parents.remember("did=77", "fid=2"));
    trash(true);
    extension_.items["did=1"]->fileURL = URL::fileURL(state_.path() + "/gone");
    ASSERT_TRUE(perform(action(Kind::purge, "")));
    // Neither is there any more: one is gone from the trash, the other was never known.
    EXPECT_TRUE(parents.items().empty());
    ASSERT_TRUE(parents.remember("did=1", "fid=2"));
    extension_.items["did=1"]->fileURL = URL::fileURL(state_.path());
    ASSERT_TRUE(perform(action(Kind::purge, "")));
    EXPECT_EQ(parents.items(), std::vector<std::string>{"did=1"});
}

TEST_F(LocalActionsTest, tagsTravelAsTagData) {
    ItemAction tag = action(Kind::tag, "did=1");
    tag.tags = {"red", "ä"};
    ASSERT_TRUE(perform(tag));
    EXPECT_EQ(extension_.lastTagData, tagDataFor(tag.tags));
    tag.tags.clear();
    ASSERT_TRUE(perform(tag));
    EXPECT_EQ(extension_.lastTagData, std::nullopt);
    tag.tags = {"\xff"};
    EXPECT_FALSE(perform(tag));
}

TEST(ItemActionTest, actionsTravelAsJson) {
    ItemAction action;
    action.kind = Kind::move;
    action.item = "did=1";
    action.parent = "fid=2";
    action.name = "\xff\n";
    action.tags = {"a", ""};
    action.rank = Number(std::uint64_t{18446744073709551615ULL});
    action.date = Date{1, 2};
    const auto read = actionFromJson(actionJson(action));
    ASSERT_TRUE(read);
    EXPECT_EQ(actionJson(*read), actionJson(action));
    EXPECT_EQ(read->name, action.name);
    EXPECT_EQ(read->rank, action.rank);
    for (const char* text : {"", "{}", R"({"action": "nonsense"})", R"({"action": "trash"})",
                             R"({"action": "import", "path": "x", "parent": "fid=1"})",
                             R"({"action": "purge"})", R"({"action": "rename", "item": "did=1"})",
                             R"({"action": "tag", "item": "did=1", "tags": [1]})"}) {
        EXPECT_FALSE(actionFromJson(text)) << text;
    }
}

}  // namespace
}  // namespace marrowdale::host
