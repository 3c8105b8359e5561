#include <cerrno>
#include <vector>

#include <gtest/gtest.h>

#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/FakePlatform.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"
#include "providers/marrowdale/items/MRWFileObjectIdentifier.h"
#include "tests/support/AddedLibraries.h"

namespace marrowdale {
namespace {

Unexpected posix(int code) {
    return Unexpected(errorWithPOSIXCode(code));
}

Unexpected noSuchFile() {
    return Unexpected(
        Error{ErrorDomain::file, static_cast<int>(FileErrorCode::noSuchFile), {}, {}});
}

// A platform without a disk, on which every file answers what a test says.
class MRFileObjectIdentifierTest : public ::testing::Test {
  protected:
    MRFileObjectIdentifierTest() {
        fake_.fileSystem.resourceAnswer = [this](const URL& url, ResourceKey key) {
            return resource(url, key);
        };
        fake_.fileSystem.commonAttributesAnswer = [this](const URL& url) {
            const bool isRoot = url == fake_.manager.documentStorageURL();
            return isRoot ? std::nullopt : std::optional(attributes_);
        };
        fake_.fileSystem.pathAnswer = [](DeviceID device,
                                         FileID file) -> std::optional<Expected<std::string>> {
            EXPECT_EQ(device, EmptyFileSystem::device);
            if (file == FileID{77}) {
                return Expected<std::string>("/storage/found");
            }
            return std::nullopt;
        };
    }

    std::optional<Expected<ResourceValue>> resource(const URL& url, ResourceKey key) const {
        if (const auto cached = url.cachedResourceValue(key)) {
            return Expected<ResourceValue>(*cached);
        }
        const auto entry = resources_.find(key);
        return entry == resources_.end() ? std::nullopt : std::optional(entry->second);
    }

    void isDirectory(bool value) {
        resources_.insert_or_assign(ResourceKey::isDirectory, ResourceValue(value));
        resources_.insert_or_assign(ResourceKey::isPackage, ResourceValue(false));
    }
    void isPackage() {
        resources_.insert_or_assign(ResourceKey::isDirectory, ResourceValue(true));
        resources_.insert_or_assign(ResourceKey::isPackage, ResourceValue(true));
    }
    void set(ResourceKey key, Expected<ResourceValue> value) {
        resources_.insert_or_assign(key, std::move(value));
    }
    static ResourceValue number(std::uint64_t value) { return Number(value); }

    std::optional<std::string> identifierOf(std::string_view path) const {
        return itemIdentifier(platform_, URL::fileURL(path));
    }
    std::vector<std::string> lines() const { return fake_.sink->lines(); }

