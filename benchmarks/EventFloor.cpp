#include "benchmarks/EventFloor.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <span>
#include <string_view>
#include <sys/fanotify.h>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>

#include "platform/linux/events/FanotifyMasks.h"
#include "platform/linux/events/FanotifyRecords.h"
#include "platform/linux/files/CRC32C.h"
#include "platform/linux/files/FileHandle.h"

namespace marrowdale::benchmarks {
namespace {

constexpr std::size_t bufferSize = std::size_t{64} << 10U;

[[noreturn]] void fail(const std::string& operation) {
    throw std::system_error(errno, std::generic_category(), operation);
}

template <typename T>
void append(std::vector<std::byte>& out, const T& value) {
    const auto bytes = std::as_bytes(std::span(&value, 1));
    out.insert(out.end(), bytes.begin(), bytes.end());
}

}  // namespace

EventFloor::EventFloor(const std::string& folder) : root_(folder), buffer_(bufferSize) {
    group_.reset(
        ::fanotify_init(FAN_CLASS_NOTIF | FAN_CLOEXEC | FAN_NONBLOCK | FAN_REPORT_DFID_NAME_TARGET,
                        O_RDONLY | O_CLOEXEC));
    if (!group_) {
        fail("fanotify_init");
    }
    rootFolder_.reset(::open(folder.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    const std::string parent = std::filesystem::path(folder).parent_path();
    log_.reset(::open(parent.c_str(), O_WRONLY | O_TMPFILE | O_CLOEXEC, 0600));
    if (!rootFolder_ || !log_) {
        fail("open");
    }
    listen(folder, "");
    for (auto entry = std::filesystem::recursive_directory_iterator(folder);
         entry != std::filesystem::recursive_directory_iterator(); ++entry) {
        if (entry->is_directory() && !entry->is_symlink()) {
            listen(entry->path(), entry->path().string().substr(folder.size() + 1) + "/");
        }
    }
}

void EventFloor::listen(const std::string& path, const std::string& below) {
    if (::fanotify_mark(group_.get(), FAN_MARK_ADD | FAN_MARK_ONLYDIR,
                        native::FanotifyMasks::folder, AT_FDCWD, path.c_str()) != 0) {
        fail("fanotify_mark");
    }
    const auto handle = native::fileHandle(AT_FDCWD, path.c_str());
    if (!handle) {
        errno = handle.error().code;
        fail("name_to_handle_at");
    }
    folders_.emplace(handle->bytes(), below);
}

template <typename Take>
EventFloor::Drained EventFloor::readAll(const Take& take) {
    Drained drained;
    while (true) {
        const ssize_t count = ::read(group_.get(), buffer_.data(), buffer_.size());
        if (count <= 0) {
            if (count < 0 && errno != EAGAIN) {
                fail("read");
            }
            return drained;
        }
        native::FanotifyRecords records({buffer_.data(), static_cast<std::size_t>(count)});
        while (const auto record = records.next()) {
            ++drained.events;
            drained.overflows += record->isOverflow() ? 1U : 0U;
            take(*record);
        }
    }
}

EventFloor::Drained EventFloor::drain() {
    return readAll([](const native::FanotifyRecord& /*record*/) {});
}

EventFloor::Drained EventFloor::record() {
    names_.clear();
    pending_.clear();
    const auto add = [this](const std::optional<native::FanotifyRecord::Place>& place) {
        if (!place) {
            return;
        }
        const auto folder = folders_.find(std::string(place->folder));
        if (folder != folders_.end()) {
            names_.insert(folder->second + std::string(place->name));
        }
    };
    const Drained drained = readAll([&](const native::FanotifyRecord& record) {
        add(record.place);
        add(record.from);
        add(record.to);
    });
    for (const std::string& name : names_) {
        note(name);
    }
    if (::write(log_.get(), pending_.data(), pending_.size()) < 0 || ::fdatasync(log_.get()) != 0) {
        fail("write");
    }
    return drained;
}

void EventFloor::note(const std::string& name) {
    struct statx status{};
    const bool isThere = ::statx(rootFolder_.get(), name.c_str(),
                                 AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT | AT_STATX_DONT_SYNC,
                                 STATX_BASIC_STATS | STATX_BTIME, &status) == 0;
    const std::size_t start = pending_.size();
    append(pending_, isThere ? status.stx_ino : 0);
    append(pending_, static_cast<std::uint32_t>(name.size()));
    const auto bytes = std::as_bytes(std::span(name));
    pending_.insert(pending_.end(), bytes.begin(), bytes.end());
    append(pending_, native::crc32c(std::span(pending_).subspan(start)));
}

}  // namespace marrowdale::benchmarks
