#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "platform/foundation/URL.h"

namespace marrowdale {
namespace {

using Components = std::vector<std::string_view>;

PrefetchedValues exampleValues() {
    PrefetchedValues values;
    values.known = {ResourceKey::name,           ResourceKey::localizedName,
                    ResourceKey::typeIdentifier, ResourceKey::fileSize,
                    ResourceKey::creationDate,   ResourceKey::contentModificationDate,
                    ResourceKey::isReadable,     ResourceKey::isWritable,
                    ResourceKey::fileID,         ResourceKey::documentIdentifier,
                    ResourceKey::isPackage,      ResourceKey::isDirectory};
    values.fileID = FileID{12};
    values.documentIdentifier = DocumentID{34};
    values.fileSize = 56;
    values.creationDate = {7, 8};
    values.contentModificationDate = {9, 10};
    values.typeIdentifier = "text/plain";
    values.isReadable = true;
    return values;
}

TEST(URLTest, pathsAreMadeAbsoluteAndSlashesFolded) {
    EXPECT_EQ(URL::fileURL("/a/b").path(), "/a/b");
    EXPECT_EQ(URL::fileURL("a/b").path(), "/a/b");
    EXPECT_EQ(URL::fileURL("//a///b//").path(), "/a/b");
    EXPECT_EQ(URL::fileURL("/").path(), "/");
    EXPECT_EQ(URL::fileURL("").path(), "/");
    EXPECT_EQ(URL::fileURL("///").path(), "/");
    EXPECT_EQ(URL::fileURL("/a/./../b").path(), "/a/./../b");
}

TEST(URLTest, componentsOfAPath) {
    EXPECT_EQ(URL::fileURL("/a/b c").lastPathComponent(), "b c");
    EXPECT_EQ(URL::fileURL("/").lastPathComponent(), "/");
    const URL url = URL::fileURL("/a/b/c");
    EXPECT_EQ(url.pathComponents(), (Components{"/", "a", "b", "c"}));
    const URL root = URL::fileURL("/");
    EXPECT_EQ(root.pathComponents(), Components{"/"});
}

TEST(URLTest, goesUpAndDownByName) {
    EXPECT_EQ(URL::fileURL("/a/b").deletingLastPathComponent().path(), "/a");
    EXPECT_EQ(URL::fileURL("/a").deletingLastPathComponent().path(), "/");
    EXPECT_EQ(URL::fileURL("/").deletingLastPathComponent().path(), "/");
    EXPECT_EQ(URL::fileURL("/").appendingPathComponent("a").path(), "/a");
    EXPECT_EQ(URL::fileURL("/a").appendingPathComponent("b/c/").path(), "/a/b/c");
    EXPECT_EQ(URL::fileURL("/a").appendingPathComponent("/b").path(), "/a/b");
    EXPECT_EQ(URL::fileURL("/a").appendingPathComponent("").path(), "/a");
}

TEST(URLTest, standardizedTakesDotsOutByName) {
    const auto standardized = [](std::string_view path) {
        return URL::fileURL(path).standardized().path();
    };
    EXPECT_EQ(standardized("/a/./b"), "/a/b");
    EXPECT_EQ(standardized("/a/../b"), "/b");
    EXPECT_EQ(standardized("/a/b/.."), "/a");
    EXPECT_EQ(standardized("/.."), "/");
    EXPECT_EQ(standardized("/../../a"), "/a");
    EXPECT_EQ(standardized("/a/..hidden/.b/c."), "/a/..hidden/.b/c.");
    EXPECT_EQ(standardized("/a/.../b"), "/a/.../b");
    EXPECT_EQ(standardized("/."), "/");
}

TEST(URLTest, aStandardPathKeepsItsObject) {
    const URL url = URL::fileURL("/a/.b");
    url.setCachedResourceValue(ResourceKey::isPackage, true);
    EXPECT_EQ(url.standardized().cachedResourceValue(ResourceKey::isPackage), ResourceValue(true));
}

class URLBytesTest : public testing::TestWithParam<std::string> {};

TEST_P(URLBytesTest, comeBackFromTheAbsoluteString) {
    const URL url = URL::fileURL("/folder").appendingPathComponent(GetParam());
    EXPECT_EQ(url.lastPathComponent(), GetParam());
    const auto read = URL::fromAbsoluteString(url.absoluteString());
    ASSERT_TRUE(read);
    EXPECT_EQ(*read, url);
    EXPECT_EQ(read->path(), "/folder/" + GetParam());
}

INSTANTIATE_TEST_SUITE_P(Names, URLBytesTest,
                         testing::Values("plain", "with space", "line\nfeed", "\x1B[31m",
                                         "\xFF\xFE invalid", "a%20b", "question?", "hash#", "100%",
                                         "-rf", "\xC3\xA4", "a\xCC\x88", "a:b", "a;b=c&d",
                                         std::string(255, 'x'), std::string(255, '\xFF')));

TEST(URLTest, absoluteStringEncodesAllButUnreservedCharacters) {
    EXPECT_EQ(URL::fileURL("/tmp/a b").absoluteString(), "file:///tmp/a%20b");
    EXPECT_EQ(URL::fileURL("/\xC3\xA4+~").absoluteString(), "file:///%C3%A4%2B~");
    EXPECT_EQ(URL::fileURL("/").absoluteString(), "file:///");
}

TEST(URLTest, readsFileURLsInTheirSeveralForms) {
    for (const char* text :
         {"file:///tmp/a", "file:/tmp/a", "file://localhost/tmp/a", "FILE:///tmp/a",
          "file:///tmp//a/", "file:///tmp/%61", "file:///tmp/a?query", "file:///tmp/a#fragment"}) {
        const auto url = URL::fromAbsoluteString(text);
        ASSERT_TRUE(url) << text;
        EXPECT_TRUE(url->isFileURL()) << text;
        EXPECT_EQ(url->path(), "/tmp/a") << text;
    }
}

TEST(URLTest, refusesWhatIsNoAbsoluteURL) {
    for (const char* text :
         {"", "/tmp/a", "tmp", ":", ":/a", "1a:/b", "a b:/c", "file:", "file:relative", "file://",
          "file://host/a", "file:///a%", "file:///a%4", "file:///a%zz", "file:///a%00b",
          "https://example.org/%", "https://example.org/%00"}) {
        EXPECT_FALSE(URL::fromAbsoluteString(text)) << text;
    }
}

TEST(URLTest, otherURLsAreCarriedOnly) {
    const auto url = URL::fromAbsoluteString("https://example.org/a/../b");
    ASSERT_TRUE(url);
    EXPECT_FALSE(url->isFileURL());
    EXPECT_EQ(url->path(), "");
    EXPECT_EQ(url->lastPathComponent(), "");
    EXPECT_TRUE(url->pathComponents().empty());
    EXPECT_EQ(url->absoluteString(), "https://example.org/a/../b");
    EXPECT_EQ(url->standardized(), *url);
    EXPECT_EQ(url->deletingLastPathComponent(), *url);
    EXPECT_EQ(url->appendingPathComponent("c"), *url);
    EXPECT_EQ(relationship(*url, *url), URLRelationship::same);
    EXPECT_EQ(relationship(URL::fileURL("/"), *url), URLRelationship::other);
    EXPECT_EQ(relationship(*url, URL::fileURL("/a")), URLRelationship::other);
}

TEST(URLTest, areEqualWhenSchemeAndPathBytesAre) {
    EXPECT_EQ(URL::fileURL("/a"), URL::fileURL("/a/"));
    EXPECT_NE(URL::fileURL("/a"), URL::fileURL("/A"));
    EXPECT_NE(URL::fileURL("/a\xCC\x88"), URL::fileURL("/\xC3\xA4"));
    EXPECT_NE(URL::fileURL("/a"), *URL::fromAbsoluteString("https:/a"));
}

struct Places {
    const char* container;
    const char* item;
    URLRelationship expected;
};

class URLRelationshipTest : public testing::TestWithParam<Places> {};

TEST_P(URLRelationshipTest, isDecidedOnNames) {
    EXPECT_EQ(relationship(URL::fileURL(GetParam().container), URL::fileURL(GetParam().item)),
              GetParam().expected);
}

INSTANTIATE_TEST_SUITE_P(Pairs, URLRelationshipTest,
                         testing::Values(Places{"/a", "/a", URLRelationship::same},
                                         Places{"/a", "/a/b", URLRelationship::contains},
                                         Places{"/a", "/a/b/c", URLRelationship::contains},
                                         Places{"/a", "/ab", URLRelationship::other},
                                         Places{"/a/b", "/a", URLRelationship::other},
                                         Places{"/a", "/b", URLRelationship::other},
                                         Places{"/", "/a", URLRelationship::contains},
                                         Places{"/", "/", URLRelationship::same},
                                         Places{"/a", "/a/../b", URLRelationship::other},
                                         Places{"/a", "/b/../a/c", URLRelationship::contains},
                                         Places{"/a/.", "/a", URLRelationship::same},
                                         Places{"/a/..", "/b", URLRelationship::contains},
                                         Places{"/a", "/a/..", URLRelationship::other},
                                         Places{"/a", "/a/..b", URLRelationship::contains}));

TEST(URLTest, aListedChildKeepsItsParentObject) {
    const URL parent = URL::fileURL("/folder");
    const URL child = URL::listedChild(parent, "a.txt", {});
    EXPECT_EQ(child.path(), "/folder/a.txt");
    parent.setCachedResourceValue(ResourceKey::isPackage, true);
    EXPECT_EQ(child.deletingLastPathComponent().cachedResourceValue(ResourceKey::isPackage),
              ResourceValue(true));
    EXPECT_EQ(URL::listedChild(URL::fileURL("/"), "a", {}).path(), "/a");
    EXPECT_EQ(relationship(parent, child), URLRelationship::contains);
    EXPECT_EQ(URL::listedChild(URL::fileURL("/a/.."), "b", {}).standardized().path(), "/b");
}

TEST(URLTest, aListedChildAnswersWhatTheListingLearnt) {
    const URL url = URL::listedChild(URL::fileURL("/folder"), "a.txt", exampleValues());
    ASSERT_NE(url.prefetched(), nullptr);
    EXPECT_EQ(url.prefetched()->fileID, FileID{12});
    const auto value = [&](ResourceKey key) { return url.cachedResourceValue(key); };
    EXPECT_EQ(value(ResourceKey::name), ResourceValue("a.txt"));
    EXPECT_EQ(value(ResourceKey::localizedName), ResourceValue("a.txt"));
    EXPECT_EQ(value(ResourceKey::typeIdentifier), ResourceValue("text/plain"));
    EXPECT_EQ(value(ResourceKey::fileSize), ResourceValue(Number(std::uint64_t{56})));
    EXPECT_EQ(value(ResourceKey::creationDate), ResourceValue(Date{7, 8}));
    EXPECT_EQ(value(ResourceKey::contentModificationDate), ResourceValue(Date{9, 10}));
    EXPECT_EQ(value(ResourceKey::isReadable), ResourceValue(true));
    EXPECT_EQ(value(ResourceKey::isWritable), ResourceValue(false));
    EXPECT_EQ(value(ResourceKey::fileID), ResourceValue(Number(std::uint64_t{12})));
    EXPECT_EQ(value(ResourceKey::documentIdentifier), ResourceValue(Number(std::uint64_t{34})));
    EXPECT_EQ(value(ResourceKey::isPackage), ResourceValue(false));
    EXPECT_EQ(value(ResourceKey::isDirectory), ResourceValue(false));
    EXPECT_EQ(value(ResourceKey::parentDirectoryURL), std::nullopt);
}

TEST(URLTest, aListedChildTellsUnknownFromAbsent) {
    PrefetchedValues values;
    values.known = {ResourceKey::fileSize};
    values.absent = {ResourceKey::fileSize};
    const URL url = URL::listedChild(URL::fileURL("/folder"), "sub", values);
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::fileSize), ResourceValue());
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::fileID), std::nullopt);
}

