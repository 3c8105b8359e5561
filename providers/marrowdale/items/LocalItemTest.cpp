#include <cerrno>
#include <filesystem>
#include <functional>
#include <limits>
#include <regex>

#include <gtest/gtest.h>

#include "platform/foundation/KeyedArchive.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"
#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/LocalAppLibraryItem.h"
#include "providers/marrowdale/items/LocalItem.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"
#include "providers/marrowdale/items/TagData.h"
#include "tests/support/ItemComparison.h"
#include "tests/support/TestWorld.h"

namespace marrowdale {
namespace {

TEST(IsTrashedPathTest, trashCountsDirectlyAfterDocumentsAlone) {
    EXPECT_TRUE(isTrashedPath("/home/u/Documents/.Trash"));
    EXPECT_TRUE(isTrashedPath("/home/u/Documents/.Trash/a"));
    EXPECT_TRUE(isTrashedPath("/Documents/.Trash/a/b/c"));
    EXPECT_TRUE(isTrashedPath("/.Trash/Documents/.Trash/a"));
    EXPECT_TRUE(isTrashedPath("/Documents/.Trashy/Documents/.Trash"));
    EXPECT_FALSE(isTrashedPath("/.Trash"));
    EXPECT_FALSE(isTrashedPath("/.Trash/a"));
    EXPECT_FALSE(isTrashedPath("/home/u/Documents/a/.Trash/b"));
    EXPECT_FALSE(isTrashedPath("/home/u/MyDocuments/.Trash/b"));
    EXPECT_FALSE(isTrashedPath("/home/u/Documents/.Trashy/b"));
    EXPECT_FALSE(isTrashedPath("/home/u/Documents"));
    EXPECT_FALSE(isTrashedPath(""));
}

class LocalItemTest : public ::testing::TestWithParam<TestFileSystem> {
  protected:
    std::shared_ptr<LocalItem> item(std::string_view name) {
        return LocalItem::initWithURL(world_.platform, world_.url(name));
    }
    std::shared_ptr<LocalItem> rootItem() {
        return LocalItem::initWithURL(world_.platform, world_.manager.documentStorageURL());
    }
    void archiveAttribute(std::string_view name, std::string_view attribute,
                          const ArchivedObject& object) {
        setAttribute(world_.path(name), "user." + std::string(attribute), archive(object)->text());
    }
    // Makes one resource answer that, whatever the file.
    void answer(ResourceKey asked, Expected<ResourceValue> value) {
        world_.fileSystem.resourceAnswer =
            [=](const URL&, ResourceKey key) -> std::optional<Expected<ResourceValue>> {
            return key == asked ? std::optional(value) : std::nullopt;
        };
    }
    void needAttributes() {
        if (!keepsUserAttributes(world_.root())) {
            MARROWDALE_SKIP("the file system keeps no user attributes");
        }
    }
    std::size_t count(const std::string& line) const { return world_.sink->count(line); }

