#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/cli/FollowedPages.h"
#include "host/daemon/LocalListing.h"
#include "host/testing/FakeExtension.h"

namespace marrowdale::host {
namespace {

using ::testing::ElementsAre;

const FakeAnswer expired{{}, {}, errorSyncAnchorExpired()};

class FollowedPagesTest : public ::testing::Test {
  protected:
    Expected<void> follow(std::vector<FakeAnswer> answers) {
        LocalListing listing(std::make_unique<FakeEnumerator>(std::move(answers), record_));
        return followPages(listing, [this](const std::vector<FileProviderItemPtr>& items) {
            for (const auto& item : items) {
                printed_.push_back(item->itemIdentifier);
            }
            return --pagesWanted_ > 0;
        });
    }
    int pagesWanted_ = 1000;
    std::vector<std::string> printed_;
    FakeEnumerator::Record record_;
};

TEST_F(FollowedPagesTest, everyPageIsAskedForWithTheTokenOfTheOneBefore) {
    ASSERT_TRUE(follow({{{"did=1"}, Data::fromText("a"), {}},
                        {{"did=2"}, Data::fromText("b"), {}},
                        {{}, {}, {}}})
                    .has_value());
    EXPECT_THAT(printed_, ElementsAre("did=1", "did=2"));
    EXPECT_THAT(record_.pages, ElementsAre(VantrelInitialPageSortedByName(), Data::fromText("a"),
                                           Data::fromText("b")));
}

TEST_F(FollowedPagesTest, anExpiredPageStartsOverAndPrintsEachIdentifierOnce) {
    ASSERT_TRUE(follow({{{"did=1", "did=2"}, Data::fromText("a"), {}},
                        expired,
                        {{"did=2", "did=3"}, Data::fromText("b"), {}},
                        {{"did=4"}, {}, {}}})
                    .has_value());
    EXPECT_THAT(printed_, ElementsAre("did=1", "did=2", "did=3", "did=4"));
    EXPECT_EQ(record_.pages[2], VantrelInitialPageSortedByName());
}

TEST_F(FollowedPagesTest, aDocumentWithTwoNamesIsListedUnderEach) {
    ASSERT_TRUE(follow({{{"did=1", "did=1"}, {}, {}}}).has_value());
    EXPECT_THAT(printed_, ElementsAre("did=1", "did=1"));
}

TEST_F(FollowedPagesTest, afterStartingOverFiveTimesItGivesUp) {
    const std::vector<FakeAnswer> answers(7, expired);
    const auto result = follow(answers);
    ASSERT_FALSE(result.has_value());
    EXPECT_EQ(result.error(), errorSyncAnchorExpired());
    EXPECT_EQ(record_.pages.size(), 6U);
}

TEST_F(FollowedPagesTest, anyOtherErrorEndsItAtOnce) {
    const auto result = follow({{{}, {}, errorWithPOSIXCode(28)}, {{"did=1"}, {}, {}}});
    ASSERT_FALSE(result.has_value());
    EXPECT_EQ(result.error(), errorWithPOSIXCode(28));
    EXPECT_EQ(record_.pages.size(), 1U);
}

TEST_F(FollowedPagesTest, aReaderThatHasEnoughEndsIt) {
    pagesWanted_ = 1;
    ASSERT_TRUE(follow({{{"did=1"}, Data::fromText("a"), {}}, {{"did=2"}, {}, {}}}).has_value());
    EXPECT_THAT(printed_, ElementsAre("did=1"));
}

}  // namespace
}  // namespace marrowdale::host
