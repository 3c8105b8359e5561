#pragma once

#include <chrono>
#include <functional>
#include <thread>

#include "host/requests/HostRequests.h"
#include "platform/foundation/Mutex.h"

namespace marrowdale::host {

// Has what was trashed long ago removed for good: at once, and daily from then on, on a thread of
// its own.
class TrashKeeper {
  public:
    using Clock = std::chrono::steady_clock;
    static constexpr std::chrono::days usualAge{30};

    struct Options {
        std::chrono::days age = usualAge;  // what is younger stays
        std::chrono::milliseconds pause = std::chrono::days(1);
        // Told of a purge that failed, on the keeper's thread.
        std::function<void(const Error& error)> failed = [](const Error&) {};
    };
    // The requests outlive the keeper.
    TrashKeeper(ActionRequests& requests, Options options);
    // Waits for a purge that runs.
    ~TrashKeeper();
    TrashKeeper(const TrashKeeper&) = delete;
    TrashKeeper& operator=(const TrashKeeper&) = delete;

  private:
    void run();
    void purge();
    // False when it is to end.
    [[nodiscard]] bool waitForTheNext();

    ActionRequests& requests_;
    const Options options_;
    Mutex mutex_;
    Condition changed_;
    bool isEnding_ MARROWDALE_GUARDED_BY(mutex_) = false;
    std::thread thread_;  // after everything it uses
};

}  // namespace marrowdale::host
