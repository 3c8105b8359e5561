// What a client that follows the changes is told of an action: what it did, and nothing else.

#include <algorithm>
#include <array>
#include <functional>
#include <vector>

#include <gtest/gtest.h>

#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/CollectingChangeObserver.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"
#include "tests/actions/ActionsWorld.h"
#include "tests/changes/Replica.h"

namespace marrowdale::tests {
namespace {

using Recording = native::StoreOptions::Recording;
using Names = std::set<std::string>;

class FeedTest : public testing::TestWithParam<std::tuple<TestFileSystem, Recording>> {
  protected:
    FeedTest() {
        for (const char* folder : {"box/folder/inner", "other", "from", ".Trash"}) {
            makeFolder(world_.path(folder));
        }
        for (const char* file : {"box/a", "box/b", "box/bystander", "box/folder/inner/c",
                                 "box/folder/inner/d", "other/bystander", "from/moved"}) {
            writeFile(world_.path(file), file);
        }
        writeFile(world_.outside("new"), "new");
        makeFolder(world_.outside("tree/inner"));
        writeFile(world_.outside("tree/inner/e"), "e");
        world_.open(std::get<1>(GetParam()));
        box_ = world_.identifierOf("box");
        // All have identifiers, and are old enough to be told no second time.
        client_.fill(world_.provider());
        settle();
    }
    ~FeedTest() override { world_.close(); }
    FeedTest(const FeedTest&) = delete;
    FeedTest& operator=(const FeedTest&) = delete;

    // Has something done, and compares what a client hears of it.
    void expect(const std::function<void()>& action, const Names& updates,
                const Names& deletions = {}) {
        settle();  // what the step before has made
        const Data since = client_.anchor();
        action();
        Names updated;
        Names deleted;
        hear(since, updated, deleted);
        EXPECT_EQ(updated, updates);
        for (const std::string& identifier : deletions) {
            EXPECT_TRUE(deleted.contains(identifier)) << identifier << " is not told to be gone";
        }
        const auto isExpected = [&](const std::string& identifier) {
            return !identifier.starts_with("did=") || deletions.contains(identifier);
        };
        EXPECT_TRUE(std::ranges::all_of(deleted, isExpected)) << "something else is told gone";
        EXPECT_TRUE(client_.catchUp(world_.provider()));
        for (const std::string& difference : client_.differences(world_.provider())) {
            ADD_FAILURE() << difference;
        }
        settle();
    }
    ActionsWorld::Item& done(ActionsWorld::Item answer) {
        answer_ = std::move(answer);
        EXPECT_TRUE(answer_) << answer_.error().description();
        return answer_;
    }

    ActionsWorld world_{std::get<0>(GetParam()).dir};
    std::string box_;

  private:
    void hear(Data since, Names& updated, Names& deleted) {
        for (bool more = true; more;) {
            const auto enumerator = world_.provider().enumeratorForContainerItemIdentifier(
                VantrelWorkingSetContainerItemIdentifier);
            const auto observer = std::make_shared<CollectingChangeObserver>();
            (*enumerator)->enumerateChangesForObserver(observer, since);
            ASSERT_TRUE(observer->waitForFinish());
            ASSERT_FALSE(observer->error());
            for (const auto& item : observer->updates()) {
                updated.insert(item->filename);
            }
            deleted.merge([&] {
                const auto gone = observer->deletions();
                return Names(gone.begin(), gone.end());
            }());
            since = *observer->anchor();
            more = observer->calls().back() == "finish, more";
        }
    }
    // What was looked at within milliseconds of its change is told once more; then no longer.
    void settle() {
        EXPECT_TRUE(waitUntil([&] {
            Names updated;
            Names deleted;
            hear(client_.anchor(), updated, deleted);
            return client_.catchUp(world_.provider()) && updated.empty() && deleted.empty();
        }));
    }

    Replica client_;
    ActionsWorld::Item answer_{nullptr};
};

INSTANTIATE_TEST_SUITE_P(OnEach, FeedTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Recording::live, Recording::whenAsked)),
                         [](const auto& given) {
                             return std::get<0>(given.param).name +
                                    (std::get<1>(given.param) == Recording::live ? "_live"
                                                                                 : "_once");
                         });

