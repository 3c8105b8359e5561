#include "platform/linux/events/InotifyRecords.h"

#include <cstring>
#include <sys/inotify.h>

namespace marrowdale::native {

std::optional<InotifyRecord> InotifyRecords::next() {
    if (rest_.empty()) {
        return std::nullopt;
    }
    inotify_event event{};
    if (rest_.size() >= sizeof event) {
        std::memcpy(&event, rest_.data(), sizeof event);
    }
    if (rest_.size() < sizeof event || rest_.size() - sizeof event < event.len) {
        malformed_ = true;
        rest_ = {};
        return std::nullopt;
    }
    const auto* start = reinterpret_cast<const char*>(rest_.data() + sizeof event);
    const std::string_view padded(start, event.len);
    rest_ = rest_.subspan(sizeof event + event.len);
    return InotifyRecord{event.wd, event.mask, event.cookie, padded.substr(0, padded.find('\0'))};
}

}  // namespace marrowdale::native
