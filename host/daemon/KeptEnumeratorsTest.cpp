#include <gtest/gtest.h>

#include "host/daemon/AnchorVersions.h"
#include "host/daemon/KeptEnumerators.h"
#include "host/testing/VersionedExtension.h"

namespace marrowdale::host {
namespace {

class KeptEnumeratorsTest : public ::testing::Test {
  protected:
    std::unique_ptr<FileProviderEnumerator> fresh(std::string_view container) {
        return std::move(*extension_.enumeratorForContainerItemIdentifier(container));
    }
    void keep(std::string_view container, std::uint64_t version) {
        kept_.keep(container, VersionedExtension::anchorOf(version), fresh(container));
    }
    bool takes(std::string_view container, std::uint64_t version) {
        return kept_.take(container, VersionedExtension::anchorOf(version)) != nullptr;
    }
    VersionedExtension extension_;
    KeptEnumerators kept_;
};

TEST_F(KeptEnumeratorsTest, oneIsKeptForItsContainerAndVersionAndTakenOnce) {
    keep("root", 1);
    EXPECT_FALSE(takes("root", 2));
    EXPECT_FALSE(takes("set", 1));
    EXPECT_TRUE(takes("root", 1));
    EXPECT_FALSE(takes("root", 1));
}

TEST_F(KeptEnumeratorsTest, aFewAreKeptOfOneVersionAndTheRestLetGo) {
    for (std::size_t i = 0; i < KeptEnumerators::mostOfOneVersion + 3; ++i) {
        keep("root", 1);
    }
    EXPECT_EQ(extension_.state->alive, static_cast<int>(KeptEnumerators::mostOfOneVersion));
}

TEST_F(KeptEnumeratorsTest, thoseThatWaitedLongestAreLetGoFirst) {
    for (std::uint64_t version = 1; version <= KeptEnumerators::most + 1; ++version) {
        keep("root", version);
    }
    EXPECT_FALSE(takes("root", 1));
    EXPECT_TRUE(takes("root", 2));
    EXPECT_TRUE(takes("root", KeptEnumerators::most + 1));
}

TEST_F(KeptEnumeratorsTest, withoutAVersionNoneIsKept) {
    kept_.keep("root", Data::fromText("junk"), fresh("root"));
    EXPECT_EQ(extension_.state->alive, 0);
    EXPECT_FALSE(kept_.take("root", Data::fromText("junk")));
}

TEST_F(KeptEnumeratorsTest, whoKnowsOfNoLibraryIsAnsweredByAFreshOne) {
    keep("root", 0);
    EXPECT_EQ(extension_.state->alive, 0);
    EXPECT_FALSE(takes("root", 0));
}

TEST_F(KeptEnumeratorsTest, anAnchorTellsItsVersionAndCanForgetIt) {
    const Data anchor = VersionedExtension::anchorOf(5);
    EXPECT_EQ(libraryVersionIn(anchor), 5U);
    EXPECT_EQ(libraryVersionIn(withoutLibraryVersion(anchor)), 0U);
    EXPECT_EQ(libraryVersionIn(Data::fromText("junk")), std::nullopt);
    EXPECT_EQ(withoutLibraryVersion(Data::fromText("junk")), Data::fromText("junk"));
}

}  // namespace
}  // namespace marrowdale::host
