#include <gtest/gtest.h>

#include "platform/testing/CollectingChangeObserver.h"
#include "platform/testing/FakePlatform.h"
#include "providers/marrowdale/fs/FSChangeRequests.h"
#include "providers/marrowdale/fs/FSChangesEnumerator.h"
#include "providers/marrowdale/fs/LocalChangesObserverContext.h"

namespace marrowdale {
namespace {

class LocalChangesObserverContextTest : public ::testing::Test {
  protected:
    using Lines = std::vector<std::string>;

    LocalChangesObserverContextTest() { make(UpdateFileIDInVaultry::no); }
    void make(UpdateFileIDInVaultry update) {
        context_ = std::make_shared<LocalChangesObserverContext>(fake_.platform, observer_,
                                                                 requests_, update);
    }
    void insertEnumerator() {
        auto enumerator = FSChangesEnumerator::make(fake_.platform, {}, "fid=1",
                                                    {URL::fileURL("/storage")}, context_);
        context_->setFSChangesEnumerator(enumerator);
        ASSERT_TRUE(requests_->insert(std::move(enumerator)));
    }
    static FileProviderItemPtr item(std::string_view path) {
        auto made = std::make_shared<LocalItem>(URL::fileURL(path));
        made->filename = made->fileURL.lastPathComponent();
        return made;
    }

    FakePlatform fake_;
    std::shared_ptr<CollectingChangeObserver> observer_ =
        std::make_shared<CollectingChangeObserver>();
    std::shared_ptr<FSChangeRequests> requests_ = std::make_shared<FSChangeRequests>();
    std::shared_ptr<LocalChangesObserverContext> context_;
};

TEST_F(LocalChangesObserverContextTest, everyReportIsHandedOn) {
    context_->didUpdateItems({item("/storage/a"), item("/storage/b")});
    context_->didDeleteItemsWithIdentifiers({"fid=1", "did=2"});
    const Data anchor = Data::fromText("anchor");
    context_->finishEnumeratingChangesUpToSyncAnchor(anchor, MoreComing::yes);
    context_->finishEnumeratingWithError(errorWithPOSIXCode(5));
    EXPECT_EQ(observer_->calls(),
              (Lines{"update a b", "delete fid=1 did=2", "finish, more", "error 5"}));
    EXPECT_EQ(observer_->anchor(), anchor);
}

TEST_F(LocalChangesObserverContextTest, withoutTheFlagNothingIsLookedUp) {
    context_->didUpdateItems({item("/storage/a")});
    EXPECT_TRUE(fake_.store.lookUps().empty());
    EXPECT_EQ(fake_.sink->count("[DEBUG] updating file ID in vaultry"), 0U);
}

TEST_F(LocalChangesObserverContextTest, withTheFlagEachItemIsLookedUpBeforeItIsTold) {
    std::size_t lookUpsBefore = 0;
    observer_->within = [&](const std::string&) { lookUpsBefore = fake_.store.lookUps().size(); };
    make(UpdateFileIDInVaultry::yes);
    context_->didUpdateItems({item("/storage/a"), item("/storage/b")});
    using LookUp = ScriptedGenerationStore::LookUp;
    EXPECT_EQ(fake_.store.lookUps(), (std::vector<LookUp>{{"/storage/a", AllocateIfNone::no},
                                                          {"/storage/b", AllocateIfNone::no}}));
    EXPECT_EQ(lookUpsBefore, 2U);
    EXPECT_EQ(fake_.sink->count("[DEBUG] updating file ID in vaultry"), 2U);
    EXPECT_EQ(observer_->calls(), Lines{"update a b"});
}

TEST_F(LocalChangesObserverContextTest, aFinishTakesTheEnumeratorOutBehindTheReport) {
    std::size_t countDuringFinish = 0;
    observer_->within = [&](const std::string&) { countDuringFinish = requests_->count(); };
    insertEnumerator();
    context_->finishEnumeratingChangesUpToSyncAnchor({}, MoreComing::no);
    EXPECT_EQ(countDuringFinish, 1U);
    EXPECT_EQ(requests_->count(), 0U);
    insertEnumerator();
    context_->finishEnumeratingWithError(errorWithPOSIXCode(5));
    EXPECT_EQ(requests_->count(), 0U);
}

TEST_F(LocalChangesObserverContextTest, otherReportsTakeNothingOut) {
    insertEnumerator();
    context_->didUpdateItems({});
    context_->didDeleteItemsWithIdentifiers({});
    EXPECT_EQ(requests_->count(), 1U);
}

TEST_F(LocalChangesObserverContextTest, aFinishBehindTheEnumeratorsEndRemovesNothing) {
    insertEnumerator();
    const auto other = FSChangesEnumerator::make(fake_.platform, {}, "fid=1",
                                                 {URL::fileURL("/storage")}, context_);
    ASSERT_TRUE(requests_->insert(other));
    context_->setFSChangesEnumerator({});
    context_->finishEnumeratingChangesUpToSyncAnchor({}, MoreComing::no);
    EXPECT_EQ(observer_->calls(), Lines{"finish"});
    EXPECT_EQ(requests_->count(), 2U);
}

TEST_F(LocalChangesObserverContextTest, aFinishBehindTheEndOfTheLocalEnumeratorIsHandedOn) {
    insertEnumerator();
    requests_.reset();
    context_->finishEnumeratingChangesUpToSyncAnchor({}, MoreComing::no);
    EXPECT_EQ(observer_->calls(), Lines{"finish"});
}

TEST_F(LocalChangesObserverContextTest, theEnumeratorIsHeldByTheRequestsAlone) {
    insertEnumerator();
    const std::weak_ptr<LocalChangesObserverContext> context = context_;
    context_.reset();
    EXPECT_FALSE(context.expired());
    requests_->stopAll();
    EXPECT_TRUE(context.expired());
}

TEST_F(LocalChangesObserverContextTest, closedRequestsTakeNoMore) {
    requests_->close();
    const auto enumerator = FSChangesEnumerator::make(fake_.platform, {}, "fid=1",
                                                      {URL::fileURL("/storage")}, context_);
    EXPECT_FALSE(requests_->insert(enumerator));
    EXPECT_EQ(requests_->count(), 0U);
}

}  // namespace
}  // namespace marrowdale