TEST(URLTest, aURLMadeAnewHasNoValues) {
    const URL url = URL::fileURL("/a");
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::name), std::nullopt);
    EXPECT_EQ(url.prefetched(), nullptr);
}

TEST(URLTest, copiesShareTheirValuesAndEqualURLsDoNot) {
    const URL url = URL::fileURL("/a");
    // NOLINTNEXTLINE(performance-unnecessary-copy-initialization): it is what is tested
    const URL copy = url;
    EXPECT_TRUE(copy.setCachedResourceValue(ResourceKey::fileID, Number(std::uint64_t{5})));
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::fileID),
              ResourceValue(Number(std::uint64_t{5})));
    EXPECT_EQ(URL::fileURL("/a").cachedResourceValue(ResourceKey::fileID), std::nullopt);
}

TEST(URLTest, aSetValueComesBeforeWhatTheListingLearnt) {
    const URL url = URL::listedChild(URL::fileURL("/folder"), "a.txt", exampleValues());
    EXPECT_TRUE(url.setCachedResourceValue(ResourceKey::typeIdentifier, std::string("image/png")));
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::typeIdentifier), ResourceValue("image/png"));
    EXPECT_TRUE(url.setCachedResourceValue(ResourceKey::typeIdentifier, std::monostate()));
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::typeIdentifier), ResourceValue());
    EXPECT_FALSE(url.setCachedResourceValue(ResourceKey::parentDirectoryURL, std::monostate()));
}

