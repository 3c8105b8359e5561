#include <array>
#include <csignal>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/files/UniqueFD.h"
#include "platform/linux/store/StoreLock.h"
#include "platform/testing/TemporaryDirectory.h"

namespace marrowdale::native {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

class StoreLockTest : public testing::Test {
  protected:
    // A child that has the lock, and says so before this returns. It ends when it is told (a byte)
    // or killed.
    void startOwner() {
        std::array<int, 2> toChild{};
        std::array<int, 2> toParent{};
        ASSERT_EQ(::pipe(toChild.data()), 0);
        ASSERT_EQ(::pipe(toParent.data()), 0);
        owner_ = ::fork();
        if (owner_ == 0) {
            ::close(toChild[1]);
            char byte = 0;
            {
                auto lock = StoreLock::take(path_, milliseconds(0));
                (void)!::write(toParent[1], lock ? "+" : "-", 1);
                (void)!::read(toChild[0], &byte, 1);
            }
            // Goes on living without the lock.
            (void)!::read(toChild[0], &byte, 1);
            ::_exit(0);
        }
        ::close(toChild[0]);
        ::close(toParent[1]);
        tell_.reset(toChild[1]);
        const UniqueFD answer(toParent[0]);
        char byte = 0;
        ASSERT_EQ(::read(answer.get(), &byte, 1), 1);
        ASSERT_EQ(byte, '+');
    }
    void TearDown() override {
        if (owner_ > 0) {
            ::kill(owner_, SIGKILL);
            ::waitpid(owner_, nullptr, 0);
        }
    }

    TemporaryDirectory directory_;
    std::string path_ = directory_.path("lock");
    pid_t owner_ = -1;
    UniqueFD tell_;
};

TEST_F(StoreLockTest, NamesTheOwnerAtOnce) {
    startOwner();
    const auto lock = StoreLock::take(path_, milliseconds(0));
    ASSERT_FALSE(lock);
    EXPECT_EQ(lock.error().code, EWOULDBLOCK);
    EXPECT_THAT(lock.error().subject, testing::HasSubstr("process " + std::to_string(owner_)));
}

TEST_F(StoreLockTest, GivesUpAtTheDeadline) {
    startOwner();
    const auto before = std::chrono::steady_clock::now();
    const auto lock = StoreLock::take(path_, milliseconds(50));
    ASSERT_FALSE(lock);
    EXPECT_EQ(lock.error().code, EWOULDBLOCK);
    EXPECT_GE(std::chrono::steady_clock::now() - before, milliseconds(50));
}

TEST_F(StoreLockTest, IsTakenWhenTheOwnerIsKilled) {
    startOwner();
    std::thread killer([this] { ::kill(owner_, SIGKILL); });
    const auto lock = StoreLock::take(path_, std::nullopt);
    killer.join();
    EXPECT_TRUE(lock);
}

TEST_F(StoreLockTest, IsTakenWhenTheOwnerLetsGoAndLivesOn) {
    startOwner();
    std::thread teller([this] { (void)!::write(tell_.get(), "x", 1); });
    const auto lock = StoreLock::take(path_, std::nullopt);
    teller.join();
    EXPECT_TRUE(lock);
    EXPECT_EQ(::kill(owner_, 0), 0);
}

TEST_F(StoreLockTest, IsHeldAgainstTheSameProcessToo) {
    auto first = std::make_unique<Expected<StoreLock>>(StoreLock::take(path_, milliseconds(0)));
    ASSERT_TRUE(*first);
    EXPECT_FALSE(StoreLock::take(path_, milliseconds(0)));
    first.reset();
    EXPECT_TRUE(StoreLock::take(path_, milliseconds(0)));
}

TEST_F(StoreLockTest, ManyWaitersGetItOneAfterTheOther) {
    startOwner();
    std::vector<std::thread> waiters;
    std::atomic<int> holders = 0;
    std::atomic<int> taken = 0;
    for (int i = 0; i < 8; ++i) {
        waiters.emplace_back([&] {
            const auto lock = StoreLock::take(path_, seconds(60));
            EXPECT_TRUE(lock);
            EXPECT_EQ(holders.fetch_add(1), 0);
            ++taken;
            --holders;
        });
    }
    ::kill(owner_, SIGKILL);
    for (auto& waiter : waiters) {
        waiter.join();
    }
    EXPECT_EQ(taken, 8);
}

}  // namespace
}  // namespace marrowdale::native
