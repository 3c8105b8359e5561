#include <cerrno>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

#include "platform/linux/files/WalkTest.h"
#include "platform/testing/ScopedMount.h"

namespace marrowdale::native {
namespace {

class ItemLooksTest : public WalkTest {
  protected:
    std::vector<Expected<URL>> lookAt(const std::vector<URL>& urls) {
        return lookAt(world_.files, urls);
    }
    static std::vector<Expected<URL>> lookAt(LinuxFileSystem& files, const std::vector<URL>& urls) {
        return files.lookAt(urls, {.keys = everyKey, .attributeNames = {"one", "two"}});
    }
    Expected<URL> lookAt(std::string_view name) { return lookAt(world_.files, name); }
    Expected<URL> lookAt(LinuxFileSystem& files, std::string_view name) {
        return std::move(lookAt(files, std::vector{world_.url(name)}).front());
    }
    // That nothing stands there, as far as anybody is told.
    static void expectMissing(const Expected<URL>& look, const std::string& path) {
        ASSERT_FALSE(look) << path;
        EXPECT_EQ(look.error().domain, ErrorDomain::file);
        EXPECT_EQ(look.error().code, 260);
        EXPECT_EQ(look.error().subject, path);
    }
    static void expectSame(const URL& listed, const URL& looked) {
        const std::string& path = listed.path();
        EXPECT_EQ(looked, listed);
        for (std::size_t i = 0; i < resourceKeyCount; ++i) {
            const auto key = static_cast<ResourceKey>(i);
            EXPECT_EQ(looked.cachedResourceValue(key), listed.cachedResourceValue(key))
                << path << " " << name(key);
        }
        const PrefetchedValues& ours = *looked.prefetched();
        const PrefetchedValues& theirs = *listed.prefetched();
        EXPECT_EQ(ours.hasStatus, theirs.hasStatus) << path;
        EXPECT_EQ(ours.status.fileID, theirs.status.fileID) << path;
        EXPECT_EQ(ours.status.device, theirs.status.device) << path;
        EXPECT_EQ(ours.status.linkCount, theirs.status.linkCount) << path;
        EXPECT_EQ(ours.status.isDirectory, theirs.status.isDirectory) << path;
        for (const char* attribute : {"one", "two"}) {
            EXPECT_EQ(ours.attributes->value(attribute).value(),
                      theirs.attributes->value(attribute).value())
                << path << " " << attribute;
        }
    }
    void needAttributes() {
        if (!keepsUserAttributes(world_.folder.path())) {
            MARROWDALE_SKIP("the file system keeps no user attributes");
        }
    }
};
INSTANTIATE_TEST_SUITE_P(OnEach, ItemLooksTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(ItemLooksTest, aLookBringsWhatAListingBrings) {
    folder("plain/sub");
    folder("book.bundle");
    file("plain/file.txt", "12345");
    file("no access");
    file("odd \n\xff name.pdf", "1");
    ASSERT_EQ(::chmod(world_.at("no access").c_str(), 0), 0);
    ASSERT_EQ(::mkfifo(world_.at("pipe").c_str(), 0600), 0);
    std::filesystem::create_directory_symlink("plain", world_.at("link"));
    std::filesystem::create_symlink("nowhere", world_.at("dangling"));
    if (keepsUserAttributes(world_.folder.path())) {
        setAttribute(world_.at("plain/file.txt"), "user.one", "1");
        setAttribute(world_.at("plain"), "user.two", std::string_view("\0\xff", 2));
    }
    const std::vector<URL> listed = listURLs(deep);
    ASSERT_EQ(listed.size(), 9U);
    const auto looked = lookAt(listed);
    ASSERT_EQ(looked.size(), listed.size());
    for (std::size_t i = 0; i < listed.size(); ++i) {
        ASSERT_TRUE(looked[i]) << listed[i].path() << looked[i].error().description();
        expectSame(listed[i], *looked[i]);
        // Alone it is the same.
        expectSame(listed[i], lookAt(std::vector{listed[i]}).front().value());
    }
}

TEST_P(ItemLooksTest, nothingIsAskedAgainOfWhatWasLookedAt) {
    folder("f");
    file("f/a.pdf", "123");
    const auto look = lookAt("f/a.pdf");
    std::filesystem::remove_all(world_.at("f"));
    EXPECT_EQ(*world_.files.resourceValue(*look, ResourceKey::fileSize),
              ResourceValue(Number(std::uint64_t{3})));
    EXPECT_EQ(*world_.files.resourceValue(*look, ResourceKey::typeIdentifier),
              ResourceValue(std::string("application/pdf")));
    EXPECT_TRUE(world_.files.status(*look));
    EXPECT_EQ(world_.attributes.size(*look, "one").error().code, ENODATA);
    expectMissing(lookAt("f/a.pdf"), world_.at("f/a.pdf"));
}

TEST_P(ItemLooksTest, theFoldersNumberComesWithItsURL) {
    folder("f");
    file("f/a");
    folder("book.bundle/inside");
    struct stat status{};
    ASSERT_EQ(::stat(world_.at("f").c_str(), &status), 0);
    const URL parent = lookAt("f/a")->deletingLastPathComponent();
    EXPECT_EQ(parent, world_.url("f"));
    EXPECT_EQ(parent.cachedResourceValue(ResourceKey::fileID),
              ResourceValue(Number(std::uint64_t{status.st_ino})));
    EXPECT_EQ(parent.cachedResourceValue(ResourceKey::isDirectory), ResourceValue(true));
    EXPECT_EQ(parent.cachedResourceValue(ResourceKey::isPackage), ResourceValue(false));
    EXPECT_EQ(parent.cachedResourceValue(ResourceKey::contentModificationDate), std::nullopt);
    EXPECT_EQ(lookAt("f")->deletingLastPathComponent().path(), world_.folder.path());
}

TEST_P(ItemLooksTest, answersComeInTheOrderOfTheURLsWhateverFolderTheyLieIn) {
    std::vector<URL> urls;
    for (int i = 0; i < 300; ++i) {
        const std::string inside = "f" + std::to_string(i % 40);
        folder(inside);
        const std::string name = inside + "/" + std::to_string(i);
        if (i % 7 != 0) {
            file(name, std::string(static_cast<std::size_t>(i), 'x'));
        }
        urls.push_back(world_.url(name));
    }
    const auto looks = lookAt(urls);
    ASSERT_EQ(looks.size(), urls.size());
    for (std::size_t i = 0; i < urls.size(); ++i) {
        if (i % 7 == 0) {
            expectMissing(looks[i], urls[i].path());
        } else {
            EXPECT_EQ(*looks[i], urls[i]);
            EXPECT_EQ(looks[i]->prefetched()->fileSize, i);
            EXPECT_NE(looks[i]->prefetched()->documentIdentifier, DocumentID{});
        }
    }
    EXPECT_EQ(world_.documents.assignCalls(), 1) << "each is a sync of the disk";
    for (const FakeDocumentIndex::Told& told : world_.documents.told()) {
        struct stat status{};
        ASSERT_EQ(::stat(told.folderPath.c_str(), &status), 0);
        EXPECT_EQ(raw(told.folder), status.st_ino);
        EXPECT_TRUE(std::filesystem::exists(told.folderPath + "/" + told.name));
    }
}

TEST_P(ItemLooksTest, theSameURLTwiceHasTwoAnswers) {
    file("a");
    const auto looks = lookAt({world_.url("a"), world_.url("a")});
    EXPECT_EQ(*looks[0], *looks[1]);
    EXPECT_TRUE(lookAt(std::vector<URL>{}).empty());
}

TEST_P(ItemLooksTest, whatWasCachedOnTheURLIsNotUsed) {
    file("a", "123");
    const URL url = world_.url("a");
    url.setCachedResourceValue(ResourceKey::fileSize, Number(std::uint64_t{9}));
    EXPECT_EQ(lookAt(std::vector{url}).front()->cachedResourceValue(ResourceKey::fileSize),
              ResourceValue(Number(std::uint64_t{3})));
}

TEST_P(ItemLooksTest, whatIsNotThereIsMissing) {
    file("file");
    for (const char* name : {"none", "none/below", "file/below"}) {
        expectMissing(lookAt(name), world_.at(name));
    }
}

// Whoever is told of it would never hear that it is gone, if nobody knew of it before.
TEST_P(ItemLooksTest, whatWentBeforeItHadADocumentIsMissing) {
    writeFile(world_.at("a"), "");
    writeFile(world_.at("b"), "");
    world_.documents.setGone("a");
    expectMissing(lookAt("a"), world_.at("a"));
    EXPECT_TRUE(lookAt("b"));
}

TEST_P(ItemLooksTest, aFolderThatWentBeforeItWasKnownIsMissing) {
    folder("a");
    folder("b");
    world_.documents.setGone("a");
    expectMissing(lookAt("a"), world_.at("a"));
    EXPECT_TRUE(lookAt("b"));
}

TEST_P(ItemLooksTest, whatCannotBeLookedAtIsAnotherError) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    folder("closed");
    file("closed/a");
    file("b");
    ASSERT_EQ(::chmod(world_.at("closed").c_str(), 0), 0);
    const auto looks = lookAt({world_.url("closed/a"), world_.url("b"), world_.url("closed")});
    ASSERT_EQ(::chmod(world_.at("closed").c_str(), 0700), 0);
    ASSERT_FALSE(looks[0]);
    EXPECT_EQ(looks[0].error().domain, ErrorDomain::posix);
    EXPECT_EQ(looks[0].error().code, EACCES);
    EXPECT_EQ(looks[0].error().subject, world_.at("closed/a"));
    EXPECT_TRUE(looks[1]);
    EXPECT_TRUE(looks[2]) << "its own folder can be searched";
}

TEST_P(ItemLooksTest, attributesOfAnyBytesAndSizesComeAlong) {
    needAttributes();
    file("a");
    std::string large(900, '\xfe');
    large[5] = '\0';
    setAttribute(world_.at("a"), "user.one", large);
    setAttribute(world_.at("a"), "user.two", "");
    const auto look = lookAt("a");
    const AttributeSet& attributes = *look->prefetched()->attributes;
    EXPECT_EQ((*attributes.value("one"))->text(), large);
    EXPECT_EQ((*attributes.value("two"))->size(), 0U);
    setAttribute(world_.at("a"), "user.two", "new");
    EXPECT_EQ((*lookAt("a")->prefetched()->attributes->value("two"))->text(), "new");
}

TEST_P(ItemLooksTest, aFileOfTwoNamesIsOneDocument) {
    folder("f");
    file("a");
    std::filesystem::create_hard_link(world_.at("a"), world_.at("f/b"));
    const auto looks = lookAt({world_.url("f/b"), world_.url("a")});
    EXPECT_EQ(looks[0]->prefetched()->documentIdentifier,
              looks[1]->prefetched()->documentIdentifier);
    EXPECT_EQ(looks[0]->prefetched()->status.linkCount, 2U);
}

TEST_P(ItemLooksTest, aFolderThatWasExchangedForALinkLeadsNowhere) {
    const TemporaryDirectory outside(GetParam().dir);
    makeFolder(outside.path("sub"));
    writeFile(outside.path("sub/secret"), "x");
    folder("p/sub");
    file("p/sub/secret");
    ASSERT_TRUE(lookAt("p/sub/secret"));
    std::filesystem::rename(world_.at("p"), world_.at("old"));
    std::filesystem::create_directory_symlink(outside.path(), world_.at("p"));
    for (const char* name : {"p/sub/secret", "p/sub"}) {
        expectMissing(lookAt(name), world_.at(name));
    }
    EXPECT_EQ(lookAt("p")->cachedResourceValue(ResourceKey::isDirectory), ResourceValue(false));
    EXPECT_EQ(world_.documents.told().back().name, "p") << "the link itself";
}

TEST_P(ItemLooksTest, otherFileSystemsInBetweenAreNotThere) {
    folder("mounted/below");
    file("mounted/below/own");
    const ScopedMount mounted = ScopedMount::memory(world_.at("mounted"));
    if (!mounted) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    makeFolder(world_.at("mounted/below"));
    writeFile(world_.at("mounted/below/own"), "x");
    for (const char* name : {"mounted", "mounted/below", "mounted/below/own"}) {
        expectMissing(lookAt(name), world_.at(name));
    }
}

TEST_P(ItemLooksTest, aFolderBoundToAnotherPlaceIsNotThere) {
    folder("real");
    file("real/file");
    folder("bound");
    const ScopedMount bound = ScopedMount::bind(world_.at("real"), world_.at("bound"));
    if (!bound) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    expectMissing(lookAt("bound"), world_.at("bound"));
    expectMissing(lookAt("bound/file"), world_.at("bound/file"));
    EXPECT_TRUE(lookAt("real/file"));
}

TEST_P(ItemLooksTest, privateFoldersAreNotThere) {
    folder("a/state");
    file("a/state/head");
    file("a/b");
    LinuxFilesServices services(world_, {world_.folder.path()}, {world_.at("a/state")});
    const auto looks = lookAt(
        services.files, {world_.url("a/state/head"), world_.url("a/state"), world_.url("a/b")});
    expectMissing(looks[0], world_.at("a/state/head"));
    expectMissing(looks[1], world_.at("a/state"));
    EXPECT_TRUE(looks[2]);
}

TEST_P(ItemLooksTest, aRootAndARootInsideAnotherAreLookedAtThemselves) {
    folder("inner/sub");
    file("a");
    LinuxFilesServices services(world_, {world_.folder.path(), world_.at("inner")}, {});
    const auto looks = lookAt(services.files, {world_.url(), world_.url("inner"), world_.url("a"),
                                               world_.url("inner/sub")});
    for (const auto& look : looks) {
        ASSERT_TRUE(look) << look.error().description();
    }
    EXPECT_EQ(*looks[1], world_.url("inner"));
    EXPECT_EQ(looks[1]->cachedResourceValue(ResourceKey::name),
              ResourceValue(std::string("inner")));
    EXPECT_TRUE(looks[0]->prefetched()->isDirectory);
    EXPECT_TRUE(looks[1]->prefetched()->isWritable);
    // The root's own path leads to another folder now.
    std::filesystem::rename(world_.at("inner"), world_.at("moved"));
    folder("inner/sub");
    const auto later = lookAt(services.files, {world_.url("inner/sub"), world_.url("a")});
    expectMissing(later[0], world_.at("inner/sub"));
    EXPECT_TRUE(later[1]);
}

TEST_P(ItemLooksTest, outsideTheServedTreesLinksAboveTheItemAreFollowed) {
    const TemporaryDirectory outside(GetParam().dir);
    makeFolder(outside.path("real"));
    writeFile(outside.path("real/a"), "12");
    std::filesystem::create_directory_symlink("real", outside.path("link"));
    const URL url = URL::fileURL(outside.path("link/a"));
    const auto look = std::move(lookAt(std::vector{url}).front());
    ASSERT_TRUE(look) << look.error().description();
    EXPECT_EQ(*look, url);
    EXPECT_EQ(look->cachedResourceValue(ResourceKey::fileSize),
              ResourceValue(Number(std::uint64_t{2})));
    EXPECT_EQ(look->cachedResourceValue(ResourceKey::documentIdentifier), std::nullopt)
        << "nobody was told of it";
    EXPECT_EQ(world_.documents.assignCalls(), 0);
    const URL missing = URL::fileURL(outside.path("none"));
    expectMissing(lookAt(std::vector{missing}).front(), missing.path());
}

TEST_P(ItemLooksTest, urlsThatNameNothingByTheirLastComponentComeBackBare) {
    folder("f");
    file("a");
    for (const URL& url : {URL::fileURL(world_.at("f/../a")), URL::fileURL("/"),
                           *URL::fromAbsoluteString("https://example.org/a")}) {
        const auto look = std::move(lookAt(std::vector{url}).front());
        ASSERT_TRUE(look);
        EXPECT_EQ(*look, url);
        EXPECT_EQ(look->prefetched(), nullptr);
    }
}

TEST_P(ItemLooksTest, withoutDocumentIdentifiersTheRestComesAlong) {
    file("a", "123");
    folder("f");
    world_.documents.failWith(errorWithPOSIXCode(ENOSPC));
    const auto looks = lookAt({world_.url("a"), world_.url("f")});
    EXPECT_EQ(looks[0]->cachedResourceValue(ResourceKey::fileSize),
              ResourceValue(Number(std::uint64_t{3})));
    EXPECT_EQ(looks[0]->cachedResourceValue(ResourceKey::documentIdentifier), std::nullopt);
    EXPECT_EQ(world_.files.resourceValue(*looks[0], ResourceKey::documentIdentifier).error().code,
              ENOSPC);
    EXPECT_EQ(looks[1]->cachedResourceValue(ResourceKey::documentIdentifier), ResourceValue());
}

}  // namespace
}  // namespace marrowdale::native