    TemporaryDirectory directory_{GetParam().dir};
    TestWorld world_{directory_};
};

INSTANTIATE_TEST_SUITE_P(OnEach, LocalItemTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(LocalItemTest, theStorageRootGetsCapabilities1AndItselfAsParentAndIsNeverTrashed) {
    const auto root = rootItem();
    ASSERT_TRUE(root);
    EXPECT_EQ(root->itemIdentifier, VantrelRootContainerItemIdentifier);
    EXPECT_EQ(root->parentItemIdentifier, VantrelRootContainerItemIdentifier);
    EXPECT_EQ(root->capabilities, 1U);
    EXPECT_FALSE(root->isTrashed);
    EXPECT_EQ(root->filename, "Documents");
    EXPECT_TRUE(root->isFolder());
    EXPECT_FALSE(root->hx_isContainer());
}

TEST_P(LocalItemTest, aFileBringsAllItsFields) {
    writeFile(world_.path("a.txt"), "hello");
    const auto file = item("a.txt");
    ASSERT_TRUE(file);
    EXPECT_TRUE(file->itemIdentifier.starts_with("did="));
    EXPECT_EQ("did=" + std::to_string(*file->docID), file->itemIdentifier);
    EXPECT_EQ(file->itemIdentifierAsString(), file->itemIdentifier);
    EXPECT_EQ(file->parentItemIdentifierAsString(), VantrelRootContainerItemIdentifier);
    EXPECT_EQ(file->filename, "a.txt");
    EXPECT_EQ(file->typeIdentifier, "text/plain");
    EXPECT_EQ(file->documentSize, 5U);
    EXPECT_EQ(file->childItemCount, std::nullopt);
    EXPECT_EQ(file->capabilities, 63U);
    EXPECT_FALSE(file->isTrashed);
    EXPECT_EQ(file->lastUsedDate, std::nullopt);
    EXPECT_EQ(file->tagData, std::nullopt);
    EXPECT_EQ(file->favoriteRank, std::nullopt);
    EXPECT_NE(file->fileID, std::nullopt);
    EXPECT_EQ(file->fileURL.path(), world_.path("a.txt"));
    EXPECT_EQ(file->hx_lumenoDomainIdentifier, std::nullopt);
    EXPECT_FALSE(file->hx_isUbiquitous);
    ASSERT_TRUE(file->contentModificationDate);
    EXPECT_EQ(file->versionIdentifier, dataWithDate(*file->contentModificationDate));
    EXPECT_EQ(world_.sink->countOfLevel(LogLevel::error), 0U);
}

TEST_P(LocalItemTest, aFolderOfThreeSubfoldersReportsChildItemCount3) {
    for (const char* name : {"f/1", "f/2", "f/3"}) {
        makeFolder(world_.path(name));
    }
    writeFile(world_.path("f/file"), "");
    ASSERT_TRUE(world_.store->reconcile());
    EXPECT_EQ(item("f")->childItemCount, 3U);
    EXPECT_EQ(item("f/1")->childItemCount, 0U);
}

TEST_P(LocalItemTest, anItemWhoseIdentifierBeginsWithFidHasNoDocID) {
    makeFolder(world_.path("f"));
    const auto folder = item("f");
    ASSERT_TRUE(folder);
    EXPECT_EQ(folder->itemIdentifier, "fid=" + std::to_string(*folder->fileID));
    EXPECT_EQ(folder->docID, std::nullopt);
    EXPECT_EQ(folder->typeIdentifier, "inode/directory");
    EXPECT_EQ(folder->capabilities, 63U);
    EXPECT_EQ(folder->documentSize, std::nullopt);
}

TEST_P(LocalItemTest, whatLiesInTheTrashFolderIsTrashedAndSoIsTheFolder) {
    makeFolder(world_.path(".Trash/f"));
    writeFile(world_.path(".Trash/f/a.txt"), "");
    EXPECT_TRUE(item(".Trash")->isTrashed);
    EXPECT_TRUE(item(".Trash/f/a.txt")->isTrashed);
}

TEST_P(LocalItemTest, aTrashFolderOfAnotherFolderIsNone) {
    makeFolder(world_.path("sub/.Trash"));
    writeFile(world_.path("sub/.Trash/a.txt"), "");
    EXPECT_FALSE(item("sub/.Trash/a.txt")->isTrashed);
    EXPECT_FALSE(item("sub/.Trash")->isTrashed);
}

TEST_P(LocalItemTest, aReadOnlyFileGetsCapabilities1) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    writeFile(world_.path("a.txt"), "");
    std::filesystem::permissions(world_.path("a.txt"), std::filesystem::perms::owner_read);
    EXPECT_EQ(item("a.txt")->capabilities, 1U);
}

TEST_P(LocalItemTest, anItemWhoseWritabilityIsUnknownGetsCapabilities1) {
    writeFile(world_.path("a.txt"), "");
    answer(ResourceKey::isWritable, ResourceValue());
    EXPECT_EQ(item("a.txt")->capabilities, 1U);
    answer(ResourceKey::isWritable, ResourceValue(false));
    EXPECT_EQ(item("a.txt")->capabilities, 1U);
}

TEST_P(LocalItemTest, anInboxFolderDirectlyInTheRootIsRefused) {
    makeFolder(world_.path("Inbox"));
    EXPECT_FALSE(item("Inbox"));
    EXPECT_EQ(count("[DEBUG] can't create an item for the \"Inbox\" directory"), 1U);
}

TEST_P(LocalItemTest, anInboxFolderInAnAppLibraryIsRefused) {
    makeFolder(directory_.path("app/Documents/Inbox"));
    world_.addLibrary("org.example.Notes", "Notes", directory_.path("app"));
    EXPECT_FALSE(LocalItem::initWithURL(world_.platform,
                                        URL::fileURL(directory_.path("app/Documents/Inbox"))));
    EXPECT_EQ(count("[DEBUG] can't create an item for the \"Inbox\" directory"), 1U);
}

TEST_P(LocalItemTest, anInboxFolderAtDepthTwoIsServed) {
    makeFolder(world_.path("f/Inbox"));
    EXPECT_TRUE(item("f/Inbox"));
}

TEST_P(LocalItemTest, aFileNamedInboxIsServed) {
    writeFile(world_.path("Inbox"), "");
    EXPECT_TRUE(item("Inbox"));
}

TEST_P(LocalItemTest, metadataComesFromTheExtendedAttributes) {
    needAttributes();
    if (IsSkipped() || HasFailure()) {
        return;
    }
    writeFile(world_.path("a.txt"), "");
    archiveAttribute("a.txt", LocalItem::xattrLastUsedDateName, ArchivedObject(Date{7, 8}));
    archiveAttribute("a.txt", LocalItem::xattrFavoriteRankName,
                     ArchivedObject(Number(std::uint64_t{1} << 60U)));
    archiveAttribute("a.txt", LocalItem::xattrTagDataName,
                     ArchivedObject(ArchivedArray{ArchivedObject(std::string("red")),
                                                  ArchivedObject(std::string("blue"))}));
    const auto file = item("a.txt");
    ASSERT_TRUE(file);
    EXPECT_EQ(file->lastUsedDate, (Date{7, 8}));
    EXPECT_EQ(file->favoriteRank, Number(std::uint64_t{1} << 60U));
    ASSERT_TRUE(file->tagData);
    EXPECT_EQ(*decodeTagData(*file->tagData),
              (std::vector<Tag>{{.label = "red", .color = 0}, {.label = "blue", .color = 0}}));
}

TEST_P(LocalItemTest, anAttributeOfAnotherClassIsLoggedAndGivesNone) {
    needAttributes();
    if (IsSkipped() || HasFailure()) {
        return;
    }
    writeFile(world_.path("a.txt"), "");
    archiveAttribute("a.txt", LocalItem::xattrLastUsedDateName,
                     ArchivedObject(Number(std::int64_t{1})));
    archiveAttribute("a.txt", LocalItem::xattrFavoriteRankName,
                     ArchivedObject(std::string("first")));
    archiveAttribute("a.txt", LocalItem::xattrTagDataName,
                     ArchivedObject(ArchivedArray{ArchivedObject(Date{1, 2})}));
    const auto file = item("a.txt");
    ASSERT_TRUE(file);
    EXPECT_EQ(file->lastUsedDate, std::nullopt);
    EXPECT_EQ(file->favoriteRank, std::nullopt);
    EXPECT_EQ(file->tagData, std::nullopt);
    const auto source = [&](std::string_view name) {
        return std::string(name) + " of \"" + world_.path("a.txt") + "\"";
    };
    EXPECT_EQ(count("[ERROR] got OrbNumber while unarchiving object from " +
                    source(LocalItem::xattrLastUsedDateName)),
              1U);
    EXPECT_EQ(count("[ERROR] got OrbString while unarchiving object from " +
                    source(LocalItem::xattrFavoriteRankName)),
              1U);
    EXPECT_EQ(count("[ERROR] got OrbDate while unarchiving object from " +
                    source(LocalItem::xattrTagDataName)),
              1U);
}

TEST_P(LocalItemTest, aTagThatIsNotUTF8IsLeftOutAndTheOthersStay) {
    needAttributes();
    if (IsSkipped() || HasFailure()) {
        return;
    }
    writeFile(world_.path("a.txt"), "");
    archiveAttribute("a.txt", LocalItem::xattrTagDataName,
                     ArchivedObject(ArchivedArray{ArchivedObject(std::string("red")),
                                                  ArchivedObject(std::string("x\xff"))}));
    const auto file = item("a.txt");
    ASSERT_TRUE(file && file->tagData);
    EXPECT_EQ(*decodeTagData(*file->tagData), (std::vector<Tag>{{.label = "red", .color = 0}}));
    EXPECT_EQ(
        count("[ERROR] left out a tag that is not UTF-8 in " +
              std::string(LocalItem::xattrTagDataName) + " of \"" + world_.path("a.txt") + "\""),
        1U);
}

TEST_P(LocalItemTest, attributesOfRandomBytesGiveNone) {
    needAttributes();
    if (IsSkipped() || HasFailure()) {
        return;
    }
    writeFile(world_.path("a.txt"), "");
    std::string bytes;
    for (unsigned i = 0; i < 900; ++i) {
        bytes.push_back(static_cast<char>(i * 2654435761U >> 13U));
    }
    for (const std::string_view name :
         {LocalItem::xattrLastUsedDateName, LocalItem::xattrTagDataName,
          LocalItem::xattrFavoriteRankName}) {
        setAttribute(world_.path("a.txt"), "user." + std::string(name), bytes);
    }
    const auto file = item("a.txt");
    ASSERT_TRUE(file);
    EXPECT_EQ(file->lastUsedDate, std::nullopt);
    EXPECT_EQ(file->tagData, std::nullopt);
    EXPECT_EQ(file->favoriteRank, std::nullopt);
    EXPECT_EQ(world_.sink->countContaining("[ERROR] got nil while unarchiving object from "), 3U);
}

TEST_P(LocalItemTest, aSymbolicLinkHasALastingIdentifierAndItsTargetsFileID) {
    writeFile(world_.path("target"), "12345");
    std::filesystem::create_symlink("target", world_.path("link"));
    const auto link = item("link");
    ASSERT_TRUE(link);
    EXPECT_TRUE(link->itemIdentifier.starts_with("did="));
    EXPECT_NE(link->itemIdentifier, item("target")->itemIdentifier);
    EXPECT_EQ(link->fileID, item("target")->fileID);
    EXPECT_EQ(link->typeIdentifier, "inode/symlink");
    EXPECT_FALSE(link->isFolder());
    EXPECT_EQ(item("link")->itemIdentifier, link->itemIdentifier);
}

TEST_P(LocalItemTest, aLinkToAFolderIsNoFolder) {
    makeFolder(world_.path("f/sub"));
    std::filesystem::create_symlink("f", world_.path("link"));
    const auto link = item("link");
    ASSERT_TRUE(link);
    EXPECT_FALSE(link->isFolder());
    EXPECT_EQ(link->childItemCount, std::nullopt);
}

TEST_P(LocalItemTest, aLinkThatLeadsNowhereIsNotServed) {
    std::filesystem::create_symlink("nowhere", world_.path("link"));
    std::filesystem::create_symlink("loop", world_.path("loop"));
    EXPECT_FALSE(item("link"));
    EXPECT_FALSE(item("loop"));
    EXPECT_EQ(world_.sink->countContaining("[ERROR] can't find fileID for item \"" +
                                           world_.path("link") + "\"; "),
              1U);
    EXPECT_EQ(world_.sink->countContaining("[ERROR] can't find fileID for item \"" +
                                           world_.path("loop") + "\"; "),
              1U);
}

TEST_P(LocalItemTest, anItemWithoutAnIDIsRefused) {
    EXPECT_FALSE(item("missing"));
    EXPECT_EQ(count("[DEBUG] can't create an item without an ID"), 1U);
    EXPECT_EQ(world_.sink->countOfLevel(LogLevel::error), 0U);
}

TEST_P(LocalItemTest, anItemWithoutAParentIDIsRefused) {
    const auto refused = LocalItem::initWithURL(world_.platform, URL::fileURL("/nowhere/a"),
                                                {.customItemID = "did=1",
                                                 .customParentItemID = {},
                                                 .customFilename = {},
                                                 .bundleIdentifier = {}});
    EXPECT_FALSE(refused);
    EXPECT_EQ(count("[ERROR] can't create an item without a parent ID (itemIdentifier: did=1)"),
              1U);
}

TEST_P(LocalItemTest, anItemWithoutAFilenameIsRefused) {
    writeFile(world_.path("a.txt"), "");
    answer(ResourceKey::name, ResourceValue());
    EXPECT_FALSE(item("a.txt"));
    EXPECT_EQ(world_.sink->countContaining(
                  "[ERROR] can't create an item without a filename (itemIdentifier: did="),
              1U);
    EXPECT_EQ(
        world_.sink->countContaining(", parentItemIdentifier: VantrelRootContainerItemIdentifier)"),
        1U);
}

TEST_P(LocalItemTest, anItemWithoutATypeIdentifierIsRefused) {
    writeFile(world_.path("a.txt"), "");
    answer(ResourceKey::typeIdentifier, ResourceValue());
    EXPECT_FALSE(item("a.txt"));
    EXPECT_EQ(world_.sink->countContaining(
                  "[ERROR] can't create an item without a type identifier (itemIdentifier: did="),
              1U);
    EXPECT_EQ(world_.sink->countContaining(", parentItemIdentifier: "
                                           "VantrelRootContainerItemIdentifier, filename: a.txt)"),
              1U);
}

TEST_P(LocalItemTest, anItemWithoutAStatusIsRefused) {
    writeFile(world_.path("a.txt"), "");
    const Error error = errorWithPOSIXCode(EIO);
    world_.fileSystem.statusAnswer = [&](const URL&) -> std::optional<Expected<FileStatus>> {
        return Expected<FileStatus>(Unexpected(error));
    };
    EXPECT_FALSE(item("a.txt"));
    EXPECT_EQ(count("[ERROR] can't find fileID for item \"" + world_.path("a.txt") + "\"; " +
                    error.description()),
              1U);
}

TEST_P(LocalItemTest, optionalResourcesThatCantBeReadStayEmptyAndAreLogged) {
    writeFile(world_.path("a.txt"), "");
    world_.fileSystem.resourceAnswer =
        [](const URL&, ResourceKey key) -> std::optional<Expected<ResourceValue>> {
        switch (key) {
            case ResourceKey::fileSize:
            case ResourceKey::creationDate:
            case ResourceKey::contentModificationDate:
                return Expected<ResourceValue>(Unexpected(errorWithPOSIXCode(EIO)));
            default:
                return std::nullopt;
        }
    };
    const auto file = item("a.txt");
    ASSERT_TRUE(file);
    EXPECT_EQ(file->documentSize, std::nullopt);
    EXPECT_EQ(file->creationDate, std::nullopt);
    EXPECT_EQ(file->contentModificationDate, std::nullopt);
    EXPECT_EQ(file->versionIdentifier, std::nullopt);
    EXPECT_EQ(world_.sink->countContaining("[ERROR] can't get resource \"OrbURLFileSizeKey\" for "),
              1U);
    EXPECT_EQ(world_.sink->countContaining(
                  "[ERROR] can't get resource \"OrbURLContentModificationDateKey\" for "),
              2U);
}

TEST_P(LocalItemTest, aFolderOfFewerThanTwoLinksEndsTheProcess) {
    makeFolder(world_.path("f"));
    world_.fileSystem.statusAnswer = [](const URL&) -> std::optional<Expected<FileStatus>> {
        return Expected<FileStatus>(
            FileStatus{.device = {}, .fileID = FileID{5}, .linkCount = 1, .isDirectory = true});
    };
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_DEATH((void)item("f"), "a folder with fewer than two links");
}

TEST_P(LocalItemTest, aFolderThatBecameAFileUnderTheReadIsNotFatal) {
    makeFolder(world_.path("f"));
    world_.fileSystem.statusAnswer = [](const URL&) -> std::optional<Expected<FileStatus>> {
        return Expected<FileStatus>(
            FileStatus{.device = {}, .fileID = FileID{5}, .linkCount = 1, .isDirectory = false});
    };
    const auto folder = item("f");
    ASSERT_TRUE(folder);
    EXPECT_EQ(folder->childItemCount, std::nullopt);
}

TEST_P(LocalItemTest, customValuesTakePrecedence) {
    writeFile(world_.path("a.txt"), "");
    const auto file = LocalItem::initWithURL(world_.platform, world_.url("a.txt"),
                                             {.customItemID = "did=99",
                                              .customParentItemID = "fid=98",
                                              .customFilename = "other",
                                              .bundleIdentifier = {}});
    ASSERT_TRUE(file);
    EXPECT_EQ(file->itemIdentifier, "did=99");
    EXPECT_EQ(file->docID, 99U);
    EXPECT_EQ(file->parentItemIdentifier, "fid=98");
    EXPECT_EQ(file->filename, "other");
}

TEST_P(LocalItemTest, theDomainIsTheBundleIdentifierOfTheInnermostLibrary) {
    makeFolder(directory_.path("app/Documents/inner/Documents"));
    writeFile(directory_.path("app/Documents/a.txt"), "");
    writeFile(directory_.path("app/Documents/inner/Documents/a.txt"), "");
    world_.addLibrary("org.example.Outer", "Outer", directory_.path("app"));
    world_.addLibrary("org.example.Inner", "Inner", directory_.path("app/Documents/inner"));
    const auto domain = [&](const std::string& path, bool flag) {
        const LocalItem::Options options{.customItemID = "did=1",
                                         .customParentItemID = "fid=2",
                                         .customFilename = {},
                                         .hasLumenoDomainIdentifier = flag,
                                         .bundleIdentifier = {}};
        const auto made = LocalItem::initWithURL(world_.platform, URL::fileURL(path), options);
        EXPECT_EQ(made->hx_lumenoDomainIdentifier, made->hx_appContainerBundleIdentifier);
        return made->hx_lumenoDomainIdentifier;
    };
    EXPECT_EQ(domain(directory_.path("app/Documents/a.txt"), true), "org.example.Outer");
    EXPECT_EQ(domain(directory_.path("app/Documents/inner/Documents/a.txt"), true),
              "org.example.Inner");
    EXPECT_EQ(domain(directory_.path("app/Documents/a.txt"), false), std::nullopt);
    EXPECT_EQ(domain(world_.root(), true), std::nullopt);
}

TEST_P(LocalItemTest, namesOfAnyBytesTravelUnchanged) {
    for (const std::string& name :
         {std::string("new\nline"), std::string("\xff\xfe"), std::string(255, 'x'),
          std::string("-leading"), std::string("100%25"), std::string("a\"b\\c")}) {
        writeFile(world_.path(name), "");
        const auto file = item(name);
        ASSERT_TRUE(file) << name;
        EXPECT_EQ(file->filename, name);
        const auto url = fileURLWithItemIdentifier(world_.platform, file->itemIdentifier);
        ASSERT_TRUE(url) << name;
        EXPECT_EQ(url->path(), world_.path(name));
    }
}

TEST_P(LocalItemTest, descriptionNamesTheItemAndItsParent) {
    makeFolder(world_.path(".Trash/f"));
    writeFile(world_.path("a.txt"), "");
    const auto matches = [](const LocalItem& described, const std::string& pattern) {
        return std::regex_match(described.description(), std::regex(pattern));
    };
    auto file = item("a.txt");
    EXPECT_TRUE(matches(*file, R"(<LocalItem:0x[0-9a-f]+ did=\d+ name:"a\.txt" parent:root )"
                               R"(type:text/plain>)"))
        << file->description();
    file->favoriteRank = Number(std::int64_t{-1});
    EXPECT_TRUE(file->description().ends_with(" favorite:18446744073709551615>"));
    for (const double unfit : {std::numeric_limits<double>::quiet_NaN(), -1.0, 1e300}) {
        file->favoriteRank = Number(unfit);
        EXPECT_TRUE(file->description().ends_with(" favorite:0>"));
    }
    file->favoriteRank = Number(2.5);
    EXPECT_TRUE(file->description().ends_with(" favorite:2>"));
    const auto trashed = item(".Trash/f");
    EXPECT_TRUE(matches(*trashed, R"(<LocalItem:0x[0-9a-f]+ fid=\d+ name:"f" parent:fid=\d+ )"
                                  R"(type:inode/directory trashed>)"))
        << trashed->description();
}

TEST(LocalItemKeysTest, urlKeysStandInTheirOrder) {
    EXPECT_EQ(
        LocalItem::urlKeys,
        (std::array{ResourceKey::parentDirectoryURL, ResourceKey::name, ResourceKey::localizedName,
                    ResourceKey::typeIdentifier, ResourceKey::fileSize, ResourceKey::creationDate,
                    ResourceKey::contentModificationDate, ResourceKey::isReadable,
                    ResourceKey::isWritable}));
    for (const ResourceKey key : LocalItem::urlKeys) {
        EXPECT_TRUE(LocalItem::listingKeys().contains(key));
    }
}

TEST(LocalItemKeysTest, attributeNamesAreThoseOfOtherReaders) {
    EXPECT_EQ(LocalItem::xattrLastUsedDateName, "com.quillory.lastuseddate#PS");
    EXPECT_EQ(LocalItem::xattrTagDataName, "com.quillory.metadata:_kMDItemUserTags");
    EXPECT_EQ(LocalItem::xattrFavoriteRankName, "com.quillory.favorite-rank.number#PS");
    EXPECT_EQ(LocalItem::xattrTrashDateName, "com.quillory.trash.time#PS");
    EXPECT_EQ(LocalItem::xattrTrashPutBackName, "com.quillory.trash.putback#PS");
}

}  // namespace
}  // namespace marrowdale
