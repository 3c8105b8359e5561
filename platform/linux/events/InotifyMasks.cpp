#include "platform/linux/events/InotifyMasks.h"

#include <sys/inotify.h>

#include "platform/linux/events/Watcher.h"

namespace marrowdale::native {

namespace {

// IN_MODIFY, because what is written shows before the file is closed; IN_CLOSE_WRITE, because
// stores through shared memory, and files that get their name last, are told by nothing else.
constexpr std::uint32_t changes = IN_MODIFY | IN_CLOSE_WRITE | IN_ATTRIB;

}  // namespace

const std::uint32_t InotifyMasks::folder =
    changes | IN_CREATE | IN_DELETE | IN_MOVED_FROM | IN_MOVED_TO | IN_ONLYDIR;
const std::uint32_t InotifyMasks::rootToo = IN_DELETE_SELF | IN_MOVE_SELF;
const std::uint32_t InotifyMasks::file = changes;

std::uint32_t InotifyMasks::what(std::uint32_t mask) {
    std::uint32_t what = 0;
    what |= (mask & changes) != 0 ? WatchHint::changed : 0U;
    what |= (mask & IN_CREATE) != 0 ? WatchHint::appeared : 0U;
    what |= (mask & IN_DELETE) != 0 ? WatchHint::gone : 0U;
    what |= (mask & IN_MOVED_FROM) != 0 ? WatchHint::movedFrom : 0U;
    what |= (mask & IN_MOVED_TO) != 0 ? WatchHint::movedTo : 0U;
    what |= (mask & (IN_DELETE_SELF | IN_MOVE_SELF | IN_UNMOUNT)) != 0 ? WatchHint::rootMoved : 0U;
    return what;
}

}  // namespace marrowdale::native
