#include <atomic>
#include <mutex>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "host/daemon/AppRefreshRequests.h"
#include "host/testing/FakeExtension.h"
#include "platform/foundation/Semaphore.h"

namespace marrowdale::host {
namespace {

// Refreshes on a thread of its own, as an extension does: one at a time, each calling every handler
// that it was ever given.
class SlowExtension : public FakeExtension {
  public:
    ~SlowExtension() override {
        ended_ = true;
        requests_.signal();
        worker_.join();
    }
    void _refreshInstalledAppsWithCompletionHandler(std::function<void()> handler) override {
        if (handler) {
            const std::lock_guard lock(mutex_);
            handlers_.push_back(std::move(handler));
        }
        requests_.signal();
    }
    std::atomic<int> begun = 0;
    std::size_t handlers() {
        const std::lock_guard lock(mutex_);
        return handlers_.size();
    }

  private:
    void serve() {
        for (requests_.wait(); !ended_; requests_.wait()) {
            ++begun;
            std::vector<std::function<void()>> handlers;
            {
                const std::lock_guard lock(mutex_);
                handlers = handlers_;
            }
            for (const auto& handler : handlers) {
                handler();
            }
        }
    }
    std::mutex mutex_;
    std::vector<std::function<void()>> handlers_;  // guarded by mutex_
    Semaphore requests_;
    std::atomic<bool> ended_ = false;
    std::thread worker_{[this] { serve(); }};
};

TEST(AppRefreshRequestsTest, oneHandlerServesAllRequests) {
    SlowExtension extension;
    AppRefreshRequests requests(extension);
    requests.waitForFirst();
    for (int i = 0; i < 10; ++i) {
        const int before = extension.begun;
        requests.refreshNow();
        EXPECT_GT(extension.begun, before);
        requests.ask();
    }
    EXPECT_EQ(extension.handlers(), 1U);
}

TEST(AppRefreshRequestsTest, manyMayWaitAtOnce) {
    SlowExtension extension;
    AppRefreshRequests requests(extension);
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] { requests.refreshNow(); });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    requests.waitForFirst();
    EXPECT_GE(extension.begun, 2);
}

}  // namespace
}  // namespace marrowdale::host
