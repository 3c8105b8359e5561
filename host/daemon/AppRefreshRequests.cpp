#include "host/daemon/AppRefreshRequests.h"

#include <cstdint>

#include "platform/foundation/Mutex.h"

namespace marrowdale::host {

// How many refreshes were done.
class AppRefreshRequests::Count {
  public:
    void increase() {
        const MutexLock lock(mutex_);
        ++count_;
        increased_.notifyAll();
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
    Mutex mutex_;
    Condition increased_;
    std::uint64_t count_ MARROWDALE_GUARDED_BY(mutex_) = 0;
};

AppRefreshRequests::AppRefreshRequests(FileProviderApplications& extension)
    : extension_(extension), count_(std::make_shared<Count>()) {
    extension_._refreshInstalledAppsWithCompletionHandler([count = count_] { count->increase(); });
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
