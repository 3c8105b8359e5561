#include "platform/linux/events/FanotifyMasks.h"

#include <sys/fanotify.h>

#include "platform/linux/events/Watcher.h"

namespace marrowdale::native {

namespace {

// FAN_MODIFY, because what is written shows before the file is closed; FAN_CLOSE_WRITE, because
// stores through shared memory, and files that get their name last, are told by nothing else.
constexpr std::uint64_t changes = FAN_MODIFY | FAN_CLOSE_WRITE | FAN_ATTRIB;

}  // namespace

const std::uint64_t FanotifyMasks::folder =
    changes | FAN_CREATE | FAN_DELETE | FAN_RENAME | FAN_ONDIR | FAN_EVENT_ON_CHILD;
const std::uint64_t FanotifyMasks::rootToo = FAN_DELETE_SELF | FAN_MOVE_SELF;
const std::uint64_t FanotifyMasks::file = changes;

std::uint32_t FanotifyMasks::what(std::uint64_t mask) {
    std::uint32_t what = 0;
    what |= (mask & changes) != 0 ? WatchHint::changed : 0U;
    what |= (mask & FAN_CREATE) != 0 ? WatchHint::appeared : 0U;
    what |= (mask & FAN_DELETE) != 0 ? WatchHint::gone : 0U;
    what |= (mask & (FAN_DELETE_SELF | FAN_MOVE_SELF)) != 0 ? WatchHint::rootMoved : 0U;
    return what;
}

}  // namespace marrowdale::native
