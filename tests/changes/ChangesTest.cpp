// Changes as a host sees them: the provider, real folders, the real store.

#include <algorithm>
#include <filesystem>
#include <set>
#include <utility>

#include "providers/marrowdale/fs/FSChangeToken.h"
#include "tests/changes/ChangesTestWorld.h"

namespace marrowdale::tests {
namespace {

constexpr std::string_view rootContainer = VantrelRootContainerItemIdentifier;

class ChangesTest : public ChangesTestWorld {
  protected:
    [[nodiscard]] Data anchorOf(std::string_view container) {
        return currentAnchor(provider(), container).value_or(Data());
    }
    void makeFiles(const std::string& folder, int count) {
        makeFolder(folder);
        for (int i = 0; i < count; ++i) {
            writeFile(folder + "/f" + std::to_string(i), "");
        }
    }
    // Of everything in the folder and below.
    std::set<std::string> documentsBelow(const std::string& prefix) {
        std::set<std::string> found;
        for (const auto& [identifier, item] : enumerateAll(provider())) {
            if (item->fileURL.path().starts_with(path(prefix) + "/")) {
                found.insert(identifier);
            }
        }
        return found;
    }
};

INSTANTIATE_TEST_SUITE_P(OnEach, ChangesTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Following::live, Following::whenAsked,
                                                          Following::restart)),
                         changesParameterName);

