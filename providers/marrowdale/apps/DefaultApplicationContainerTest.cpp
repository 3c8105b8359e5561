#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/apps/AppsTestWorld.h"
#include "providers/marrowdale/apps/DefaultApplicationContainer.h"

namespace marrowdale {
namespace {

class DefaultApplicationContainerTest : public AppsTestWorld {
  protected:
    Expected<FileProviderItemPtr> container(const std::string& identifier) {
        return defaultApplicationContainer(world_.platform, identifier);
    }
    static void expectInvalidParameter(const Error& error, std::string_view identifier) {
        EXPECT_EQ(error, errorInvalidParameter("bundleIdentifier", identifier));
        EXPECT_EQ(error.operation, "bundleIdentifier");
        EXPECT_EQ(error.subject, identifier);
    }
};

TEST_F(DefaultApplicationContainerTest, anInstalledApplicationHasItsLibraryQualifiedOrNot) {
    add("A")->info = PropertyListDictionary();
    const auto item = container("org.example.A");
    ASSERT_TRUE(item);
    EXPECT_EQ((*item)->itemIdentifier, "#org.example.A");
    EXPECT_TRUE((*item)->hx_isContainer());
    EXPECT_EQ(countContaining(" default location for org.example.A"), 1U);
}

TEST_F(DefaultApplicationContainerTest, anUnknownOneIsAnInvalidParameter) {
    const auto item = container("org.example.None");
    ASSERT_FALSE(item);
    expectInvalidParameter(item.error(), "org.example.None");
    EXPECT_EQ(count("[ERROR] can't create bundle proxy with 'org.example.None'"), 1U);
}

TEST_F(DefaultApplicationContainerTest, oneWithoutDocumentsIsAnInvalidParameterToo) {
    add("A")->container = std::nullopt;
    const auto item = container("org.example.A");
    ASSERT_FALSE(item);
    expectInvalidParameter(item.error(), "org.example.A");
    EXPECT_EQ(count("[ERROR] can't create an app library item with <BundleRecord org.example.A>"),
              1U);
}

}  // namespace
}  // namespace marrowdale
