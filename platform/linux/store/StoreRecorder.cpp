// Listening: the thread that works through what the watcher tells, and those who want to know.

#include <array>
#include <cerrno>
#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>
#include <utility>

#include "platform/linux/store/StoreCore.h"

namespace marrowdale::native {

namespace {

// What happens together is worked through together.
constexpr int pauseMilliseconds = 3;
constexpr int pauseAfterFailure = 1000;

}  // namespace

// Before the first walk, which watches each folder that it lists.
void Store::Core::startWatching() {
    if (recording_ != StoreOptions::Recording::once) {
        auto watcher = makeWatcher(roots_.root().open.get(), watcherKind_);
        if (watcher) {
            watcher_ = std::move(*watcher);
        } else {
            const MutexLock lock(mutex_);
            recorderReport_.problem = watcher.error().description();
        }
    }
    watches_ = std::make_unique<FolderWatches>(watcher_.get());
}

void Store::Core::startRecorder() {
    if (!watcher_ || recording_ != StoreOptions::Recording::live) {
        return;
    }
    stop_.reset(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
    recorder_ = std::thread([this] { record(); });
}

void Store::Core::stopRecorder() {
    if (!recorder_.joinable()) {
        return;
    }
    const std::uint64_t one = 1;
    while (::write(stop_.get(), &one, sizeof one) < 0 && errno == EINTR) {
    }
    recorder_.join();
}

void Store::Core::record() {
    std::array<pollfd, 2> waits{{{watcher_->descriptor(), POLLIN, 0}, {stop_.get(), POLLIN, 0}}};
    bool wasWell = true;
    while (true) {
        if (::poll(waits.data(), waits.size(), -1) < 0 && errno != EINTR) {
            log("the recorder can't wait any more: " +
                errorWithPOSIXCode(errno, "wait for", rootPath()).description());
            return;
        }
        if (waits[1].revents != 0 || ::poll(&waits[1], 1, pauseMilliseconds) > 0) {
            return;
        }
        const auto done = runOnce(Pass::hints);
        if (!done && wasWell) {
            log("what happened in " + rootPath() +
                " can't be recorded: " + done.error().description());
        }
        wasWell = done.has_value();
        // What failed once will fail again at once.
        if (!done && ::poll(&waits[1], 1, pauseAfterFailure) > 0) {
            return;
        }
    }
}

std::uint64_t Store::Core::addListener(std::function<void(EventHistory::News)> listener) {
    const MutexLock lock(listenersMutex_);
    listeners_.emplace(nextListener_, std::move(listener));
    return nextListener_++;
}

void Store::Core::removeListener(std::uint64_t number) {
    const MutexLock lock(listenersMutex_);
    listeners_.erase(number);
}

void Store::Core::tell(EventHistory::News news) {
    const MutexLock lock(listenersMutex_);
    for (const auto& [number, listener] : listeners_) {
        listener(news);
    }
}

EventID Store::Core::lastEventID() {
    const MutexLock lock(mutex_);
    return EventID{journal_->lastEvent()};
}

EventID Store::Core::lastEventOfEarlierRuns() {
    const MutexLock lock(mutex_);
    return EventID{journal_->lastLoadedEvent()};
}

EventHistory::Standing Store::Core::standingOf(EventID since) {
    const MutexLock lock(mutex_);
    return journal_->standingOf(since);
}

Expected<std::unique_ptr<EventCursor>> Store::Core::eventsSince(EventID since) {
    const MutexLock lock(mutex_);
    return journal_->eventsSince(since);
}

}  // namespace marrowdale::native
