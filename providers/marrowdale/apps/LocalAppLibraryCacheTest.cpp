#include <cerrno>
#include <limits>

#include <gtest/gtest.h>

#include "platform/foundation/KeyedArchive.h"
#include "platform/testing/FakePlatform.h"
#include "providers/marrowdale/apps/LocalAppLibraryCache.h"

namespace marrowdale {
namespace {

using Bump = LocalAppLibraryCache::Bump;
using Source = LocalAppLibraryCacheSource;
using Lines = std::vector<std::string>;

constexpr std::string_view path = "/home/u/.local/share/Marrowdale/app-libraries.plist";
constexpr std::string_view shortPath = "~/.local/share/Marrowdale/app-libraries.plist";

class LocalAppLibraryCacheTest : public ::testing::Test {
  protected:
    LocalAppLibraryCache& cache(Source source = Source::main) {
        return LocalAppLibraryCache::of(fake_.platform, source);
    }
    BundleRecords load() {
        BundleRecords records;
        cache().queue().sync([&] { records = cache().load(); });
        return records;
    }
    Expected<std::uint64_t> save(const BundleRecords& records, std::uint64_t token,
                                 Bump bump = Bump::no) {
        Expected<std::uint64_t> saved = 0;
        cache().queue().sync([&] { saved = cache().save(records, token, bump); });
        return saved;
    }
    std::uint64_t token() {
        std::uint64_t token = 0;
        cache().queue().sync([&] { token = cache().versionToken(); });
        return token;
    }
    BundleRecords twoRecords() {
        return {fake_.applications.add("org.example.B", "B", "/apps/b"),
                fake_.applications.add("org.example.A", "A", "/apps/a")};
    }
    std::vector<std::string> identifiers(const BundleRecords& records) {
        std::vector<std::string> found;
        for (const auto& record : records) {
            found.push_back(record->bundleIdentifier().value_or("none"));
        }
        return found;
    }
    void put(const ArchivedObject& object) { putData(*archive(object)); }
    void putData(const Data& data) {
        ASSERT_TRUE(fake_.applicationSupport.replace(URL::fileURL(path), data));
    }

