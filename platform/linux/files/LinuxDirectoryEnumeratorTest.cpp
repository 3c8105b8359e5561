#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <map>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <unistd.h>

#include "platform/linux/files/WalkTest.h"

namespace marrowdale::native {
namespace {

class LinuxDirectoryEnumeratorTest : public WalkTest {};
INSTANTIATE_TEST_SUITE_P(OnEach, LinuxDirectoryEnumeratorTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(LinuxDirectoryEnumeratorTest, emptyFolderHandsOutNothingAndIsAtItsEnd) {
    std::vector<URL> urls;
    const auto walking = walk(request(deep));
    EXPECT_EQ(*walking->next(200, urls), 0U);
    EXPECT_TRUE(urls.empty());
    EXPECT_TRUE(walking->position().atEnd);
    EXPECT_EQ(*walking->skip(5), 0U);
}

TEST_P(LinuxDirectoryEnumeratorTest, limitOfZeroHandsOutNothing) {
    file("a");
    std::vector<URL> urls;
    const auto walking = walk(request(deep));
    EXPECT_EQ(*walking->next(0, urls), 0U);
    EXPECT_EQ(*walking->next(10, urls), 1U);
}

TEST_P(LinuxDirectoryEnumeratorTest, flatWalkShowsNoSubfoldersContents) {
    file("a");
    file(".hidden");
    folder("sub/below");
    file("sub/b");
    EXPECT_EQ(list(flat), (Names{"a", "sub"}));
}

TEST_P(LinuxDirectoryEnumeratorTest, deepWalkShowsEachEntryThenWhatIsInIt) {
    file("a");
    folder("sub/below");
    file("sub/below/c");
    folder(".trash/x");
    folder("book.bundle");
    file("book.bundle/inside");
    std::vector<std::string> order;
    for (const URL& url : listURLs(deep, 1)) {
        order.push_back(relative(url));
    }
    const auto place = [&](const std::string& name) {
        return std::ranges::find(order, name) - order.begin();
    };
    EXPECT_EQ(Names(order.begin(), order.end()),
              (Names{"a", "sub", "sub/below", "sub/below/c", "book.bundle"}));
    EXPECT_LT(place("sub"), place("sub/below"));
    EXPECT_LT(place("sub/below"), place("sub/below/c"));
}

TEST_P(LinuxDirectoryEnumeratorTest, optionsShowHiddenEntriesAndPackageContents) {
    folder("book.BUNDLE");
    file("book.BUNDLE/.inside");
    folder(".bundle");
    file(".bundle/x");
    EXPECT_EQ(list({}), (Names{"book.BUNDLE", "book.BUNDLE/.inside", ".bundle", ".bundle/x"}));
    DirectoryEnumerationOptions packagesClosed;
    packagesClosed.skipPackageDescendants = true;
    EXPECT_EQ(list(packagesClosed), (Names{"book.BUNDLE", ".bundle", ".bundle/x"}));
}

TEST_P(LinuxDirectoryEnumeratorTest, bringsValuesAlong) {
    file("report.pdf", "12345");
    const URL url = listed("report.pdf");
    const auto value = [&](ResourceKey key) { return url.cachedResourceValue(key); };
    struct stat expected{};
    ASSERT_EQ(::stat(world_.at("report.pdf").c_str(), &expected), 0);
    EXPECT_EQ(value(ResourceKey::name), ResourceValue(std::string("report.pdf")));
    EXPECT_EQ(value(ResourceKey::localizedName), ResourceValue(std::string("report.pdf")));
    EXPECT_EQ(value(ResourceKey::typeIdentifier), ResourceValue(std::string("application/pdf")));
    EXPECT_EQ(value(ResourceKey::fileSize), ResourceValue(Number(std::uint64_t{5})));
    EXPECT_EQ(value(ResourceKey::contentModificationDate),
              ResourceValue(Date{expected.st_mtim.tv_sec,
                                 static_cast<std::uint32_t>(expected.st_mtim.tv_nsec)}));
    EXPECT_EQ(value(ResourceKey::fileID), ResourceValue(Number(std::uint64_t{expected.st_ino})));
    EXPECT_EQ(value(ResourceKey::isReadable), ResourceValue(true));
    EXPECT_EQ(value(ResourceKey::isWritable), ResourceValue(true));
    EXPECT_EQ(value(ResourceKey::isPackage), ResourceValue(false));
    EXPECT_EQ(value(ResourceKey::isDirectory), ResourceValue(false));
    EXPECT_EQ(value(ResourceKey::documentIdentifier), ResourceValue(Number(std::uint64_t{1})));
    ASSERT_TRUE(url.prefetched()->hasStatus);
    EXPECT_EQ(url.prefetched()->status.fileID, FileID{expected.st_ino});
    EXPECT_EQ(url.prefetched()->status.linkCount, 1U);
    EXPECT_FALSE(url.prefetched()->status.isDirectory);
}

TEST_P(LinuxDirectoryEnumeratorTest, listedValuesAreThoseThatALookAtTheItemBrings) {
    file("a.txt", "x");
    folder("sub/inner");
    folder("b.bundle");
    std::filesystem::create_symlink("a.txt", world_.at("link"));
    ASSERT_EQ(::mkfifo(world_.at("pipe").c_str(), 0600), 0);
    const std::vector<URL> urls = listURLs(flat);
    ASSERT_EQ(urls.size(), 5U);
    for (const URL& url : urls) {
        for (const ResourceKey key :
             {ResourceKey::name, ResourceKey::localizedName, ResourceKey::typeIdentifier,
              ResourceKey::fileSize, ResourceKey::creationDate,
              ResourceKey::contentModificationDate, ResourceKey::isReadable,
              ResourceKey::isWritable, ResourceKey::fileID, ResourceKey::isPackage,
              ResourceKey::documentIdentifier, ResourceKey::isDirectory}) {
            const URL fresh = URL::fileURL(url.path());
            const auto looked = world_.files.resourceValue(fresh, key);
            ASSERT_TRUE(looked) << looked.error().description();
            EXPECT_EQ(url.cachedResourceValue(key), *looked) << url.path() << " " << name(key);
        }
        const auto status = world_.files.status(URL::fileURL(url.path()));
        ASSERT_TRUE(status);
        EXPECT_EQ(status->linkCount, url.prefetched()->status.linkCount) << url.path();
        EXPECT_EQ(status->fileID, url.prefetched()->status.fileID);
    }
}

TEST_P(LinuxDirectoryEnumeratorTest, keysNotAskedForAreNotAnswered) {
    file("a");
    auto wanted = request(flat);
    wanted.keys = {ResourceKey::fileSize};
    wanted.attributeNames.clear();
    wanted.prefetchStatus = false;
    std::vector<URL> urls;
    ASSERT_EQ(*walk(wanted)->next(10, urls), 1U);
    EXPECT_TRUE(urls[0].cachedResourceValue(ResourceKey::fileSize));
    EXPECT_FALSE(urls[0].cachedResourceValue(ResourceKey::isWritable));
    EXPECT_FALSE(urls[0].prefetched()->hasStatus);
    EXPECT_EQ(urls[0].prefetched()->attributes, nullptr);
    EXPECT_EQ(world_.documents.assignCalls(), 0);
}

TEST_P(LinuxDirectoryEnumeratorTest, kindsHaveTheirTypesAndAreNeverOpened) {
    folder("plain");
    folder("b.bundle");
    folder("c.pdf.package");
    std::filesystem::create_symlink("nowhere", world_.at("dangling.pdf"));
    ASSERT_EQ(::mkfifo(world_.at("pipe.txt").c_str(), 0600), 0);
    const int maker = ::socket(AF_UNIX, SOCK_STREAM, 0);
    const UniqueFD socket(maker);
    const UniqueFD parent(::open(world_.folder.path().c_str(), O_PATH));
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    const std::string name = world_.at("socket");
    ASSERT_LT(name.size(), sizeof address.sun_path);
    name.copy(address.sun_path, name.size());
    ASSERT_EQ(::bind(maker, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    std::map<std::string, std::string> types;
    for (const URL& url : listURLs(flat)) {
        types[relative(url)] = url.prefetched()->typeIdentifier;
        EXPECT_EQ(raw(url.prefetched()->documentIdentifier) == 0, relative(url) == "plain");
    }
    const std::map<std::string, std::string> expected{
        {"plain", "inode/directory"},
        {"b.bundle", std::string(world_.types.typeForName("b.bundle"))},
        {"c.pdf.package", std::string(world_.types.typeForName("c.pdf.package"))},
        {"dangling.pdf", "inode/symlink"},
        {"pipe.txt", "inode/fifo"},
        {"socket", "inode/socket"}};
    EXPECT_EQ(types, expected);
}

TEST_P(LinuxDirectoryEnumeratorTest, devicesAreEntriesOfTheirKind) {
    if (::mknod(world_.at("null").c_str(), S_IFCHR | 0600, makedev(1, 3)) != 0 ||
        ::mknod(world_.at("loop").c_str(), S_IFBLK | 0600, makedev(7, 0)) != 0) {
        MARROWDALE_SKIP_FOR_USER("only root may make device files");
    }
    EXPECT_EQ(listed("null").prefetched()->typeIdentifier, "inode/chardevice");
    EXPECT_EQ(listed("loop").prefetched()->typeIdentifier, "inode/blockdevice");
}

TEST_P(LinuxDirectoryEnumeratorTest, folderHasNeitherSizeNorDocumentIdentifier) {
    folder("sub");
    const URL url = listed("sub");
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::fileSize), ResourceValue());
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::documentIdentifier), ResourceValue());
    EXPECT_TRUE(world_.documents.told().empty());
}

TEST_P(LinuxDirectoryEnumeratorTest, namesAreBytes) {
    const std::vector<std::string> hostile{
        "new\nline", "esc\x1b[31m", "\xff\xfe broken", "-rf", std::string(255, 'n'), " ", "%41",
        "\xc3\xa9",  "e\xcc\x81",   "back\\slash",     "*?["};
    for (const std::string& name : hostile) {
        file(name);
    }
    EXPECT_EQ(list(deep, 3), Names(hostile.begin(), hostile.end()));
}

TEST_P(LinuxDirectoryEnumeratorTest, oneAssignmentABatchOverAllItsFolders) {
    for (int i = 0; i < 5; ++i) {
        folder("sub" + std::to_string(i));
        for (int j = 0; j < 4; ++j) {
            file("sub" + std::to_string(i) + "/file" + std::to_string(j));
        }
    }
    std::vector<URL> urls;
    const auto walking = walk(request(deep));
    ASSERT_EQ(*walking->next(25, urls), 25U);
    EXPECT_EQ(world_.documents.assignCalls(), 1);
    const auto told = world_.documents.told();
    ASSERT_EQ(told.size(), 20U);
    for (const auto& one : told) {
        struct stat parent{};
        ASSERT_EQ(::stat(one.folderPath.c_str(), &parent), 0);
        EXPECT_EQ(raw(one.folder), parent.st_ino);
        const URL url = URL::fileURL(one.folderPath + "/" + one.name);
        const auto match = std::ranges::find(urls, url);
        ASSERT_NE(match, urls.end());
        EXPECT_EQ(match->prefetched()->documentIdentifier, one.document);
        EXPECT_EQ(match->prefetched()->fileID, one.status.fileID);
        // The parent is the folder's own object, values and all.
        EXPECT_TRUE(match->deletingLastPathComponent().cachedResourceValue(ResourceKey::fileID));
    }
}

TEST_P(LinuxDirectoryEnumeratorTest, nothingIsHandedOutWhenIdentifiersCannotBeMadeDurable) {
    file("a");
    world_.documents.failWith(errorWithPOSIXCode(ENOSPC, "write", "store"));
    std::vector<URL> urls;
    const auto walking = walk(request(flat));
    EXPECT_EQ(walking->next(10, urls).error().code, ENOSPC);
    EXPECT_TRUE(urls.empty());
    world_.documents.failWith(std::nullopt);
    EXPECT_FALSE(walking->next(10, urls));
}

TEST_P(LinuxDirectoryEnumeratorTest, thousandsOfLevelsNeedFewDescriptors) {
    constexpr int levels = 3000;
    UniqueFD at(::open(world_.folder.path().c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    for (int i = 0; i < levels; ++i) {
        ASSERT_TRUE(at);
        ASSERT_EQ(::mkdirat(at.get(), "d", 0700), 0);
        ASSERT_EQ(::mkdirat(at.get(), "e", 0700), 0);
        at.reset(::openat(at.get(), "d", O_PATH | O_DIRECTORY | O_CLOEXEC));
    }
    std::vector<URL> urls;
    const auto walking = walk(request(deep));
    std::uint64_t walked = 0;
    std::size_t most = 0;
    while (true) {
        const auto got = walking->next(500, urls);
        ASSERT_TRUE(got) << got.error().description();
        walked += *got;
        most = std::max<std::size_t>(
            most, static_cast<std::size_t>(
                      std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {})));
        if (*got < 500) {
            break;
        }
    }
    EXPECT_EQ(walked, 2U * levels);
    EXPECT_EQ(urls.size(), 2U * levels);
    EXPECT_LT(most, 100U);
    EXPECT_EQ(*walk(request(deep))->skip(10000), 2U * levels);
    // And an item at the bottom can be looked at by its own path, longer than one call takes.
    const auto deepest =
        std::ranges::max_element(urls, {}, [](const URL& url) { return url.path().size(); });
    ASSERT_GT(deepest->path().size(), 4096U);
    const URL fresh = URL::fileURL(deepest->path());
    EXPECT_EQ(*world_.files.resourceValue(fresh, ResourceKey::isWritable), ResourceValue(true));
    EXPECT_TRUE(world_.files.status(fresh));
    EXPECT_EQ(world_.attributes.size(fresh, "one").has_value(), false);
}

}  // namespace
}  // namespace marrowdale::native