    FakePlatform fake_;
    const Platform& platform_ = fake_.platform;
    std::map<ResourceKey, Expected<ResourceValue>> resources_;
    Expected<CommonAttributes> attributes_ = posix(EIO);
};

using Lines = std::vector<std::string>;

TEST_F(MRFileObjectIdentifierTest, identifiersAreTheNumbersInDecimal) {
    EXPECT_EQ(MRWFileObjectIdentifier::fromFileID(0), "fid=0");
    EXPECT_EQ(MRWFileObjectIdentifier::fromFileID(~std::uint64_t{0}), "fid=18446744073709551615");
    EXPECT_EQ(MRWFileObjectIdentifier::fromDocumentID(4294967295), "did=4294967295");
}

TEST_F(MRFileObjectIdentifierTest, theStorageRootItselfYieldsTheRootIdentifier) {
    EXPECT_EQ(identifierOf("/storage"), VantrelRootContainerItemIdentifier);
    EXPECT_EQ(identifierOf("/storage/a/.."), VantrelRootContainerItemIdentifier);
}

TEST_F(MRFileObjectIdentifierTest, anAppLibraryFolderItselfYieldsItsBundleIdentifier) {
    addLibrary(fake_.platform, fake_.applications, "org.example.Notes", "Notes", "/apps/notes");
    EXPECT_EQ(identifierOf("/apps/notes/Documents"), "#org.example.Notes");
}

TEST_F(MRFileObjectIdentifierTest, aFileInsideAnAppLibraryYieldsADocumentIdentifier) {
    addLibrary(fake_.platform, fake_.applications, "org.example.Other", "Other", "/apps/other");
    addLibrary(fake_.platform, fake_.applications, "org.example.Notes", "Notes", "/apps/notes");
    isDirectory(false);
    set(ResourceKey::documentIdentifier, number(12));
    EXPECT_EQ(identifierOf("/apps/notes/Documents/a.txt"), "did=12");
    EXPECT_TRUE(lines().empty());
}

TEST_F(MRFileObjectIdentifierTest, aURLOutsideEveryTreeYieldsNilAndADebugLine) {
    EXPECT_EQ(identifierOf("/elsewhere/./x/../y"), std::nullopt);
    EXPECT_EQ(lines(), Lines{"[DEBUG] can't compute file object identifier because "
                             "\"/elsewhere/y\" is not part of Marrowdale"});
}

TEST_F(MRFileObjectIdentifierTest, aNameThatOnlyBeginsLikeTheRootIsOutside) {
    EXPECT_EQ(identifierOf("/storage2"), std::nullopt);
    EXPECT_EQ(identifierOf("/"), std::nullopt);
}

TEST_F(MRFileObjectIdentifierTest, aURLThatIsNoFileURLYieldsNil) {
    EXPECT_EQ(itemIdentifier(platform_, *URL::fromAbsoluteString("https://example.org/storage/a")),
              std::nullopt);
    EXPECT_EQ(lines(), Lines{"[ERROR] can't compute file object identifier if not a file URL"});
}

TEST_F(MRFileObjectIdentifierTest, anAppLibraryWithoutARecordYieldsNilAndALine) {
    EXPECT_EQ(MRWFileObjectIdentifier::fromAppLibraryDataContainerURL(
                  platform_, URL::fileURL("/apps/gone/Documents")),
              std::nullopt);
    EXPECT_EQ(lines(), Lines{"[ERROR] can't find bundle proxy at file:///apps/gone/Documents"});
}

TEST_F(MRFileObjectIdentifierTest, aRecordWithoutABundleIdentifierIsNamedNull) {
    FakeBundleRecord record;
    EXPECT_EQ(appLibraryIdentifier(record), "#(null)");
    record.identifier = "org.example.Notes";
    EXPECT_EQ(appLibraryIdentifier(record), "#org.example.Notes");
}

TEST_F(MRFileObjectIdentifierTest, aFolderYieldsItsFileID) {
    isDirectory(true);
    set(ResourceKey::fileID, number(~std::uint64_t{0}));
    EXPECT_EQ(identifierOf("/storage/folder"), "fid=18446744073709551615");
}

TEST_F(MRFileObjectIdentifierTest, aPackageFolderBehavesAsAFile) {
    isPackage();
    set(ResourceKey::documentIdentifier, number(9));
    EXPECT_EQ(identifierOf("/storage/pack.bundle"), "did=9");
    set(ResourceKey::documentIdentifier, ResourceValue());
    attributes_ = CommonAttributes{.device = EmptyFileSystem::device,
                                   .type = FileType::directory,
                                   .documentID = DocumentID{10},
                                   .fileID = FileID{5}};
    EXPECT_EQ(identifierOf("/storage/pack.bundle"), "did=10");
}

TEST_F(MRFileObjectIdentifierTest, aFileIDThatCantBeReadYieldsNilAndALineOfItsLevel) {
    isDirectory(true);
    set(ResourceKey::fileID, noSuchFile());
    EXPECT_EQ(identifierOf("/storage/folder"), std::nullopt);
    set(ResourceKey::fileID, posix(EIO));
    EXPECT_EQ(identifierOf("/storage/folder"), std::nullopt);
    EXPECT_EQ(lines(), (Lines{"[DEBUG] can't get resource value for _kOrbURLFileIDKey; " +
                                  noSuchFile().error().description(),
                              "[ERROR] can't get resource value for _kOrbURLFileIDKey; " +
                                  posix(EIO).error().description()}));
}

TEST_F(MRFileObjectIdentifierTest, aDocumentIDThatCantBeReadYieldsNilAndALineOfItsLevel) {
    isDirectory(false);
    set(ResourceKey::documentIdentifier, noSuchFile());
    EXPECT_EQ(identifierOf("/storage/a"), std::nullopt);
    set(ResourceKey::documentIdentifier, posix(ENOSPC));
    EXPECT_EQ(identifierOf("/storage/a"), std::nullopt);
    EXPECT_EQ(lines(), (Lines{"[DEBUG] can't get resource value for OrbURLDocumentIdentifierKey; " +
                                  noSuchFile().error().description(),
                              "[ERROR] can't get resource value for OrbURLDocumentIdentifierKey; " +
                                  posix(ENOSPC).error().description()}));
}

TEST_F(MRFileObjectIdentifierTest, aFileIDOfAnotherClassIsAnAssertionAndTheItemIsLookedAt) {
    isDirectory(true);
    set(ResourceKey::fileID, ResourceValue(std::string("5")));
    attributes_ = CommonAttributes{.device = EmptyFileSystem::device,
                                   .type = FileType::directory,
                                   .documentID = {},
                                   .fileID = FileID{5}};
    EXPECT_NE(identifierOf("/storage/folder"), std::nullopt);
    EXPECT_EQ(lines(), Lines{"[ERROR] unexpected class for file ID (expected: OrbNumber, actual: "
                             "OrbString)"});
}

TEST_F(MRFileObjectIdentifierTest, aDocumentIDOfAnotherClassIsAnAssertionAndTheItemIsLookedAt) {
    isDirectory(false);
    set(ResourceKey::documentIdentifier, ResourceValue(Date{1, 2}));
    attributes_ = CommonAttributes{.device = EmptyFileSystem::device,
                                   .type = FileType::regular,
                                   .documentID = DocumentID{6},
                                   .fileID = FileID{5}};
    EXPECT_EQ(identifierOf("/storage/a"), "did=6");
    EXPECT_EQ(lines(), Lines{"[ERROR] unexpected class for doc ID (expected: OrbNumber, actual: "
                             "OrbDate)"});
}

TEST_F(MRFileObjectIdentifierTest, aPackageFlagThatCantBeReadYieldsNilAndALine) {
    set(ResourceKey::documentIdentifier, ResourceValue());
    set(ResourceKey::isDirectory, ResourceValue(false));
    set(ResourceKey::isPackage, posix(EIO));
    EXPECT_EQ(identifierOf("/storage/a"), std::nullopt);
    EXPECT_EQ(lines(), Lines{"[ERROR] can't get resource OrbURLIsPackageKey for \"/storage/a\"; " +
                             posix(EIO).error().description()});
}

TEST_F(MRFileObjectIdentifierTest, anItemThatCantBeOpenedYieldsNilAndALine) {
    isDirectory(false);
    set(ResourceKey::documentIdentifier, ResourceValue());
    fake_.fileSystem.openFault = [](const URL&) { return errorWithPOSIXCode(EMFILE); };
    EXPECT_EQ(identifierOf("/storage/a"), std::nullopt);
    EXPECT_EQ(lines(),
              Lines{"[ERROR] can't open file at \"/storage/a\"; " + std::to_string(EMFILE)});
}

TEST_F(MRFileObjectIdentifierTest, anItemThatCantBeQueriedYieldsNilAndALine) {
    isDirectory(false);
    set(ResourceKey::documentIdentifier, ResourceValue());
    EXPECT_EQ(identifierOf("/storage/a"), std::nullopt);
    EXPECT_EQ(lines(),
              Lines{"[ERROR] can't get attribute list for \"/storage/a\"; " + std::to_string(EIO)});
}

TEST_F(MRFileObjectIdentifierTest, aRegularFileWithNoDocumentIDGetsOneFromTheStore) {
    isDirectory(false);
    set(ResourceKey::documentIdentifier, ResourceValue());
    attributes_ = CommonAttributes{.device = EmptyFileSystem::device,
                                   .type = FileType::regular,
                                   .documentID = {},
                                   .fileID = FileID{5}};
    fake_.store.allocations = {DocumentID{31}};
    const URL url = URL::fileURL("/storage/a");
    EXPECT_EQ(itemIdentifier(platform_, url), "did=31");
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::documentIdentifier), number(31))
        << "the next request on the same URL is cheap";
    attributes_ = posix(EIO);
    EXPECT_EQ(itemIdentifier(platform_, url), "did=31");
}

