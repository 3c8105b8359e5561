#include "platform/linux/events/FanotifyRecords.h"

#include <cstring>
#include <fcntl.h>
#include <sys/fanotify.h>

namespace marrowdale::native {

namespace {

using Bytes = std::span<const std::byte>;

// The kernel aligns nothing within a buffer that it is sure to be read with, so values are copied.
template <typename Value>
bool readAt(Bytes bytes, std::size_t at, Value& value) {
    if (bytes.size() < at || bytes.size() - at < sizeof value) {
        return false;
    }
    std::memcpy(&value, bytes.data() + at, sizeof value);
    return true;
}

std::string_view viewOf(Bytes bytes) {
    return {reinterpret_cast<const char*>(bytes.data()), bytes.size()};
}

// A handle, its type first, and what follows it in the same piece of information.
struct HandleAndRest {
    std::string_view handle;
    Bytes rest;
};

std::optional<HandleAndRest> handleIn(Bytes info) {
    constexpr std::size_t at = offsetof(fanotify_event_info_fid, handle);
    constexpr std::size_t typeAt = at + offsetof(::file_handle, handle_type);
    constexpr std::size_t bytesAt = at + offsetof(::file_handle, f_handle);
    std::uint32_t count = 0;
    if (!readAt(info, at, count) || info.size() < bytesAt || info.size() - bytesAt < count) {
        return std::nullopt;
    }
    return HandleAndRest{viewOf(info.subspan(typeAt, bytesAt - typeAt + count)),
                         info.subspan(bytesAt + count)};
}

// The kernel names a folder "." where it tells of the folder itself.
std::optional<FanotifyRecord::Place> placeIn(Bytes info, bool hasName) {
    const auto found = handleIn(info);
    if (!found) {
        return std::nullopt;
    }
    std::string_view name = hasName ? viewOf(found->rest) : std::string_view();
    name = name.substr(0, name.find('\0'));
    return FanotifyRecord::Place{found->handle, name == "." ? std::string_view() : name};
}

// False where the information is of a known kind and makes no sense.
bool take(Bytes info, std::uint8_t kind, FanotifyRecord& record) {
    switch (kind) {
        case FAN_EVENT_INFO_TYPE_FID: {
            const auto found = handleIn(info);
            record.thing = found ? found->handle : std::string_view();
            return found.has_value();
        }
        case FAN_EVENT_INFO_TYPE_DFID:
        case FAN_EVENT_INFO_TYPE_DFID_NAME:
            record.place = placeIn(info, kind == FAN_EVENT_INFO_TYPE_DFID_NAME);
            return record.place.has_value();
        case FAN_EVENT_INFO_TYPE_OLD_DFID_NAME:
            record.from = placeIn(info, true);
            return record.from.has_value();
        case FAN_EVENT_INFO_TYPE_NEW_DFID_NAME:
            record.to = placeIn(info, true);
            return record.to.has_value();
        default:
            return true;
    }
}

bool takeAll(Bytes infos, FanotifyRecord& record) {
    while (!infos.empty()) {
        fanotify_event_info_header header{};
        if (!readAt(infos, 0, header) || header.len < sizeof header || header.len > infos.size() ||
            !take(infos.first(header.len), header.info_type, record)) {
            return false;
        }
        infos = infos.subspan(header.len);
    }
    return true;
}

}  // namespace

bool FanotifyRecord::isOverflow() const {
    return (mask & FAN_Q_OVERFLOW) != 0;
}

std::optional<FanotifyRecord> FanotifyRecords::next() {
    if (rest_.empty()) {
        return std::nullopt;
    }
    fanotify_event_metadata event{};
    FanotifyRecord record;
    const bool whole = readAt(rest_, 0, event) && event.vers == FANOTIFY_METADATA_VERSION &&
                       event.metadata_len >= sizeof event && event.event_len <= rest_.size() &&
                       event.metadata_len <= event.event_len;
    if (!whole || !takeAll(rest_.first(event.event_len).subspan(event.metadata_len), record)) {
        malformed_ = true;
        rest_ = {};
        return std::nullopt;
    }
    record.mask = event.mask;
    rest_ = rest_.subspan(event.event_len);
    return record;
}

}  // namespace marrowdale::native
