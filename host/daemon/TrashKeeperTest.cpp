#include <cerrno>
#include <future>

#include <gtest/gtest.h>

#include "host/daemon/TrashKeeper.h"

namespace marrowdale::host {
namespace {

// Remembers what it is asked for; fails when it is told to.
class PurgeRequests final : public ActionRequests {
  public:
    explicit PurgeRequests(std::size_t wanted) : wanted_(wanted) {}
    Expected<FileProviderItemPtr> perform(const ItemAction& action, ActionObserver& /*observer*/,
                                          const std::stop_token& /*stop*/) override {
        const MutexLock lock(mutex_);
        actions_.push_back(action);
        if (actions_.size() == wanted_) {
            reached_.set_value();
        }
        return Unexpected(errorWithPOSIXCode(EIO));
    }
    [[nodiscard]] bool wait() {
        return reached_.get_future().wait_for(std::chrono::seconds(30)) ==
               std::future_status::ready;
    }
    [[nodiscard]] std::vector<ItemAction> actions() {
        const MutexLock lock(mutex_);
        return actions_;
    }

  private:
    const std::size_t wanted_;
    std::promise<void> reached_;
    Mutex mutex_;
    std::vector<ItemAction> actions_;
};

TEST(TrashKeeperTest, whatIsOldGoesAtOnceAndAgainAfterAPause) {
    PurgeRequests requests(3);
    std::atomic<int> failures = 0;
    const Date before = Date::now();
    {
        const TrashKeeper keeper(requests, {.age = std::chrono::days(2),
                                            .pause = std::chrono::milliseconds(1),
                                            .failed = [&](const Error& error) {
                                                EXPECT_EQ(error.code, EIO);
                                                ++failures;
                                            }});
        EXPECT_TRUE(requests.wait());
    }
    constexpr std::int64_t twoDays = 2 * 24 * 60 * 60;
    for (const ItemAction& action : requests.actions()) {
        EXPECT_EQ(action.kind, ItemAction::Kind::purge);
        EXPECT_GE(action.date->seconds, before.seconds - twoDays);
        EXPECT_LE(action.date->seconds, Date::now().seconds - twoDays);
    }
    EXPECT_GE(failures, 3);
}

TEST(TrashKeeperTest, itEndsWithoutWaitingForTheNextDay) {
    PurgeRequests requests(1);
    {
        const TrashKeeper keeper(requests, {});
        EXPECT_TRUE(requests.wait());
    }
    EXPECT_EQ(requests.actions().size(), 1U);
}

}  // namespace
}  // namespace marrowdale::host