TEST_F(MRFileObjectIdentifierTest, aStoreThatGivesNoNumberYieldsNilAndALine) {
    isDirectory(false);
    set(ResourceKey::documentIdentifier, ResourceValue());
    attributes_ = CommonAttributes{.device = EmptyFileSystem::device,
                                   .type = FileType::regular,
                                   .documentID = {},
                                   .fileID = FileID{5}};
    fake_.store.allocations = {posix(ENOSPC), DocumentID{}};
    EXPECT_EQ(identifierOf("/storage/a"), std::nullopt);
    EXPECT_EQ(identifierOf("/storage/a"), std::nullopt);
    EXPECT_EQ(fake_.sink->count("[ERROR] can't get permanent storage for \"/storage/a\""), 2U);
}

TEST_F(MRFileObjectIdentifierTest, aFolderWithoutAFileIDGetsAnIdentifierThatDoesNotResolveBack) {
    isDirectory(true);
    set(ResourceKey::fileID, ResourceValue());
    attributes_ = CommonAttributes{.device = EmptyFileSystem::device,
                                   .type = FileType::directory,
                                   .documentID = {},
                                   .fileID = FileID{77}};
    const URL url = URL::fileURL("/storage/folder");
    const auto identifier = itemIdentifier(platform_, url);
    ASSERT_NE(identifier, std::nullopt);
    EXPECT_TRUE(identifier->starts_with("fid="));
    EXPECT_GE(std::stoull(identifier->substr(4)), 1ULL << 63U);
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, *identifier), std::nullopt);
    EXPECT_NE(itemIdentifier(platform_, URL::fileURL("/storage/folder")), identifier)
        << "each box has a handle of its own";
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::fileID), number(77));
    EXPECT_EQ(itemIdentifier(platform_, url), "fid=77");
}

