#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/LocalListing.h"
#include "host/daemon/LocalRequests.h"
#include "host/testing/FakeExtension.h"

namespace marrowdale::host {
namespace {

class LocalRequestsTest : public ::testing::Test {
  protected:
    LocalRequests requestsTo(FakeExtension& extension) {
        return LocalRequests({.extension = extension,
                              .signals = signals_,
                              .rootPath = "/root",
                              .replicaPath = ":memory:",
                              .stateFolder = "/nowhere",
                              .findings = [] { return std::vector<Finding>{}; }});
    }

  private:
    SignalHub signals_;
};

TEST_F(LocalRequestsTest, whatTheExtensionDoesNotKnowIsNoSuchItem) {
    FakeExtension extension;
    LocalRequests requests = requestsTo(extension);
    const auto byURL = requests.identifierAt("/root/none");
    ASSERT_FALSE(byURL.has_value());
    EXPECT_EQ(byURL.error(), errorForNonExistentItem({}));
    EXPECT_EQ(byURL.error().subject, "/root/none");
    const auto byIdentifier = requests.pathOf("did=9");
    ASSERT_FALSE(byIdentifier.has_value());
    EXPECT_EQ(byIdentifier.error().subject, "did=9");
    EXPECT_FALSE(requests.item("did=9").has_value());
}

TEST_F(LocalRequestsTest, foldersAndContainersAreListedAndFilesAreNot) {
    FakeExtension extension;
    extension.add("fid=1", "/root/folder").folder = true;
    extension.add("#org.example.Notes", "/notes").container = true;
    extension.add("did=2", "/root/file");
    LocalRequests requests = requestsTo(extension);
    EXPECT_TRUE(requests.listing("fid=1").has_value());
    EXPECT_TRUE(requests.listing("#org.example.Notes").has_value());
    const auto file = requests.listing("did=2");
    ASSERT_FALSE(file.has_value());
    EXPECT_EQ(file.error().code, static_cast<int>(FileProviderErrorCode::invalidParameter));
    EXPECT_EQ(file.error().subject, "did=2");
    const auto none = requests.listing("did=3");
    ASSERT_FALSE(none.has_value());
    EXPECT_EQ(none.error(), errorForNonExistentItem({}));
}

TEST_F(LocalRequestsTest, theSystemsContainersAreListedWithoutALookUp) {
    FakeExtension extension;
    LocalRequests requests = requestsTo(extension);
    ASSERT_TRUE(requests.refreshApplications().has_value());
    extension.enumerated.clear();  // what the start looked at
    for (const auto container :
         {VantrelRootContainerItemIdentifier, VantrelWorkingSetContainerItemIdentifier,
          VantrelAllDirectoriesContainerItemIdentifier}) {
        EXPECT_TRUE(requests.listing(container).has_value()) << container;
    }
    EXPECT_EQ(extension.enumerated.size(), 3U);
}

TEST_F(LocalRequestsTest, aPageIsItemsAndTheNextPageOrAnError) {
    FakeEnumerator::Record record;
    LocalListing listing(std::make_unique<FakeEnumerator>(
        std::vector<FakeAnswer>{{{"did=1", "did=2"}, Data::fromText("next"), {}},
                                {{}, {}, errorSyncAnchorExpired()}},
        record));
    const auto page = listing.page(VantrelInitialPageSortedByName());
    ASSERT_TRUE(page.has_value());
    ASSERT_EQ(page->items.size(), 2U);
    EXPECT_EQ(page->items[1]->itemIdentifier, "did=2");
    EXPECT_EQ(page->nextPage, Data::fromText("next"));
    const auto expired = listing.page(*page->nextPage);
    ASSERT_FALSE(expired.has_value());
    EXPECT_EQ(expired.error(), errorSyncAnchorExpired());
}

TEST_F(LocalRequestsTest, anEnumeratorIsInvalidatedOnceItsListingIsOver) {
    FakeEnumerator::Record record;
    {
        const LocalListing listing(
            std::make_unique<FakeEnumerator>(std::vector<FakeAnswer>{}, record));
        EXPECT_FALSE(record.isInvalidated);
    }
    EXPECT_TRUE(record.isInvalidated);
}

}  // namespace
}  // namespace marrowdale::host