    FakePlatform fake_;
};

TEST_F(LocalAppLibraryCacheTest, thereIsOneForEachSource) {
    EXPECT_EQ(&cache(), &cache());
    EXPECT_EQ(cache().description(), "main cache");
    EXPECT_EQ(cache().queue().label(), "marrowdale.app-library-cache.main");
    EXPECT_EQ(cache().cacheURL().path(), path);
    EXPECT_EQ(cache(Source::workingSet).description(), "working-set cache");
    EXPECT_EQ(cache(Source::workingSet).queue().label(),
              "marrowdale.app-library-cache.working-set");
    EXPECT_EQ(cache(Source::workingSet).cacheURL().path(),
              "/home/u/.local/share/Marrowdale/searchable-app-libraries.plist");
}

TEST_F(LocalAppLibraryCacheTest, theShortPathHasTheLastFourComponents) {
    EXPECT_EQ(cache().shortPath(), shortPath);
    FakePlatform top;
    top.applicationSupport.directories = {URL::fileURL("/data")};
    EXPECT_EQ(LocalAppLibraryCache::of(top.platform, Source::main).shortPath(),
              "~/data/Marrowdale/app-libraries.plist");
}

TEST_F(LocalAppLibraryCacheTest, aMissingFileGivesAnEmptyListAndToken0WithOneDebugLine) {
    EXPECT_TRUE(load().empty());
    EXPECT_EQ(token(), 0U);
    EXPECT_EQ(fake_.sink->lines(), Lines{"[DEBUG] nothing cached on disk"});
}

TEST_F(LocalAppLibraryCacheTest, whatWasSavedIsLoadedInTheSameOrder) {
    ASSERT_EQ(save(twoRecords(), 7), 7U);
    EXPECT_EQ(fake_.applicationSupport.created(), Lines{"/home/u/.local/share/Marrowdale"});
    const auto size = std::to_string(fake_.applicationSupport.file(std::string(path))->size());
    EXPECT_EQ(fake_.sink->lines(),
              (Lines{"[DEBUG] ┏0 saving bundle proxies to " + std::string(shortPath),
                     "[DEBUG] wrote on disk " + size + " bytes at " + std::string(shortPath),
                     "[DEBUG] ┗0"}));
    fake_.sink->clear();
    EXPECT_EQ(identifiers(load()), (Lines{"org.example.B", "org.example.A"}));
    EXPECT_EQ(token(), 7U);
    EXPECT_EQ(fake_.sink->lines(),
              (Lines{"[DEBUG] read from disk " + size + " bytes at " + std::string(shortPath),
                     "[DEBUG] loaded 2 app library items from data",
                     "[DEBUG] version token was set to 7 after load"}));
}

TEST_F(LocalAppLibraryCacheTest, theFileIsAnArchiveOfExactlyTwoEntries) {
    ASSERT_TRUE(save(twoRecords(), 7));
    const auto root = unarchive(fake_.applicationSupport.file(std::string(path))->bytes());
    ASSERT_TRUE(root);
    EXPECT_EQ(*root,
              ArchivedObject(ArchivedDictionary{
                  {"versionToken", ArchivedObject(Number(std::uint64_t{7}))},
                  {"bundleProxy", ArchivedObject(ArchivedArray{
                                      ArchivedObject(ArchivedBundleRecord{"org.example.B"}),
                                      ArchivedObject(ArchivedBundleRecord{"org.example.A"})})}}));
}

TEST_F(LocalAppLibraryCacheTest, aRecordWhoseApplicationIsGoneComesBackWithItsIdentifierAlone) {
    ASSERT_TRUE(save(twoRecords(), 7));
    fake_.applications.remove("org.example.B");
    const auto records = load();
    EXPECT_EQ(identifiers(records), (Lines{"org.example.B", "org.example.A"}));
    EXPECT_EQ(records[0]->dataContainerURL(), std::nullopt);
}

TEST_F(LocalAppLibraryCacheTest, tokensOf64BitsAreKept) {
    constexpr auto largest = std::numeric_limits<std::uint64_t>::max();
    ASSERT_TRUE(save({}, largest));
    EXPECT_TRUE(load().empty());
    EXPECT_EQ(token(), largest);
    EXPECT_DEATH((void)save({}, 0, Bump::yes), "no version token is left");
}

TEST_F(LocalAppLibraryCacheTest, aBumpWritesTheTokenAfterTheCurrentOne) {
    ASSERT_TRUE(save({}, 5));
    EXPECT_EQ(save({}, 17, Bump::yes), 6U);
    EXPECT_EQ(token(), 6U);
    EXPECT_TRUE(load().empty());
    EXPECT_EQ(token(), 6U);
}

TEST_F(LocalAppLibraryCacheTest, aFailedWriteLeavesTheTokenAtItsOldValue) {
    ASSERT_TRUE(save({}, 5));
    fake_.applicationSupport.replaceFault = errorWithPOSIXCode(ENOSPC);
    EXPECT_EQ(save({}, 9).error(), errorWithPOSIXCode(ENOSPC));
    EXPECT_EQ(save({}, 9, Bump::yes).error(), errorWithPOSIXCode(ENOSPC));
    EXPECT_EQ(token(), 5U);
}

TEST_F(LocalAppLibraryCacheTest, aFolderThatCantBeMadeIsReportedByTheWrite) {
    fake_.applicationSupport.createDirectoryFault = errorWithPOSIXCode(EACCES);
    EXPECT_TRUE(save({}, 1));
    fake_.applicationSupport.replaceFault = errorWithPOSIXCode(ENOENT);
    EXPECT_EQ(save({}, 2).error(), errorWithPOSIXCode(ENOENT));
}

TEST_F(LocalAppLibraryCacheTest, anotherReadErrorResetsWithAnErrorLine) {
    ASSERT_TRUE(save(twoRecords(), 7));
    fake_.sink->clear();
    fake_.applicationSupport.readFault = errorWithPOSIXCode(EIO);
    EXPECT_TRUE(load().empty());
    EXPECT_EQ(token(), 0U);
    EXPECT_EQ(fake_.sink->lines(), Lines{"[ERROR] can't load cache from disk let's reset; " +
                                         errorWithPOSIXCode(EIO).description()});
}

TEST_F(LocalAppLibraryCacheTest, aTokenThatIsNoneResets) {
    const ArchivedObject records{ArchivedArray()};
    const std::vector<ArchivedObject> bad = {
        ArchivedObject(ArchivedDictionary{{"versionToken", ArchivedObject(std::string("5"))},
                                          {"bundleProxy", records}}),
        ArchivedObject(ArchivedDictionary{
            {"versionToken", ArchivedObject(Number(std::int64_t{-5}))}, {"bundleProxy", records}}),
        ArchivedObject(ArchivedDictionary{{"versionToken", ArchivedObject(Number(5.0))},
                                          {"bundleProxy", records}}),
        ArchivedObject(ArchivedDictionary{{"bundleProxy", records}}),
        ArchivedObject(ArchivedArray()),
    };
    for (const ArchivedObject& object : bad) {
        put(object);
        fake_.sink->clear();
        EXPECT_TRUE(load().empty());
        EXPECT_EQ(token(), 0U);
        EXPECT_EQ(fake_.sink->count(
                      "[DEBUG] version token invalid; data on disk is corrupted let's reset"),
                  1U);
        EXPECT_EQ(fake_.sink->countOfLevel(LogLevel::error), 0U);
    }
}

TEST_F(LocalAppLibraryCacheTest, recordsThatAreNoneReset) {
    const ArchivedObject token5{Number(std::uint64_t{5})};
    const std::vector<ArchivedObject> bad = {
        ArchivedObject(ArchivedDictionary{{"versionToken", token5}}),
        ArchivedObject(ArchivedDictionary{{"versionToken", token5},
                                          {"bundleProxy", ArchivedObject(std::string("a"))}}),
        ArchivedObject(ArchivedDictionary{
            {"versionToken", token5},
            {"bundleProxy",
             ArchivedObject(ArchivedArray{ArchivedObject(ArchivedBundleRecord{"org.example.A"}),
                                          ArchivedObject(std::string("org.example.B"))})}}),
    };
    for (const ArchivedObject& object : bad) {
        put(object);
        fake_.sink->clear();
        EXPECT_TRUE(load().empty());
        EXPECT_EQ(this->token(), 0U);
        EXPECT_EQ(fake_.sink->count(
                      "[DEBUG] bundle proxies invalid; data on disk is corrupted let's reset"),
                  1U);
    }
}

TEST_F(LocalAppLibraryCacheTest, aResetLeavesTheFileAloneAndTheNextSaveReplacesIt) {
    putData(Data::fromText("junk"));
    EXPECT_TRUE(load().empty());
    EXPECT_EQ(fake_.applicationSupport.file(std::string(path))->text(), "junk");
    EXPECT_EQ(save(twoRecords(), 0, Bump::yes), 1U);
    EXPECT_EQ(load().size(), 2U);
}

TEST_F(LocalAppLibraryCacheTest, aFileCutAnywhereOrWithAnyByteChangedNeverBreaksIt) {
    ASSERT_TRUE(save(twoRecords(), 7));
    const Data whole = *fake_.applicationSupport.file(std::string(path));
    for (std::size_t size = 0; size < whole.size(); ++size) {
        putData(Data::copyOf(whole.bytes().first(size)));
        EXPECT_TRUE(load().empty());
        EXPECT_EQ(token(), 0U);
    }
    for (std::size_t at = 0; at < whole.size(); ++at) {
        for (const unsigned flip : {0x01U, 0x10U, 0x80U, 0xffU}) {
            Bytes bytes(whole.bytes().begin(), whole.bytes().end());
            bytes[at] = static_cast<std::uint8_t>(bytes[at] ^ flip);
            putData(Data(std::move(bytes)));
            const auto records = load();
            EXPECT_TRUE(token() != 0 || records.empty());
        }
    }
}

TEST_F(LocalAppLibraryCacheTest, useOutsideOfItsQueueEndsTheProcess) {
    EXPECT_DEATH((void)cache().load(), "main cache is used outside of its queue");
    EXPECT_DEATH((void)cache().save({}, 1, Bump::no), "outside of its queue");
    EXPECT_DEATH((void)cache(Source::workingSet).versionToken(), "working-set cache is used");
}

TEST_F(LocalAppLibraryCacheTest, aUserWithoutAFolderEndsTheProcess) {
    fake_.applicationSupport.directories.clear();
    EXPECT_DEATH((void)cache(), "no application support directory");
}

}  // namespace
}  // namespace marrowdale