TEST_F(MRFileObjectIdentifierTest, aSymbolicLinkThatIsLookedAtIsFolderLike) {
    isDirectory(false);
    set(ResourceKey::documentIdentifier, ResourceValue());
    for (const FileType type : {FileType::symbolicLink, FileType::other}) {
        attributes_ = CommonAttributes{.device = EmptyFileSystem::device,
                                       .type = type,
                                       .documentID = DocumentID{3},
                                       .fileID = FileID{77}};
        EXPECT_TRUE(identifierOf("/storage/link")->starts_with("fid="));
    }
}

TEST_F(MRFileObjectIdentifierTest, aListedChildIsIdentifiedWithoutTheSystem) {
    PrefetchedValues values;
    values.known = {ResourceKey::isDirectory, ResourceKey::isPackage, ResourceKey::fileID,
                    ResourceKey::documentIdentifier};
    values.fileID = FileID{77};
    values.documentIdentifier = DocumentID{8};
    const URL parent = URL::fileURL("/storage");
    EXPECT_EQ(itemIdentifier(platform_, URL::listedChild(parent, "a", values)), "did=8");
    values.isDirectory = true;
    EXPECT_EQ(itemIdentifier(platform_, URL::listedChild(parent, "a", values)), "fid=77");
    values.isPackage = true;
    EXPECT_EQ(itemIdentifier(platform_, URL::listedChild(parent, "a", values)), "did=8");
    EXPECT_EQ(itemIdentifier(platform_, URL::listedChild(URL::fileURL("/other"), "a", values)),
              std::nullopt);
}

