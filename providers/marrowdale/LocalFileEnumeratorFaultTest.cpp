#include <cerrno>

#include <gtest/gtest.h>

#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/CollectingObserver.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/LocalFileEnumerator.h"
#include "providers/marrowdale/items/ProviderError.h"

namespace marrowdale {
namespace {

const Data& byName = VantrelInitialPageSortedByName();

TEST(LocalFileEnumeratorFaultTest, anEmptyListOfURLsEndsTheProcess) {
    FakePlatform fake;
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_DEATH(LocalFileEnumerator(fake.platform, "fid=1", {}),
                 "can't create enumerator for an empty list of URLs");
}

TEST(LocalFileEnumeratorFaultTest, aVolumeUUIDThatCannotBeReadEndsTheRequest) {
    FakePlatform fake;
    fake.events.uuidError = errorWithPOSIXCode(ENXIO);
    CollectingObserver observer;
    LocalFileEnumerator(fake.platform, "fid=1", {URL::fileURL("/storage")})
        .enumerateItemsForObserver(observer, byName);
    EXPECT_EQ(observer.error,
              errorWithProviderCode(ProviderErrorCode::unableToGetDeviceUUID, "/storage"));
    EXPECT_EQ(observer.batches, 0);
    EXPECT_EQ(fake.sink->count("[ERROR] can't get volume UUID for /storage"), 1U);
}

TEST(LocalFileEnumeratorFaultTest, anEventIdentifierThatCannotBeReadEndsTheRequest) {
    FakePlatform fake;
    fake.events.eventIDError = errorWithPOSIXCode(EIO);
    CollectingObserver observer;
    LocalFileEnumerator(fake.platform, "fid=1", {URL::fileURL("/storage")})
        .enumerateItemsForObserver(observer, byName);
    EXPECT_EQ(observer.error, errorWithPOSIXCode(EIO));
}

TEST(LocalFileEnumeratorFaultTest, theEventIsReadBeforeTheFirstEntryIsListed) {
    FakePlatform fake;
    fake.events.eventID = EventID{5};
    EventID eventAtListing{};
    fake.fileSystem.enumerateFault =
        [&](const DirectoryEnumerationRequest&) -> std::optional<Error> {
        eventAtListing = fake.events.eventID;
        fake.events.eventID = EventID{6};
        return errorWithPOSIXCode(ENOENT);
    };
    CollectingObserver observer;
    LocalFileEnumerator(fake.platform, "fid=1", {URL::fileURL("/storage")})
        .enumerateItemsForObserver(observer, byName);
    EXPECT_EQ(eventAtListing, EventID{5});
}

TEST(LocalFileEnumeratorFaultTest, withoutANotifierThereIsNoCurrentAnchor) {
    FakePlatform fake;
    fake.events.uuidError = errorWithPOSIXCode(ENXIO);
    LocalFileEnumerator enumerator(fake.platform, "fid=1", {URL::fileURL("/storage/a")});
    EXPECT_EQ(fake.sink->lines(),
              (std::vector<std::string>{
                  "[ERROR] can't get volume UUID for \"/storage/a\"",
                  "[ERROR] can't create notifier for \"/storage/a\"; enumeration will have no "
                  "live update"}));
    int answers = 0;
    enumerator.currentSyncAnchorWithCompletionHandler([&](const std::optional<Data>& anchor) {
        ++answers;
        EXPECT_EQ(anchor, std::nullopt);
    });
    EXPECT_EQ(answers, 1);
    enumerator.start();
    enumerator.stop();
    EXPECT_TRUE(fake.events.streams().empty());
}

TEST(LocalFileEnumeratorFaultTest, whereTheCurrentEventCannotBeReadThereIsNoCurrentAnchor) {
    FakePlatform fake;
    LocalFileEnumerator enumerator(fake.platform, "fid=1", {URL::fileURL("/storage")});
    fake.events.eventIDError = errorWithPOSIXCode(EIO);
    enumerator.currentSyncAnchorWithCompletionHandler(
        [&](const std::optional<Data>& anchor) { EXPECT_EQ(anchor, std::nullopt); });
    EXPECT_EQ(fake.sink->count("[ERROR] can't read the current event; " +
                               errorWithPOSIXCode(EIO).description()),
              1U);
}

// A folder in which no identifier can be made durable.
class FullDisk : public DirectoryEnumerator {
  public:
    Expected<std::uint64_t> skip(std::uint64_t count) override { return count; }
    Expected<std::uint64_t> next(std::uint64_t /*limit*/, std::vector<URL>& /*urls*/) override {
        return Unexpected(errorWithPOSIXCode(ENOSPC));
    }
    DirectoryPosition position() const override { return {}; }
};
class FullDiskFileSystem : public EmptyFileSystem {
  public:
    Expected<std::unique_ptr<DirectoryEnumerator>> enumerateDirectory(
        const DirectoryEnumerationRequest& /*request*/) override {
        return std::make_unique<FullDisk>();
    }
};

TEST(LocalFileEnumeratorFaultTest, identifiersThatCantBeMadeDurableEndThePageWithTheError) {
    FakePlatform fake;
    FullDiskFileSystem files;
    const Platform platform = withFileSystem(fake.platform, files);
    CollectingObserver observer;
    LocalFileEnumerator(platform, "fid=1", {URL::fileURL("/storage")})
        .enumerateItemsForObserver(observer, byName);
    EXPECT_EQ(observer.error, errorWithPOSIXCode(ENOSPC));
    EXPECT_EQ(observer.batches, 0);
    EXPECT_EQ(observer.finishes, 1);
}

}  // namespace
}  // namespace marrowdale
