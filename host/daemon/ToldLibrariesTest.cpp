#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/ToldLibraries.h"
#include "host/testing/VersionedExtension.h"

namespace marrowdale::host {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class ToldLibrariesTest : public ::testing::Test {
  protected:
    // What a client hears of an answer from one version to another.
    std::vector<std::string> deleted(std::uint64_t from, std::uint64_t to,
                                     const std::vector<std::string>& updated,
                                     std::vector<std::string> deleted = {}) {
        ItemChanges changes{{}, std::move(deleted), VersionedExtension::anchorOf(to), {}};
        for (const std::string& identifier : updated) {
            changes.updated.push_back(std::make_shared<FakeItem>(identifier));
        }
        told_.complete(VersionedExtension::anchorOf(from), changes);
        return changes.deleted;
    }
    ToldLibraries told_;
};

TEST_F(ToldLibrariesTest, aLibraryThatTheEnumeratorForgotIsToldToBeGone) {
    EXPECT_THAT(deleted(0, 1, {"#a", "#b", "did=1"}), IsEmpty());
    EXPECT_THAT(deleted(1, 2, {"#b", "#c"}), ElementsAre("#a"));
    EXPECT_THAT(deleted(1, 3, {}), ElementsAre("#a", "#b"));
    EXPECT_THAT(deleted(2, 3, {"#b"}), ElementsAre("#c"));
}

TEST_F(ToldLibrariesTest, whatWasToldIsNotToldTwice) {
    EXPECT_THAT(deleted(0, 1, {"#a"}), IsEmpty());
    EXPECT_THAT(deleted(1, 2, {}, {"#a"}), ElementsAre("#a"));
}

TEST_F(ToldLibrariesTest, withoutAnotherVersionNothingIsAdded) {
    EXPECT_THAT(deleted(0, 1, {"#a"}), IsEmpty());
    EXPECT_THAT(deleted(1, 1, {"did=1"}), IsEmpty());
    EXPECT_THAT(deleted(7, 8, {"did=1"}), IsEmpty());
}

TEST_F(ToldLibrariesTest, theNewestVersionsAreRemembered) {
    for (std::uint64_t version = 1; version <= ToldLibraries::most + 10; ++version) {
        EXPECT_THAT(deleted(0, version, {"#a"}), IsEmpty());
    }
    EXPECT_THAT(deleted(ToldLibraries::most + 10, ToldLibraries::most + 11, {}), ElementsAre("#a"));
}

}  // namespace
}  // namespace marrowdale::host