TEST(URLTest, forgettingValuesLeavesTheOldObjectAlone) {
    const URL url = URL::listedChild(URL::fileURL("/folder"), "a.txt", exampleValues());
    url.setCachedResourceValue(ResourceKey::isPackage, true);
    const URL bare = url.withoutCachedValues();
    EXPECT_EQ(bare, url);
    EXPECT_EQ(bare.prefetched(), nullptr);
    EXPECT_EQ(bare.cachedResourceValue(ResourceKey::isPackage), std::nullopt);
    EXPECT_EQ(bare.cachedResourceValue(ResourceKey::name), std::nullopt);
    EXPECT_EQ(url.cachedResourceValue(ResourceKey::isPackage), ResourceValue(true));
}

TEST(URLTest, valuesMayBeSetAndReadByManyThreads) {
    for (int round = 0; round < 200; ++round) {
        const URL url = URL::fileURL("/a");
        std::vector<std::jthread> threads;
        for (int i = 0; i < 4; ++i) {
            threads.emplace_back([&url, i] {
                const auto key = i % 2 == 0 ? ResourceKey::name : ResourceKey::typeIdentifier;
                url.setCachedResourceValue(key, std::string("value"));
                EXPECT_EQ(url.cachedResourceValue(key), ResourceValue("value"));
            });
        }
        threads.clear();
        EXPECT_EQ(url.cachedResourceValue(ResourceKey::name), ResourceValue("value"));
        EXPECT_EQ(url.cachedResourceValue(ResourceKey::typeIdentifier), ResourceValue("value"));
    }
}

}  // namespace
}  // namespace marrowdale
