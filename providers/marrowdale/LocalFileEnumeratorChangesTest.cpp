// Which requests for changes begin, which are refused, and what ends those under way.

#include <cerrno>

#include <gtest/gtest.h>

#include "platform/testing/CollectingChangeObserver.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/LocalFileEnumerator.h"
#include "providers/marrowdale/items/ProviderError.h"

namespace marrowdale {
namespace {

class LocalFileEnumeratorChangesTest : public ::testing::Test {
  protected:
    using Lines = std::vector<std::string>;

    [[nodiscard]] FSChangeToken token() const {
        return {.version = 0,
                .deviceUUID = fake_.events.uuid,
                .streamEventID = 7,
                .offset = 0,
                .appLibraryVersionToken = 0};
    }
    void ask(const Data& anchor) { enumerator_->enumerateChangesForObserver(observer_, anchor); }
    [[nodiscard]] std::size_t count(const std::string& line) const {
        return fake_.sink->count(line);
    }

    FakePlatform fake_;
    std::shared_ptr<CollectingChangeObserver> observer_ =
        std::make_shared<CollectingChangeObserver>();
    std::unique_ptr<LocalFileEnumerator> enumerator_ = std::make_unique<LocalFileEnumerator>(
        fake_.platform, "fid=1", std::vector{URL::fileURL("/storage")});
};

TEST_F(LocalFileEnumeratorChangesTest, anAnchorOf48BytesIsExpiredWithoutBeingDecoded) {
    ask(Data(Bytes(48, 'x')));
    EXPECT_EQ(observer_->calls(), Lines{"error -1002"});
    EXPECT_EQ(count("[ERROR] can't create change token from anchor data, resetting"), 1U);
    EXPECT_TRUE(fake_.events.streams().empty());
}

TEST_F(LocalFileEnumeratorChangesTest, anUndecodableAnchorIsExpired) {
    for (const Data& anchor : {Data(), Data::fromText("garbage")}) {
        ask(anchor);
    }
    EXPECT_EQ(observer_->calls(), (Lines{"error -1002", "error -1002"}));
    EXPECT_EQ(count("[ERROR] can't create change token from anchor data, resetting"), 2U);
    EXPECT_TRUE(fake_.events.streams().empty());
}

TEST_F(LocalFileEnumeratorChangesTest, anAnchorOfAnotherVolumeIsExpired) {
    FSChangeToken other = token();
    other.deviceUUID = *UUID::fromText("00000000-0000-4000-8000-000000000000");
    ask(other.encode());
    EXPECT_EQ(observer_->calls(), Lines{"error -1002"});
    EXPECT_EQ(count("[DEBUG] device UUID changed (" + other.deviceUUID.text() + " -> " +
                    fake_.events.uuid.text() + ")"),
              1U);
    EXPECT_TRUE(fake_.events.streams().empty());
}

TEST_F(LocalFileEnumeratorChangesTest, aVolumeUUIDThatCannotBeReadEndsTheRequest) {
    fake_.events.uuidError = errorWithPOSIXCode(ENXIO);
    ask(token().encode());
    EXPECT_EQ(observer_->error(),
              errorWithProviderCode(ProviderErrorCode::unableToGetDeviceUUID, "/storage"));
    EXPECT_EQ(count("[ERROR] can't get volume UUID for /storage"), 1U);
}

TEST_F(LocalFileEnumeratorChangesTest, theRequestRunsInASectionThatNamesContainerAndToken) {
    FSChangeToken other = token();
    other.deviceUUID = *UUID::fromText("00000000-0000-4000-8000-000000000000");
    ask(other.encode());
    const auto lines = fake_.sink->lines();
    ASSERT_EQ(lines.size(), 3U);
    EXPECT_EQ(lines.front(),
              "[DEBUG] ┏0 enumerate changes for fid=1 with token " + other.description());
    EXPECT_EQ(lines.back(), "[DEBUG] ┗0");
}

TEST_F(LocalFileEnumeratorChangesTest, stoppingEndsARequestThatIsUnderWay) {
    ask(token().encode());
    const auto streams = fake_.events.streams();
    ASSERT_EQ(streams.size(), 1U);
    EXPECT_EQ(streams.front()->calls(), Lines{"start"});
    enumerator_->stop();
    streams.front()->drain();
    EXPECT_EQ(streams.front()->calls(), (Lines{"start", "stop", "invalidate", "release"}));
    EXPECT_TRUE(observer_->calls().empty()) << "nobody waits for it any more";
}

TEST_F(LocalFileEnumeratorChangesTest, anInvalidatedEnumeratorBeginsNothing) {
    enumerator_->invalidate();
    ask(token().encode());
    EXPECT_TRUE(fake_.events.streams().empty());
    EXPECT_TRUE(observer_->calls().empty());
}

}  // namespace
}  // namespace marrowdale