TEST_F(MRFileObjectIdentifierTest, theRootIdentifierResolvesToTheStorageRoot) {
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, VantrelRootContainerItemIdentifier),
              URL::fileURL("/storage"));
}

TEST_F(MRFileObjectIdentifierTest, identifiersOfOtherThanTwoComponentsAreRefused) {
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "fid=12=3"), std::nullopt);
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "fid"), std::nullopt);
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, ""), std::nullopt);
    EXPECT_EQ(lines(),
              (Lines{"[ERROR] invalid identifier; identifier should have 2 components, not 3",
                     "[ERROR] invalid identifier; identifier should have 2 components, not 1",
                     "[ERROR] invalid identifier; identifier should have 2 components, not 1"}));
}

TEST_F(MRFileObjectIdentifierTest, anIdentifierOfAnotherHostIsRefused) {
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "xyz=5"), std::nullopt);
    EXPECT_EQ(lines(), Lines{"[ERROR] invalid host for identifier \"xyz=5\""});
}

TEST_F(MRFileObjectIdentifierTest, aNumberThatIsNoneReadsAs0WhichFailsInThePathLookup) {
    for (const std::string_view text : {"fid=abc", "fid=", "fid=+-5", "fid=+"}) {
        EXPECT_EQ(fileURLWithItemIdentifier(platform_, text), std::nullopt);
    }
    EXPECT_EQ(fake_.sink->count("[DEBUG] can't resolve path matching file ID \"0\"; " +
                                std::to_string(ENOENT)),
              4U);
}

TEST_F(MRFileObjectIdentifierTest, theLeadingDigitsCount) {
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "fid=77"), URL::fileURL("/storage/found"));
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "fid=+77abc"), URL::fileURL("/storage/found"));
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "fid=-77"), std::nullopt);
    EXPECT_EQ(lines(), Lines{"[DEBUG] can't resolve path matching file ID \"-77\"; " +
                             std::to_string(ENOENT)});
}

TEST_F(MRFileObjectIdentifierTest, aNumberTooLargeIsTheLargest) {
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "fid=99999999999999999999"), std::nullopt);
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "fid=-99999999999999999999"), std::nullopt);
    EXPECT_EQ(lines(),
              (Lines{"[DEBUG] can't resolve path matching file ID \"9223372036854775807\"; 2",
                     "[DEBUG] can't resolve path matching file ID \"-9223372036854775808\"; 2"}));
}

TEST_F(MRFileObjectIdentifierTest, aStorageRootWithoutADeviceYieldsNilAndALine) {
    fake_.fileSystem.openFault = [](const URL&) { return errorWithPOSIXCode(EACCES); };
    const Lines line{"[ERROR] can't get device ID for \"/storage\"; " + std::to_string(EACCES)};
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "fid=77"), std::nullopt);
    EXPECT_EQ(lines(), line);
    fake_.sink->clear();
    EXPECT_EQ(fileURLWithFileIdentifier(platform_, FileID{77}), std::nullopt);
    EXPECT_EQ(lines(), line);
}

TEST_F(MRFileObjectIdentifierTest, theDeviceOfAURLComesWithAPOSIXErrorWithoutUserInfo) {
    attributes_ = CommonAttributes{
        .device = DeviceID{9}, .type = FileType::regular, .documentID = {}, .fileID = {}};
    EXPECT_EQ(deviceIDWithError(platform_, URL::fileURL("/x")), DeviceID{9});
    EXPECT_EQ(deviceID(platform_, URL::fileURL("/x")), DeviceID{9});
    fake_.fileSystem.openFault = [](const URL& url) {
        return errorWithPOSIXCode(ENOENT, "open", url.path());
    };
    const auto device = deviceIDWithError(platform_, URL::fileURL("/x"));
    ASSERT_FALSE(device);
    EXPECT_EQ(device.error(), errorWithPOSIXCode(ENOENT));
    EXPECT_TRUE(device.error().operation.empty() && device.error().subject.empty());
    EXPECT_EQ(deviceID(platform_, URL::fileURL("/x")), DeviceID{});
    EXPECT_TRUE(lines().empty());
}