TEST_P(FeedTest, whatComesInIsToldAlone) {
    expect([&] { done(world_.import(world_.outside("new"), box_)); }, {"new"});
    expect([&] { done(world_.import(world_.outside("tree"), box_)); }, {"tree", "inner", "e"});
    expect([&] { done(world_.create("made", box_)); }, {"made"});
}

TEST_P(FeedTest, aRenamedFileIsToldAlone) {
    const std::string item = world_.identifierOf("box/a");
    expect([&] { EXPECT_EQ((*done(world_.rename(item, "z")))->itemIdentifier, item); }, {"z"});
}

// Its contents are told again, for where they are has changed, and nothing is told to be gone.
TEST_P(FeedTest, aRenamedFolderIsToldWithWhatIsInIt) {
    const std::string item = world_.identifierOf("box/folder");
    expect([&] { done(world_.rename(item, "renamed")); }, {"renamed", "inner", "c", "d"});
}

TEST_P(FeedTest, aMovedItemIsToldAlone) {
    const std::string item = world_.identifierOf("from/moved");
    expect([&] { done(world_.move(item, box_, "here")); }, {"here"});
    EXPECT_EQ(world_.identifierOf("box/here"), item);
}

TEST_P(FeedTest, whatIsTrashedIsGoneAndComesBack) {
    const std::string item = world_.identifierOf("box/a");
    expect([&] { done(world_.trash(item)); }, {}, {item});
    expect([&] { EXPECT_EQ((*done(world_.untrash(item, box_)))->itemIdentifier, item); }, {"a"});
}

// Its contents go with it, out of sight, and are told when they are back.
TEST_P(FeedTest, aTrashedFolderIsGoneWithWhatIsInItAndComesBack) {
    const std::string folder = world_.identifierOf("box/folder");
    const std::string file = world_.identifierOf("box/folder/inner/c");
    expect([&] { done(world_.trash(folder)); }, {}, {folder});
    expect([&] { done(world_.untrash(folder, box_)); }, {"folder", "inner", "c", "d"});
    EXPECT_EQ(world_.identifierOf("box/folder/inner/c"), file);
}

TEST_P(FeedTest, whatIsDeletedIsToldAlone) {
    const std::string file = world_.identifierOf("box/a");
    const std::string folder = world_.identifierOf("box/folder");
    const Names files{world_.identifierOf("box/folder/inner/c"),
                      world_.identifierOf("box/folder/inner/d")};
    expect([&] { EXPECT_EQ(world_.remove(file), std::nullopt); }, {}, {file});
    expect([&] { EXPECT_EQ(world_.remove(folder), std::nullopt); }, {}, files);
}

TEST_P(FeedTest, metadataIsToldOfItsItem) {
    if (!keepsUserAttributes(world_.root())) {
        MARROWDALE_SKIP("the file system keeps no user attributes");
    }
    const std::string item = world_.identifierOf("box/a");
    expect([&] { done(world_.favorite(item, 7)); }, {"a"});
}

TEST_P(FeedTest, whatIsRefusedIsToldToNobody) {
    const std::string item = world_.identifierOf("box/a");
    expect(
        [&] {
            EXPECT_FALSE(world_.rename(item, "b"));
            EXPECT_FALSE(world_.rename(item, std::string(256, 'x')));
            EXPECT_FALSE(world_.move(item, std::string(VantrelRootContainerItemIdentifier)));
            EXPECT_FALSE(world_.create("b", box_));
            EXPECT_FALSE(world_.import(world_.box("b"), box_));
            EXPECT_FALSE(world_.import(world_.outside("none"), box_));
            EXPECT_FALSE(world_.move(box_, world_.identifierOf("box/folder")));
            EXPECT_FALSE(world_.untrash(item, box_));
        },
        {});
}

// The document of a name that was deleted is another one than that which gets the name next.
TEST_P(FeedTest, aNameThatADeletionFreedGoesToAnotherDocument) {
    const std::string deleted = world_.identifierOf("box/a");
    const std::string renamed = world_.identifierOf("box/b");
    expect(
        [&] {
            EXPECT_EQ(world_.remove(deleted), std::nullopt);
            EXPECT_EQ((*done(world_.rename(renamed, "a")))->itemIdentifier, renamed);
        },
        {"a"}, {deleted});
    EXPECT_FALSE(world_.provider().itemForIdentifier(deleted));
}

}  // namespace
}  // namespace marrowdale::tests
