#include <cerrno>
#include <unistd.h>

#include <gtest/gtest.h>

#include "host/daemon/ExtensionModule.h"
#include "host/daemon/World.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::host {
namespace {

class WorldTest : public ::testing::Test {
  protected:
    WorldTest() {
        makeFolder(folder_.path("one"));
        makeFolder(folder_.path("two"));
        writeFile(folder_.path("one/a.txt"), "a");
    }
    [[nodiscard]] WorldOptions options(const std::string& root, const std::string& state) const {
        return {.settings = {folder_.path(root), folder_.path(state), folder_.path("cache")},
                .logSink = nullptr,
                .modulePath = ExtensionModule::standardPath(),
                .lockWait = std::chrono::milliseconds(0)};
    }
    TemporaryDirectory folder_;
};

TEST_F(WorldTest, theExtensionAnswersThroughIt) {
    const auto world = World::open(options("one", "state"));
    ASSERT_TRUE(world.has_value()) << world.error().message;
    LocalRequests& requests = (*world)->requests();
    const auto identifier = requests.identifierAt(folder_.path("one/a.txt"));
    ASSERT_TRUE(identifier.has_value());
    EXPECT_EQ(*requests.pathOf(*identifier), folder_.path("one/a.txt"));
    auto listing = requests.listing(VantrelRootContainerItemIdentifier);
    ASSERT_TRUE(listing.has_value());
    const auto page = (*listing)->page(VantrelInitialPageSortedByName());
    ASSERT_TRUE(page.has_value());
    ASSERT_EQ(page->items.size(), 1U);
    EXPECT_EQ(page->items[0]->itemIdentifier, *identifier);
    EXPECT_TRUE(requests.findings().has_value());
}

TEST_F(WorldTest, twoWorldsLiveSideBySide) {
    const auto one = World::open(options("one", "state one"));
    const auto two = World::open(options("two", "state two"));
    ASSERT_TRUE(one.has_value());
    ASSERT_TRUE(two.has_value()) << two.error().message;
    const std::string path = folder_.path("one/a.txt");
    EXPECT_TRUE((*one)->requests().identifierAt(path).has_value());
    EXPECT_FALSE((*two)->requests().identifierAt(path).has_value());
}

TEST_F(WorldTest, aStateFolderThatIsInUseIsRefused) {
    const auto first = World::open(options("one", "state"));
    ASSERT_TRUE(first.has_value());
    const auto second = World::open(options("one", "state"));
    ASSERT_FALSE(second.has_value());
    EXPECT_EQ(second.error().error.code, EWOULDBLOCK);
    EXPECT_EQ(second.error().message, "process " + std::to_string(::getpid()) +
                                          " has the state folder " + folder_.path("state") +
                                          "; try again when it has ended");
}

TEST_F(WorldTest, whoWaitsForAStateFolderIsToldForWhom) {
    auto first = World::open(options("one", "state"));
    ASSERT_TRUE(first.has_value());
    std::vector<std::string> told;
    WorldOptions waiting = options("one", "state");
    waiting.lockWait = std::chrono::minutes(1);
    waiting.quietWait = std::chrono::milliseconds(1);
    waiting.tellWaiting = [&](const std::string& line) {
        told.push_back(line);
        *first = nullptr;
    };
    EXPECT_TRUE(World::open(waiting).has_value());
    EXPECT_EQ(told, std::vector<std::string>{"waiting for process " + std::to_string(::getpid()) +
                                             ", which has the state folder"});
}

TEST_F(WorldTest, aModuleThatIsMissingOrNoExtensionIsRefused) {
    WorldOptions missing = options("one", "state");
    missing.modulePath = folder_.path("none.so");
    const auto none = World::open(missing);
    ASSERT_FALSE(none.has_value());
    EXPECT_TRUE(none.error().message.contains("none.so")) << none.error().message;
    WorldOptions other = options("one", "state");
    other.modulePath = "libm.so.6";
    const auto library = World::open(other);
    ASSERT_FALSE(library.has_value());
    EXPECT_TRUE(library.error().message.contains(extensionEntryPointName))
        << library.error().message;
}

}  // namespace
}  // namespace marrowdale::host
