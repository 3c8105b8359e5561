#include <atomic>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/AppLibraries.h"
#include "host/testing/VersionedExtension.h"
#include "platform/foundation/Semaphore.h"

namespace marrowdale::host {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;

const std::string primed =
    "changes " + std::string(VantrelWorkingSetContainerItemIdentifier) + " since 0";

class AppLibrariesTest : public ::testing::Test {
  protected:
    [[nodiscard]] std::uint64_t workingSet() {
        const std::lock_guard lock(extension_.state->mutex);
        return extension_.state->workingSet;
    }
    VersionedExtension extension_;
};

TEST_F(AppLibrariesTest, theFirstRefreshIsWaitedForAndTheWorkingSetPrimedFromVersionZero) {
    extension_.install();
    AppLibraries libraries(extension_);
    libraries.waitUntilKnown();
    EXPECT_THAT(extension_.events(), ElementsAre("refresh", primed));
    EXPECT_EQ(workingSet(), 1U);
    libraries.waitUntilKnown();
    EXPECT_EQ(extension_.events().size(), 2U);
}

TEST_F(AppLibrariesTest, aWorkingSetThatKnowsAllIsLeftAlone) {
    AppLibraries libraries(extension_);
    libraries.waitUntilKnown();
    EXPECT_THAT(extension_.events(), ElementsAre("refresh"));
}

TEST_F(AppLibrariesTest, aWorkingSetThatIsAheadOfTheMainListIsBroughtBack) {
    extension_.install();
    extension_.state->workingSet = 7;
    AppLibraries libraries(extension_);
    libraries.waitUntilKnown();
    EXPECT_EQ(workingSet(), 1U);
}

TEST_F(AppLibrariesTest, aRefreshByHandIsKnownToAllWhenItReturns) {
    std::atomic<int> changes = 0;
    AppLibraries libraries(extension_, [&] { ++changes; });
    libraries.waitUntilKnown();
    extension_.install();
    libraries.refreshNow();
    EXPECT_EQ(workingSet(), 1U);
    EXPECT_EQ(changes, 1);
    libraries.refreshNow();
    EXPECT_EQ(changes, 1);
}

TEST_F(AppLibrariesTest, aRefreshByHandBeforeAnythingElseIsTheFirstOne) {
    extension_.install();
    AppLibraries libraries(extension_);
    libraries.refreshNow();
    EXPECT_THAT(extension_.events(), ElementsAre("refresh", primed));
}

TEST_F(AppLibrariesTest, whatIsAskedForComesAndIsToldOnceItIsKnown) {
    Semaphore changed;
    AppLibraries libraries(extension_, [&] {
        EXPECT_EQ(workingSet(), 1U);
        changed.signal();
    });
    libraries.waitUntilKnown();
    extension_.install();
    libraries.ask();
    changed.wait();
    EXPECT_THAT(extension_.events(), Contains(primed).Times(1));
}

TEST_F(AppLibrariesTest, nobodyIsToldAfterItIsGone) {
    std::atomic<int> changes = 0;
    {
        AppLibraries libraries(extension_, [&] { ++changes; });
        libraries.waitUntilKnown();
    }
    extension_.install();
    AppLibraries later(extension_);
    later.waitUntilKnown();
    EXPECT_EQ(changes, 0);
}

TEST_F(AppLibrariesTest, anchorsWithoutVersionsAreLeftAlone) {
    FakeExtension extension;
    AppLibraries libraries(extension);
    libraries.waitUntilKnown();
    libraries.refreshNow();
    EXPECT_TRUE(extension.record.anchors.empty());
}

}  // namespace
}  // namespace marrowdale::host
