#pragma once

#include <memory>
#include <optional>

#include "platform/linux/events/FanotifyCalls.h"
#include "platform/linux/events/InotifyCalls.h"
#include "platform/linux/events/Watcher.h"

namespace marrowdale::native {

// The system calls that watchers are made with.
struct WatcherCalls {
    std::shared_ptr<FanotifyCalls> fanotify = std::make_shared<FanotifyCalls>();
    std::shared_ptr<InotifyCalls> inotify = std::make_shared<InotifyCalls>();
};

// `makeWatcher` with other system calls.
[[nodiscard]] Expected<std::unique_ptr<Watcher>> chooseWatcher(
    int folder, std::optional<Watcher::Kind> preferred, const WatcherCalls& calls);

}  // namespace marrowdale::native
