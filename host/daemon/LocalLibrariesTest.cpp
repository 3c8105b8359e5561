// What LocalRequests answers about app libraries.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/LocalRequests.h"
#include "host/testing/VersionedExtension.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::host {
namespace {

using ::testing::ElementsAre;

constexpr std::string_view root = VantrelRootContainerItemIdentifier;
constexpr std::string_view workingSet = VantrelWorkingSetContainerItemIdentifier;

class LocalLibrariesTest : public ::testing::Test {
  protected:
    LocalServices services(FakeExtension& extension) {
        return {.extension = extension,
                .signals = signals_,
                .rootPath = "/root",
                .replicaPath = ":memory:",
                .stateFolder = "/nowhere",
                .findings = [] { return std::vector<Finding>{}; },
                .forgetApplications = [this] { ++forgotten_; }};
    }
    SignalHub signals_{std::chrono::milliseconds(1)};
    int forgotten_ = 0;
};

TEST_F(LocalLibrariesTest, oneApplicationsLibraryOrWhyThereIsNone) {
    FakeExtension extension;
    extension.add("#org.example.Notes", "/notes").container = true;
    LocalRequests requests(services(extension));
    EXPECT_EQ((*requests.applicationContainer("org.example.Notes"))->itemIdentifier,
              "#org.example.Notes");
    const auto none = requests.applicationContainer("org.example.None");
    ASSERT_FALSE(none.has_value());
    EXPECT_EQ(none.error(), errorInvalidParameter("bundleIdentifier", "org.example.None"));
}

TEST_F(LocalLibrariesTest, thumbnailsComeInTheOrderAskedForAndNotForOtherItems) {
    FakeExtension extension;
    LocalRequests requests(services(extension));
    const auto thumbnails = requests.thumbnails({"did=1", "#b", "#a", "#b"});
    ASSERT_TRUE(thumbnails.has_value());
    ASSERT_EQ(thumbnails->size(), 4U);
    EXPECT_FALSE((*thumbnails)[0].data);
    EXPECT_EQ((*thumbnails)[1].data, Data::fromText("#b"));
    EXPECT_EQ((*thumbnails)[2].itemIdentifier, "#a");
    EXPECT_TRUE(requests.thumbnails({})->empty());
}

TEST_F(LocalLibrariesTest, aRefreshForgetsWhatWasRememberedAndReturnsWhenItIsDone) {
    VersionedExtension extension;
    LocalRequests requests(services(extension));
    EXPECT_TRUE(requests.item("did=1").error() == errorForNonExistentItem({}));
    extension.install();
    EXPECT_TRUE(requests.refreshApplications().has_value());
    EXPECT_EQ(forgotten_, 1);
    EXPECT_EQ(extension.state->main, 1U);
    EXPECT_EQ(extension.state->workingSet, 1U);
}

TEST_F(LocalLibrariesTest, clientsWithAnchorsOfAnOlderVersionAreAllAnswered) {
    VersionedExtension extension;
    extension.install();
    LocalRequests requests(services(extension));
    for (const std::string_view container : {root, workingSet}) {
        const auto one = requests.anchor(container);
        const auto other = requests.anchor(container);
        ASSERT_TRUE(one && other);
        extension.install();
        ASSERT_TRUE(requests.refreshApplications().has_value());
        const auto first = requests.changes(container, **one);
        ASSERT_TRUE(first.has_value());
        EXPECT_TRUE(requests.changes(container, **other).has_value());
        EXPECT_TRUE(requests.changes(container, first->anchor).has_value());
    }
}

TEST_F(LocalLibrariesTest, anAnchorOfAVersionThatNobodyKeptIsExpired) {
    VersionedExtension extension;
    extension.install();
    extension.install();
    LocalRequests requests(services(extension));
    const auto expired = requests.changes(root, VersionedExtension::anchorOf(1));
    ASSERT_FALSE(expired.has_value());
    EXPECT_EQ(expired.error(), errorSyncAnchorExpired());
}

TEST_F(LocalLibrariesTest, watchersWatchTheLibrariesOfNowAndAreToldOfThem) {
    VersionedExtension extension;
    LocalRequests requests(services(extension));
    std::atomic<int> told = 0;
    {
        const auto watch = requests.startWatch({std::string(root), std::string(workingSet)},
                                               [&](std::string_view) { ++told; });
        ASSERT_TRUE(watch.has_value());
        EXPECT_EQ(extension.started(), 2);
        extension.install();
        requests.applicationsChanged();
        EXPECT_TRUE(waitUntil([&] { return told >= 2; }));
        EXPECT_EQ(extension.started(), 2);
    }
    EXPECT_EQ(extension.started(), 0);
}

TEST_F(LocalLibrariesTest, libraryItemsAloneAreTheLibraries) {
    class Listing : public FakeExtension {
      public:
        Expected<std::unique_ptr<FileProviderEnumerator>> enumeratorForContainerItemIdentifier(
            std::string_view /*container*/) override {
            return std::unique_ptr<FileProviderEnumerator>(std::make_unique<FakeEnumerator>(
                std::vector<FakeAnswer>{{{"#a", "#b", "did=1", "fid=2"}, Data(), {}}}, listed));
        }
        FakeEnumerator::Record listed;
    } extension;
    LocalRequests requests(services(extension));
    const auto libraries = requests.appLibraries();
    ASSERT_TRUE(libraries.has_value());
    ASSERT_EQ(libraries->size(), 2U);
    EXPECT_EQ((*libraries)[1]->itemIdentifier, "#b");
    EXPECT_EQ(extension.listed.pages.size(), 1U);
}

}  // namespace
}  // namespace marrowdale::host
