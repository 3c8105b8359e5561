#include <filesystem>

#include <gtest/gtest.h>

#include "platform/foundation/KeyedArchive.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"
#include "providers/marrowdale/items/LocalAppLibraryItem.h"
#include "tests/support/TestWorld.h"

namespace marrowdale {
namespace {

class LocalAppLibraryItemTest : public ::testing::TestWithParam<TestFileSystem> {
  protected:
    LocalAppLibraryItemTest() {
        makeFolder(documents());
        record_ = world_.applications.add("org.example.Notes", "My Notes", directory_.path("app"));
    }
    std::string documents(std::string_view name = {}) const {
        return directory_.path("app/Documents") + (name.empty() ? "" : "/" + std::string(name));
    }
    std::shared_ptr<LocalAppLibraryItem> item() {
        return LocalAppLibraryItem::initFrom(world_.platform, *record_);
    }
    // Makes the documents folder count that many subfolders.
    void countSubfolders(std::uint32_t count) {
        world_.fileSystem.statusAnswer =
            [=, this](const URL& url) -> std::optional<Expected<FileStatus>> {
            auto status = world_.realFileSystem.status(url);
            if (status && url.path() == documents()) {
                status->linkCount = count + 2;
            }
            return status;
        };
    }

    TemporaryDirectory directory_{GetParam().dir};
    TestWorld world_{directory_, {}, TestWorld::Serving::wholeDirectory};
    std::shared_ptr<FakeBundleRecord> record_;
};

INSTANTIATE_TEST_SUITE_P(OnEach, LocalAppLibraryItemTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(LocalAppLibraryItemTest, isNamedAndIdentifiedByItsApplication) {
    const auto library = item();
    ASSERT_TRUE(library);
    EXPECT_EQ(library->itemIdentifier, "#org.example.Notes");
    EXPECT_EQ(library->parentItemIdentifier, VantrelRootContainerItemIdentifier);
    EXPECT_EQ(library->filename, "My Notes");
    EXPECT_EQ(library->fileURL.path(), documents());
    EXPECT_TRUE(library->hx_isContainer());
    EXPECT_TRUE(library->isFolder());
    EXPECT_EQ(library->docID, std::nullopt);
    EXPECT_EQ(library->hx_appContainerBundleIdentifier, std::nullopt);
    EXPECT_TRUE(library->description().starts_with("<LocalAppLibraryItem:0x"));
}

TEST_P(LocalAppLibraryItemTest, aWritableContainerGetsCapabilities3) {
    EXPECT_EQ(item()->capabilities, 3U);
}

TEST_P(LocalAppLibraryItemTest, withoutALocalizedNameItIsNamedByItsFolder) {
    record_->displayName = std::nullopt;
    EXPECT_EQ(item()->filename, "Documents");
}

TEST_P(LocalAppLibraryItemTest, withoutABundleIdentifierItIsNamedNull) {
    record_->identifier = std::nullopt;
    EXPECT_EQ(item()->itemIdentifier, "#(null)");
}

TEST_P(LocalAppLibraryItemTest, aRecordWithoutADataContainerYieldsNoItemAndALine) {
    record_->container = std::nullopt;
    EXPECT_FALSE(item());
    EXPECT_EQ(
        world_.sink->count("[ERROR] can't create an app library item without a data container URL"),
        1U);
}

TEST_P(LocalAppLibraryItemTest, aMissingDocumentsFolderYieldsNoItem) {
    std::filesystem::remove(documents());
    EXPECT_FALSE(item());
}

TEST_P(LocalAppLibraryItemTest, twoSubfoldersThatAreInboxAndTrashCountAsNone) {
    makeFolder(documents("Inbox"));
    makeFolder(documents(".Trash"));
    countSubfolders(2);
    EXPECT_EQ(item()->childItemCount, 0U);
}

TEST_P(LocalAppLibraryItemTest, theHiddenFoldersAreNotCounted) {
    makeFolder(documents(".Trash"));
    makeFolder(documents("Work"));
    countSubfolders(2);
    EXPECT_EQ(item()->childItemCount, 1U);
}

TEST_P(LocalAppLibraryItemTest, aCountOf0IsLeftUntouched) {
    makeFolder(documents("Inbox"));
    countSubfolders(0);
    EXPECT_EQ(item()->childItemCount, 0U);
}

TEST_P(LocalAppLibraryItemTest, aCountNeverGoesBelow0) {
    makeFolder(documents("Inbox"));
    makeFolder(documents(".Trash"));
    countSubfolders(1);
    EXPECT_EQ(item()->childItemCount, 0U);
}

TEST_P(LocalAppLibraryItemTest, aFileOrLinkOfAHiddenNameIsNoSubfolder) {
    makeFolder(documents("Work"));
    writeFile(documents("Inbox"), "");
    std::filesystem::create_directory_symlink("Work", documents(".Trash"));
    countSubfolders(1);
    EXPECT_EQ(item()->childItemCount, 1U);
}

TEST_P(LocalAppLibraryItemTest, theItemsInItFindIt) {
    makeFolder(documents("Work"));
    writeFile(documents("Work/a"), "");
    writeFile(world_.path("elsewhere"), "");
    world_.addLibrary("org.example.Other", "Other", directory_.path("other"));
    const auto found = [&](const std::string& path) {
        const auto library = LocalItem::initWithURL(world_.platform, URL::fileURL(path))
                                 ->fetchAppLibraryItem(world_.platform);
        return library ? library->itemIdentifier : "none";
    };
    EXPECT_EQ(found(documents("Work/a")), "#org.example.Notes");
    EXPECT_EQ(found(documents("Work")), "#org.example.Notes");
    EXPECT_EQ(found(world_.path("elsewhere")), "none");
    EXPECT_EQ(item()->fetchAppLibraryItem(world_.platform), nullptr);
}

TEST_P(LocalAppLibraryItemTest, hasNoLastUsedDate) {
    if (!keepsUserAttributes(documents())) {
        MARROWDALE_SKIP("the file system keeps no user attributes");
    }
    const Data archived = *archive(ArchivedObject(Date{7, 8}));
    setAttribute(documents(), "user." + std::string(LocalItem::xattrLastUsedDateName),
                 archived.text());
    EXPECT_EQ(item()->lastUsedDate, std::nullopt);
}

}  // namespace
}  // namespace marrowdale
