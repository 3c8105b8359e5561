#include "host/daemon/AppRefreshRequests.h"

#include <cstdint>
#include <utility>

#include "platform/foundation/Mutex.h"

namespace marrowdale::host {

// How many refreshes were done.
class AppRefreshRequests::Count {
  public:
    explicit Count(std::function<void()> refreshed) : refreshed_(std::move(refreshed)) {}

    void oneWasDone() {
        {
            const MutexLock lock(telling_);
            if (refreshed_) {
                refreshed_();
            }
        }
        increase();
    }
    // Waits for a call of `refreshed` that is running.
    void tellNobody() {
        const MutexLock lock(telling_);
        refreshed_ = nullptr;
    }
    [[nodiscard]] std::uint64_t now() {
        const MutexLock lock(mutex_);
        return count_;
    }
    void waitForMoreThan(std::uint64_t count) {
        MutexLock lock(mutex_);
        while (count_ <= count) {
            increased_.wait(lock);
        }
    }

  private:
    void increase() {
        const MutexLock lock(mutex_);
        ++count_;
        increased_.notifyAll();
    }
    Mutex telling_;
    std::function<void()> refreshed_ MARROWDALE_GUARDED_BY(telling_);
    Mutex mutex_;
    Condition increased_;
    std::uint64_t count_ MARROWDALE_GUARDED_BY(mutex_) = 0;
};

AppRefreshRequests::AppRefreshRequests(FileProviderApplications& extension,
                                       std::function<void()> refreshed)
    : extension_(extension), count_(std::make_shared<Count>(std::move(refreshed))) {
    extension_._refreshInstalledAppsWithCompletionHandler(
        [count = count_] { count->oneWasDone(); });
}

void AppRefreshRequests::stopTelling() {
    count_->tellNobody();
}

void AppRefreshRequests::waitForFirst() {
    count_->waitForMoreThan(0);
}

void AppRefreshRequests::ask() {
    extension_._refreshInstalledAppsWithCompletionHandler(nullptr);
}

void AppRefreshRequests::refreshNow() {
    // The first one that is done may have begun before the call; the one after it has not.
    for (int round = 0; round < 2; ++round) {
        const std::uint64_t before = count_->now();
        ask();
        count_->waitForMoreThan(before);
    }
}

}  // namespace marrowdale::host
