#include <cerrno>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/TrashWatch.h"
#include "platform/foundation/Semaphore.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/FakeFileEventService.h"
#include "platform/testing/RecordingLogSink.h"

namespace marrowdale::host {
namespace {

using std::chrono::seconds;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class TrashWatchTest : public ::testing::Test {
  protected:
    void watch(const std::vector<std::string>& folders) {
        watch_ = std::make_unique<TrashWatch>(events_, signals_, log_, folders);
    }
    void tell(std::uint32_t flags) {
        events_.streams().back()->tell(
            {{.id = EventID{9}, .flags = flags, .path = "/root/.Trash/a", .fileID = {}}});
    }
    // Whether a signal came; one for another container marks the end of those that were on the way.
    [[nodiscard]] std::vector<std::string> heard() {
        signals_.signal("end");
        EXPECT_TRUE(ended_.waitUntil(std::chrono::steady_clock::now() + seconds(30)));
        const MutexLock lock(mutex_);
        return std::exchange(heard_, {});
    }

    std::shared_ptr<RecordingLogSink> sink_ = std::make_shared<RecordingLogSink>();
    Log log_{sink_, LogLevel::debug};
    FakeFileEventService events_;
    std::unique_ptr<TrashWatch> watch_;

  private:
    Mutex mutex_;
    std::vector<std::string> heard_ MARROWDALE_GUARDED_BY(mutex_);
    Semaphore ended_;
    SignalHub signals_{std::chrono::milliseconds(0)};
    std::unique_ptr<SignalHub::Subscription> subscription_ =
        signals_.subscribe([this](std::string_view container) {
            if (container == "end") {
                ended_.signal();
                return;
            }
            const MutexLock lock(mutex_);
            heard_.emplace_back(container);
        });
};

TEST_F(TrashWatchTest, theTrashOfEachFolderIsFollowedFromNowOn) {
    events_.eventID = EventID{7};
    watch({"/root", "/home/.var/app/org.example.Notes/Documents/"});
    const auto stream = events_.streams().at(0);
    EXPECT_THAT(stream->paths,
                ElementsAre("/root/.Trash", "/home/.var/app/org.example.Notes/Documents/.Trash"));
    EXPECT_EQ(stream->since, EventID{7});
    EXPECT_THAT(stream->calls(), ElementsAre("start"));
}

TEST_F(TrashWatchTest, whatHappensThereSignalsTheWorkingSet) {
    watch({"/root"});
    tell(FileEventFlag::appeared);
    EXPECT_THAT(heard(), ElementsAre(VantrelWorkingSetContainerItemIdentifier));
    tell(FileEventFlag::userDropped | FileEventFlag::historyDone);
    EXPECT_THAT(heard(), ElementsAre(VantrelWorkingSetContainerItemIdentifier));
}

TEST_F(TrashWatchTest, theEndOfTheHistoryIsNoNews) {
    watch({"/root"});
    tell(FileEventFlag::historyDone);
    EXPECT_THAT(heard(), IsEmpty());
}

TEST_F(TrashWatchTest, itsStreamEndsWithIt) {
    watch({"/root"});
    const auto stream = events_.streams().at(0);
    watch_.reset();
    EXPECT_THAT(stream->calls(), ElementsAre("start", "stop", "invalidate", "release"));
}

TEST_F(TrashWatchTest, whatCannotBeWatchedIsLogged) {
    events_.hasStreams = false;
    watch({"/root"});
    EXPECT_EQ(sink_->count("[ERROR] the trash can't be watched; the system has no means for "
                           "another stream"),
              1U);
    events_.eventIDError = errorWithPOSIXCode(EIO);
    watch({"/root"});
    EXPECT_EQ(sink_->count("[ERROR] the trash can't be watched; " +
                           errorWithPOSIXCode(EIO).description()),
              1U);
    EXPECT_THAT(heard(), IsEmpty());
}

}  // namespace
}  // namespace marrowdale::host
