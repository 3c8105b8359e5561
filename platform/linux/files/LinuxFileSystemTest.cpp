#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include "platform/linux/files/EntryValues.h"
#include "platform/linux/files/LinuxFileSystem.h"
#include "platform/linux/files/LinuxFilesTestWorld.h"
#include "platform/testing/ScopedMount.h"

namespace marrowdale::native {
namespace {

TEST(EntryValuesTest, linkCountsOfFoldersStayWithinBounds) {
    FakeDocumentIndex documents;
    EntryStatus status;
    status.fileID = FileID{5};
    status.mode = S_IFDIR | 0700;
    const auto linksWhen = [&](std::uint32_t reported, std::uint32_t known) {
        status.linkCount = reported;
        documents.setSubfolderCount(FileID{5}, known);
        return fileStatusOf(status, documents).linkCount;
    };
    EXPECT_EQ(linksWhen(5, 100), 5U);
    EXPECT_EQ(linksWhen(1, 0), 2U);
    EXPECT_EQ(linksWhen(1, 3), 5U);
    EXPECT_EQ(linksWhen(1, 65535), 65537U);
    EXPECT_EQ(linksWhen(1, 0xFFFFFFFFU), 65537U);
    EXPECT_EQ(linksWhen(0, 9), 2U);
    EXPECT_EQ(linksWhen(0xFFFFFFFFU, 0), 65537U);
    status.mode = S_IFREG | 0600;
    EXPECT_EQ(linksWhen(1, 3), 1U);
}

class LinuxFileSystemTest : public OnEachFileSystem {};
INSTANTIATE_TEST_SUITE_P(OnEach, LinuxFileSystemTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(LinuxFileSystemTest, missingItemIsTheFileDomainsError) {
    for (const char* name : {"none", "none/below"}) {
        const auto value = world_.files.resourceValue(world_.url(name), ResourceKey::fileID);
        ASSERT_FALSE(value);
        EXPECT_EQ(value.error().domain, ErrorDomain::file);
        EXPECT_EQ(value.error().code, 260);
        EXPECT_EQ(value.error().subject, world_.at(name));
    }
    writeFile(world_.at("file"), "");
    const auto below = world_.files.resourceValue(world_.url("file/below"), ResourceKey::name);
    EXPECT_EQ(below.error().domain, ErrorDomain::file);
}

TEST_P(LinuxFileSystemTest, oneLookCachesWhatItBrought) {
    writeFile(world_.at("a.pdf"), "123");
    const URL url = world_.url("a.pdf");
    ASSERT_TRUE(world_.files.resourceValue(url, ResourceKey::fileSize));
    std::filesystem::remove(world_.at("a.pdf"));
    EXPECT_EQ(*world_.files.resourceValue(url, ResourceKey::fileSize),
              ResourceValue(Number(std::uint64_t{3})));
    EXPECT_EQ(*world_.files.resourceValue(url, ResourceKey::typeIdentifier),
              ResourceValue(std::string("application/pdf")));
    EXPECT_FALSE(world_.files.resourceValue(world_.url("a.pdf"), ResourceKey::fileSize));
    EXPECT_EQ(world_.documents.assignCalls(), 0);
}

TEST_P(LinuxFileSystemTest, aLookBringsAllOfOneMoment) {
    makeFolder(world_.at("folder"));
    makeFolder(world_.at("folder/below"));
    ASSERT_EQ(::setxattr(world_.at("folder").c_str(), "user.tag", "red", 3, 0), 0);
    const ResourceKeySet keys{ResourceKey::typeIdentifier, ResourceKey::isWritable,
                              ResourceKey::contentModificationDate,
                              ResourceKey::documentIdentifier};
    const std::vector<std::string> names{"tag", "other"};
    const URL plain = world_.url("folder");
    const URL looked = world_.files.lookedAt(plain, keys, names);
    EXPECT_EQ(looked, plain);
    const PrefetchedValues* const values = looked.prefetched();
    ASSERT_NE(values, nullptr);
    EXPECT_FALSE(values->known.contains(ResourceKey::documentIdentifier));
    for (const ResourceKey key : {ResourceKey::typeIdentifier, ResourceKey::isWritable,
                                  ResourceKey::contentModificationDate}) {
        EXPECT_EQ(*world_.files.resourceValue(looked, key),
                  *world_.files.resourceValue(plain, key));
    }
    std::filesystem::remove_all(world_.at("folder"));
    ASSERT_TRUE(world_.files.status(looked));
    EXPECT_TRUE(world_.files.status(looked)->isDirectory);
    ASSERT_NE(values->attributes, nullptr);
    EXPECT_EQ(**values->attributes->value("tag"), Data::fromText("red"));
    EXPECT_EQ(*values->attributes->value("other"), std::nullopt);
    EXPECT_EQ(*world_.files.resourceValue(looked, ResourceKey::typeIdentifier),
              ResourceValue(std::string("inode/directory")));
}

TEST_P(LinuxFileSystemTest, aLookSeesAttributesThatChanged) {
    makeFolder(world_.at("folder"));
    const std::vector<std::string> names{"tag"};
    for (const std::string tag : {"red", "blue"}) {
        ASSERT_EQ(::setxattr(world_.at("folder").c_str(), "user.tag", tag.data(), tag.size(), 0),
                  0);
        const URL looked = world_.files.lookedAt(world_.url("folder"), {}, names);
        EXPECT_EQ(**looked.prefetched()->attributes->value("tag"), Data::fromText(tag));
    }
}

TEST_P(LinuxFileSystemTest, aLookAtNothingAndAtALinkBringsNothing) {
    std::filesystem::create_symlink("none", world_.at("link"));
    for (const char* name : {"none", "link"}) {
        EXPECT_EQ(world_.files.lookedAt(world_.url(name), {ResourceKey::fileSize}, {}).prefetched(),
                  nullptr)
            << name;
    }
}

TEST_P(LinuxFileSystemTest, documentIdentifierIsGivenOutOnceAndLasts) {
    writeFile(world_.at("a"), "");
    const auto first = world_.files.resourceValue(world_.url("a"), ResourceKey::documentIdentifier);
    std::filesystem::rename(world_.at("a"), world_.at("b"));
    const auto second =
        world_.files.resourceValue(world_.url("b"), ResourceKey::documentIdentifier);
    ASSERT_TRUE(first && second);
    EXPECT_EQ(*first, *second);
    const auto told = world_.documents.told();
    ASSERT_EQ(told.size(), 2U);
    EXPECT_EQ(told[1].name, "b");
    EXPECT_EQ(told[1].folderPath, world_.folder.path());
    struct stat parent{};
    ASSERT_EQ(::stat(world_.folder.path().c_str(), &parent), 0);
    EXPECT_EQ(raw(told[1].folder), parent.st_ino);
    world_.documents.failWith(errorWithPOSIXCode(ENOSPC));
    EXPECT_EQ(
        world_.files.resourceValue(world_.url("b"), ResourceKey::documentIdentifier).error().code,
        ENOSPC);
}

TEST_P(LinuxFileSystemTest, linkIsLookedAtItselfButItsStatusIsTheTargets) {
    makeFolder(world_.at("real"));
    std::filesystem::create_directory_symlink("real", world_.at("link"));
    std::filesystem::create_symlink("nowhere", world_.at("dangling"));
    EXPECT_EQ(*world_.files.resourceValue(world_.url("link"), ResourceKey::isDirectory),
              ResourceValue(false));
    EXPECT_TRUE(world_.files.status(world_.url("link"))->isDirectory);
    EXPECT_EQ(world_.files.status(world_.url("dangling")).error().code, ENOENT);
    EXPECT_TRUE(world_.files.resourceValue(world_.url("dangling"), ResourceKey::fileSize));
    EXPECT_FALSE(world_.files.status(*URL::fromAbsoluteString("https://example.org/")));
}

TEST_P(LinuxFileSystemTest, folderWithThreeSubfoldersHasFiveLinks) {
    for (const char* name : {"f/a", "f/b", "f/c"}) {
        makeFolder(world_.at(name));
    }
    writeFile(world_.at("f/file"), "");
    struct stat folder{};
    ASSERT_EQ(::stat(world_.at("f").c_str(), &folder), 0);
    world_.documents.setSubfolderCount(FileID{folder.st_ino}, 3);
    EXPECT_EQ(world_.files.status(world_.url("f"))->linkCount, 5U);
}

TEST_P(LinuxFileSystemTest, opensForEventsTheItemItself) {
    std::filesystem::create_symlink("nowhere", world_.at("link"));
    ASSERT_EQ(::mkfifo(world_.at("pipe").c_str(), 0600), 0);
    writeFile(world_.at("file"), "");
    makeFolder(world_.at("folder"));
    const auto typeOf = [&](const char* name) {
        const auto file = world_.files.openForEvents(world_.url(name));
        EXPECT_TRUE(file) << name;
        return world_.files.commonAttributes(**file)->type;
    };
    EXPECT_EQ(typeOf("link"), FileType::symbolicLink);
    EXPECT_EQ(typeOf("pipe"), FileType::other);
    EXPECT_EQ(typeOf("file"), FileType::regular);
    EXPECT_EQ(typeOf("folder"), FileType::directory);
    EXPECT_EQ(world_.files.openForEvents(world_.url("none")).error().code, ENOENT);
    // Not for reading, and not inherited by programs.
    const auto file = world_.files.openForEvents(world_.url("file"));
    EXPECT_TRUE((::fcntl((*file)->descriptor(), F_GETFL) & O_PATH) != 0);
    EXPECT_TRUE((::fcntl((*file)->descriptor(), F_GETFD) & FD_CLOEXEC) != 0);
}

TEST_P(LinuxFileSystemTest, commonAttributesNameTheDocumentThatIsKnown) {
    writeFile(world_.at("file"), "");
    const auto file = world_.files.openForEvents(world_.url("file"));
    EXPECT_EQ(world_.files.commonAttributes(**file)->documentID, DocumentID{0});
    ASSERT_TRUE(world_.files.resourceValue(world_.url("file"), ResourceKey::documentIdentifier));
    EXPECT_EQ(world_.files.commonAttributes(**file)->documentID, DocumentID{1});
    struct stat expected{};
    ASSERT_EQ(::stat(world_.at("file").c_str(), &expected), 0);
    EXPECT_EQ(world_.files.commonAttributes(**file)->fileID, FileID{expected.st_ino});
    EXPECT_EQ(world_.files.commonAttributes(**file)->device,
              world_.files.status(world_.url("file"))->device);
}

TEST_P(LinuxFileSystemTest, makesFoldersWithThoseAbove) {
    ASSERT_TRUE(world_.files.createDirectory(world_.url("a/b/c")));
    ASSERT_TRUE(world_.files.createDirectory(world_.url("a/b/c")));
    EXPECT_TRUE(std::filesystem::is_directory(world_.at("a/b/c")));
    writeFile(world_.at("file"), "");
    EXPECT_EQ(world_.files.createDirectory(world_.url("file")).error().code, EEXIST);
    EXPECT_EQ(world_.files.createDirectory(world_.url("file/x")).error().code, ENOTDIR);
}

TEST_P(LinuxFileSystemTest, pathsComeFromTheIndex) {
    world_.documents.setPath(DeviceID{1}, FileID{2}, "/a");
    EXPECT_EQ(*world_.files.pathForFileID(DeviceID{1}, FileID{2}), "/a");
    EXPECT_EQ(world_.files.pathForFileID(DeviceID{1}, FileID{3}).error().code, ENOENT);
}

TEST_P(LinuxFileSystemTest, nothingIsWritableOnAReadOnlyMount) {
    makeFolder(world_.at("mount"));
    writeFile(world_.at("file"), "");
    const std::string mount = world_.at("mount");
    const ScopedMount bound = ScopedMount::bind(world_.folder.path(), mount);
    if (!bound) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    ASSERT_EQ(::mount(nullptr, mount.c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr),
              0);
    // The root of a tree may be a mount; only below it mounts are left out.
    LinuxFilesServices services(world_, {mount}, {});
    EXPECT_EQ(*services.files.resourceValue(world_.url("mount/file"), ResourceKey::isWritable),
              ResourceValue(false));
    std::vector<URL> urls;
    {
        const auto walk = services.files.enumerateDirectory({.url = world_.url("mount"),
                                                             .keys = everyKey,
                                                             .attributeNames = {},
                                                             .options = {},
                                                             .position = {},
                                                             .errorHandler = {}});
        EXPECT_TRUE(walk && (*walk)->next(10, urls));
    }
    ASSERT_EQ(urls.size(), 2U);
    for (const URL& url : urls) {
        EXPECT_FALSE(url.prefetched()->isWritable);
        EXPECT_TRUE(url.prefetched()->isReadable);
    }
    const auto opened = services.writeAccess.openForWriting(world_.url("mount/file"));
    ASSERT_FALSE(opened);
    EXPECT_EQ(opened.error(), errorFileWriteNoPermission());
}

}  // namespace
}  // namespace marrowdale::native