class DocumentResolutionTest : public MRFileObjectIdentifierTest {};

TEST_F(DocumentResolutionTest, aFileIdentifierResolvesOnTheStorageRootsVolume) {
    EXPECT_EQ(fileURLWithFileIdentifier(platform_, FileID{77}), URL::fileURL("/storage/found"));
}

TEST_F(DocumentResolutionTest, resolvesThroughTheStore) {
    fake_.store.resolutions = {FileID{77}};
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "did=5"), URL::fileURL("/storage/found"));
}

TEST_F(DocumentResolutionTest, succeedsUpToTheFifthRetryOfTransientErrors) {
    fake_.store.resolutions = {posix(EAGAIN), posix(EBUSY), posix(ESTALE),
                               posix(EAGAIN), posix(EBUSY), FileID{77}};
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "did=5"), URL::fileURL("/storage/found"));
    EXPECT_EQ(fake_.store.resolveCalls(), 6);
    const auto text = [](int code) {
        return "[DEBUG] doc ID resolution failed with errno(" + std::to_string(code) +
               "), let's try again after resting";
    };
    EXPECT_EQ(lines(), (Lines{text(EAGAIN), text(EBUSY), text(ESTALE), text(EAGAIN), text(EBUSY)}));
}

TEST_F(DocumentResolutionTest, givesUpAfterTheFifthRetry) {
    fake_.store.resolutions = {posix(ESTALE)};
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "did=5"), std::nullopt);
    EXPECT_EQ(fake_.store.resolveCalls(), 6);
    EXPECT_EQ(lines().back(), "[DEBUG] can't resolve doc ID \"5\" after five attempts");
    EXPECT_EQ(fake_.sink->countOfLevel(LogLevel::error), 0U);
}

TEST_F(DocumentResolutionTest, anyOtherErrnoFailsAtOnce) {
    fake_.store.resolutions = {posix(ENOENT)};
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "did=5"), std::nullopt);
    EXPECT_EQ(fake_.store.resolveCalls(), 1);
    EXPECT_EQ(lines(), Lines{"[ERROR] can't resolve doc ID \"5\"; 2"});
}

TEST_F(DocumentResolutionTest, anotherErrnoAfterTransientOnesEndsTheTries) {
    fake_.store.resolutions = {posix(EAGAIN), posix(EIO)};
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "did=5"), std::nullopt);
    EXPECT_EQ(fake_.store.resolveCalls(), 2);
    EXPECT_EQ(lines().back(), "[ERROR] can't resolve doc ID \"5\"; " + std::to_string(EIO));
}

TEST_F(DocumentResolutionTest, aNumberNoDocumentCanHaveIsNeverAnothersAfterCutting) {
    fake_.store.resolutions = {FileID{77}};
    for (const std::string_view text : {"did=4294967301", "did=-5", "did=0", "did=abc"}) {
        EXPECT_EQ(fileURLWithItemIdentifier(platform_, text), std::nullopt) << text;
    }
    EXPECT_EQ(fake_.store.resolveCalls(), 0);
    EXPECT_EQ(fake_.sink->count("[ERROR] can't resolve doc ID \"4294967301\"; 2"), 1U);
}

TEST_F(DocumentResolutionTest, aStoreThatAnswersFile0HasNone) {
    fake_.store.resolutions = {FileID{}};
    EXPECT_EQ(fileURLWithItemIdentifier(platform_, "did=5"), std::nullopt);
    EXPECT_EQ(lines(), Lines{"[ERROR] can't resolve doc ID \"5\"; 2"});
}

}  // namespace
}  // namespace marrowdale