TEST_P(ChangesTest, aFolderOfTenThousandThatIsMovedInComesInBatchesToAnother) {
    makeFiles(path("../outside"), 10'000);
    open();
    Replica replica;
    replica.fill(provider());
    meanwhile([&] { std::filesystem::rename(path("../outside"), path("inside")); });
    // Another enumerator for each batch, each from the last anchor alone.
    ASSERT_TRUE(replica.catchUp(provider()));
    EXPECT_GE(replica.requests(), 50);
    EXPECT_EQ(replica.count(), 10'001U);
    expectSame(replica);
}

TEST_P(ChangesTest, aRenamedFolderOfThousandsIsSentAgainInBatchesAndNothingIsDeleted) {
    makeFiles(path("old/sub"), 3'000);
    open();
    Replica replica;
    replica.fill(provider());
    const auto before = documentsBelow("old");
    const Data anchor = replica.anchor();
    meanwhile([&] { std::filesystem::rename(path("old"), path("new")); });
    std::set<std::string> told;
    Data since = anchor;
    for (bool more = true; more;) {
        const auto observer = changes(workingSet, since);
        ASSERT_TRUE(observer->anchor());
        more = observer->calls().back() == "finish, more";
        since = *observer->anchor();
        for (const auto& identifier : observer->deletions()) {
            EXPECT_FALSE(identifier.starts_with("did=")) << identifier;
        }
        for (const auto& item : observer->updates()) {
            EXPECT_TRUE(item->fileURL.path().starts_with(path("new")));
            told.insert(item->itemIdentifier);
        }
        // A new process goes on.
        if (following() == Following::restart) {
            close();
            open();
        }
    }
    for (const auto& identifier : before) {
        EXPECT_TRUE(told.contains(identifier)) << identifier;
    }
    ASSERT_TRUE(replica.catchUp(provider()));
    expectSame(replica);
}

TEST_P(ChangesTest, aRenamedFolderUnderWhichSomethingIsDeletedMeanwhileIsSentInFull) {
    makeFiles(path("old"), 1'000);
    open();
    Replica replica;
    replica.fill(provider());
    meanwhile([&] { std::filesystem::rename(path("old"), path("new")); });
    Data since = replica.anchor();
    std::set<std::string> told;
    int requests = 0;
    for (bool more = true; more; ++requests) {
        ASSERT_LT(requests, 30) << "no end";
        const auto observer = changes(workingSet, since);
        ASSERT_TRUE(observer->anchor());
        more = observer->calls().back() == "finish, more";
        since = *observer->anchor();
        for (const auto& item : observer->updates()) {
            told.insert(item->filename);
        }
        if (requests == 1) {
            meanwhile([&] {
                for (int i = 0; i < 150; ++i) {
                    std::filesystem::remove(path("new/f" + std::to_string(i)));
                }
            });
        }
    }
    for (int i = 150; i < 1'000; ++i) {
        EXPECT_TRUE(told.contains("f" + std::to_string(i))) << i;
    }
    ASSERT_TRUE(replica.catchUp(provider()));
    expectSame(replica);
}

TEST_P(ChangesTest, everyDocumentOfADeletedTreeIsReportedUnderItsOwnIdentifier) {
    makeFiles(path("tree/sub"), 300);
    open();
    Replica replica;
    replica.fill(provider());
    const auto before = documentsBelow("tree");
    ASSERT_EQ(before.size(), 301U);
    Data since = replica.anchor();
    meanwhile([&] { std::filesystem::remove_all(path("tree")); });
    std::set<std::string> deleted;
    for (bool more = true; more;) {
        const auto observer = changes(workingSet, since);
        ASSERT_TRUE(observer->anchor());
        EXPECT_TRUE(observer->updates().empty());
        more = observer->calls().back() == "finish, more";
        since = *observer->anchor();
        for (const auto& identifier : observer->deletions()) {
            deleted.insert(identifier);
        }
    }
    for (const auto& identifier : before) {
        EXPECT_TRUE(deleted.contains(identifier)) << identifier;
    }
    ASSERT_TRUE(replica.catchUp(provider()));
    EXPECT_EQ(replica.count(), 0U);
}

TEST_P(ChangesTest, anItemMovedOutOfTheEnumeratedFolderIsGoneFromItAndHereInTheOther) {
    makeFolder(path("from"));
    makeFolder(path("to"));
    writeFile(path("from/a"), "a");
    open();
    const auto item = provider().itemForIdentifier(identifierOf("from/a"));
    ASSERT_TRUE(item);
    const std::string from = identifierOf("from");
    const std::string to = identifierOf("to");
    const Data sinceFrom = anchorOf(from);
    const Data sinceTo = anchorOf(to);
    meanwhile([&] { std::filesystem::rename(path("from/a"), path("to/a")); });
    EXPECT_EQ(
        changes(from, sinceFrom)->calls(),
        (std::vector<std::string>{"delete fid=" + std::to_string(*(*item)->fileID), "finish"}));
    const auto there = changes(to, sinceTo);
    EXPECT_EQ(there->calls(), (std::vector<std::string>{"update a", "finish"}));
    EXPECT_EQ(there->updates().front()->itemIdentifier, (*item)->itemIdentifier);
}

// A file that was looked at within milliseconds of its change is told once more, to be sure.
TEST_P(ChangesTest, anchorsOfDifferentAgeTellDifferentMuchAndEndAtTheSame) {
    writeFile(path("old"), "");
    open();
    const Data older = anchorOf(rootContainer);
    meanwhile([&] { writeFile(path("a"), ""); });
    const Data newer = anchorOf(rootContainer);
    meanwhile([&] { writeFile(path("b"), ""); });
    const auto both = changes(rootContainer, older);
    const auto one = changes(rootContainer, newer);
    const auto tells = [](const CollectingChangeObserver& observer, std::string_view name) {
        const auto items = observer.updates();
        return std::ranges::any_of(items, [&](const auto& item) { return item->filename == name; });
    };
    EXPECT_TRUE(tells(*both, "a") && tells(*both, "b"));
    EXPECT_TRUE(tells(*one, "b"));
    for (const auto& observer : {both, one}) {
        EXPECT_FALSE(tells(*observer, "old"));
        EXPECT_EQ(observer->calls().back(), "finish");
        Data since = *observer->anchor();
        EXPECT_TRUE(waitUntil([&] {
            const auto rest = changes(rootContainer, std::exchange(since, {}));
            since = rest->anchor().value_or(Data());
            // No libraries are told of as well, by an update without items.
            return rest->updates().empty() && rest->deletions().empty() && rest->finishes() == 1;
        }));
        EXPECT_EQ(since, anchorOf(rootContainer));
    }
}

TEST_P(ChangesTest, whatHappensWhileARequestRunsIsToldByItOrTheNext) {
    makeFiles(path("many"), 150);
    open();
    Replica replica;
    replica.fill(provider());
    Data since = replica.anchor();
    meanwhile([&] {
        for (int i = 0; i < 150; ++i) {
            writeFile(path("many/f" + std::to_string(i)), "more");
        }
    });
    const auto enumerator = provider().enumeratorForContainerItemIdentifier(workingSet);
    const auto observer = std::make_shared<CollectingChangeObserver>();
    bool isFirst = true;
    observer->within = [&](const std::string&) {
        if (std::exchange(isFirst, false)) {
            writeFile(path("meanwhile"), "");
            std::filesystem::remove(path("many/f0"));
        }
    };
    (*enumerator)->enumerateChangesForObserver(observer, since);
    ASSERT_TRUE(observer->waitForFinish());
    EXPECT_EQ(observer->finishes(), 1U);
    meanwhile([] {});
    ASSERT_TRUE(replica.catchUp(provider()));
    expectSame(replica);
}

TEST_P(ChangesTest, anAnchorOfAnotherHistoryAndOneThatIsNoneAreExpired) {
    open();
    auto token = *FSChangeToken::decode(anchorOf(rootContainer));
    token.deviceUUID = *UUID::fromText("C0FFEE00-0000-4000-8000-000000000002");
    const auto uuid = *world().fileEvents.volumeUUID(URL::fileURL(root()));
    EXPECT_EQ(changes(rootContainer, token.encode())->error(), errorSyncAnchorExpired());
    EXPECT_EQ(world().sink->count("[DEBUG] device UUID changed (" + token.deviceUUID.text() +
                                  " -> " + uuid.text() + ")"),
              1U);
    for (const std::size_t size : {0U, 48U, 49U}) {
        EXPECT_EQ(changes(rootContainer, Data::fromText(std::string(size, 'x')))->error(),
                  errorSyncAnchorExpired());
    }
    EXPECT_EQ(world().sink->count("[ERROR] can't create change token from anchor data, resetting"),
              3U);
}

TEST_P(ChangesTest, anAnchorOfTheFutureIsExpired) {
    open();
    auto token = *FSChangeToken::decode(anchorOf(rootContainer));
    token.streamEventID += 1'000'000;
    EXPECT_EQ(changes(rootContainer, token.encode())->error(), errorSyncAnchorExpired());
}

// Signals come of what is recorded as it happens.
class SignalsTest : public ChangesTestWorld {};

INSTANTIATE_TEST_SUITE_P(OnEach, SignalsTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Following::live)),
                         changesParameterName);

TEST_P(SignalsTest, aStartedEnumeratorSignalsEveryChangeAndAStoppedOneNone) {
    open();
    const auto signals = [this] { return world().manager.signalled().size(); };
    const auto enumerator = provider().enumeratorForContainerItemIdentifier(rootContainer);
    const auto atStart = signals();
    (*enumerator)->start();
    writeFile(path("a"), "");
    ASSERT_TRUE(waitUntil([&] { return signals() >= atStart + 2; }));
    auto told = world().manager.signalled();
    EXPECT_EQ(told.at(atStart), rootContainer);
    EXPECT_EQ(told.at(atStart + 1), workingSet);
    (*enumerator)->stop();
    ASSERT_TRUE(world().store->barrier());
    const auto atStop = signals();
    writeFile(path("b"), "");
    // Another enumerator hears of it, this one does not.
    const auto other = provider().enumeratorForContainerItemIdentifier(workingSet);
    (*other)->start();
    writeFile(path("c"), "");
    ASSERT_TRUE(waitUntil([&] { return signals() > atStop; }));
    told = world().manager.signalled();
    EXPECT_EQ(
        std::count(told.begin() + static_cast<std::ptrdiff_t>(atStop), told.end(), rootContainer),
        0);
}

TEST_P(ChangesTest, enumeratorsThatAreReleasedInTheMiddleLeaveNothingBehind) {
    makeFiles(path("many"), 400);
    open();
    const Data since = anchorOf(workingSet);
    meanwhile([&] {
        for (int i = 0; i < 400; ++i) {
            writeFile(path("many/f" + std::to_string(i)), "more");
        }
    });
    std::vector<std::weak_ptr<CollectingChangeObserver>> observers;
    for (int i = 0; i < 20; ++i) {
        auto enumerator = provider().enumeratorForContainerItemIdentifier(workingSet);
        (*enumerator)->start();
        const auto observer = std::make_shared<CollectingChangeObserver>();
        observers.push_back(observer);
        (*enumerator)->enumerateChangesForObserver(observer, since);
        if (i % 3 == 0) {
            ASSERT_TRUE(waitUntil([&] { return !observer->calls().empty(); }));
        }
        if (i % 2 == 0) {
            (*enumerator)->invalidate();
        }
    }
    close();
    for (const auto& observer : observers) {
        EXPECT_TRUE(observer.expired());
    }
}

}  // namespace
}  // namespace marrowdale::tests
