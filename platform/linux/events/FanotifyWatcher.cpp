#include "platform/linux/events/FanotifyWatcher.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/fanotify.h>
#include <utility>

#include "platform/linux/events/FanotifyMasks.h"
#include "platform/linux/events/KernelLimit.h"
#include "platform/linux/files/FileHandle.h"

namespace marrowdale::native {

namespace {

// Of name_to_handle_at: a handle that only names, which file systems give that can't open one. It
// is younger than the headers.
constexpr int onlyNaming = 0x200;

Expected<FileHandle> handleOf(int file) {
    Expected<FileHandle> handle = fileHandle(file, "");
    if (!handle && handle.error().code == EOPNOTSUPP) {
        handle = fileHandle(file, "", onlyNaming);
    }
    if (!handle) {
        return Unexpected(errorWithPOSIXCode(handle.error().code, "name_to_handle_at", {}));
    }
    return handle;
}

std::uint64_t maskOf(Watched::Role role) {
    switch (role) {
        case Watched::Role::file:
            return FanotifyMasks::file;
        case Watched::Role::root:
            return FanotifyMasks::folder | FanotifyMasks::rootToo;
        case Watched::Role::folder:
            break;
    }
    return FanotifyMasks::folder;
}

}  // namespace

Expected<std::unique_ptr<FanotifyWatcher>> FanotifyWatcher::create(
    std::string reason, Queue queue, std::shared_ptr<FanotifyCalls> calls) {
    const unsigned flags = FAN_CLASS_NOTIF | FAN_CLOEXEC | FAN_NONBLOCK |
                           FAN_REPORT_DFID_NAME_TARGET |
                           (queue == Queue::unlimited ? FAN_UNLIMITED_QUEUE : 0U);
    UniqueFD group(calls->init(flags, O_RDONLY | O_CLOEXEC));
    if (!group) {
        return Unexpected(errorWithPOSIXCode(errno, "fanotify_init", {}));
    }
    const std::uint64_t limit =
        queue == Queue::unlimited ? 0 : kernelLimit("fanotify/max_queued_events");
    return std::unique_ptr<FanotifyWatcher>(
        new FanotifyWatcher(std::move(group), std::move(reason), limit, std::move(calls)));
}

FanotifyWatcher::FanotifyWatcher(UniqueFD group, std::string reason, std::uint64_t queueLimit,
                                 std::shared_ptr<FanotifyCalls> calls)
    : group_(std::move(group)),
      reason_(std::move(reason)),
      queueLimit_(queueLimit),
      calls_(std::move(calls)),
      queue_(queueLimit) {}

Expected<void> FanotifyWatcher::mark(int file, unsigned action, Watched::Role role) {
    const unsigned flags = action | (role == Watched::Role::file ? 0U : FAN_MARK_ONLYDIR);
    // By the descriptor, so that no other folder can stand at its path by then. One that was opened
    // with O_PATH is refused as that and taken as the place to look "." up in.
    if (calls_->mark(group_.get(), flags, maskOf(role), file, nullptr) == 0) {
        return {};
    }
    int code = errno;
    if (code == EBADF && calls_->mark(group_.get(), flags, maskOf(role), file, ".") == 0) {
        return {};
    }
    code = code == EBADF ? errno : code;
    return Unexpected(errorWithPOSIXCode(code, "fanotify_mark", {}));
}

Expected<void> FanotifyWatcher::tryFolder(int folder) {
    const auto handle = handleOf(folder);
    if (!handle) {
        return Unexpected(handle.error());
    }
    const auto marked = mark(folder, FAN_MARK_ADD, Watched::Role::root);
    return marked ? mark(folder, FAN_MARK_REMOVE, Watched::Role::root) : marked;
}

Expected<void> FanotifyWatcher::watch(int file, FileID number, Watched::Role role) {
    const auto handle = handleOf(file);
    if (!handle) {
        return Unexpected(handle.error());
    }
    // Whoever reads an event that is queued once the mark is set finds the folder in the table.
    const MutexLock lock(mutex_);
    const auto marked = mark(file, FAN_MARK_ADD, role);
    if (marked) {
        watched_.watch(number, handle->bytes(), role);
    }
    return marked;
}

Expected<void> FanotifyWatcher::watchFolder(int folder, FileID number) {
    return watch(folder, number, Watched::Role::folder);
}

Expected<void> FanotifyWatcher::watchRoot(int folder, FileID number) {
    return watch(folder, number, Watched::Role::root);
}

Expected<void> FanotifyWatcher::watchFile(int file, FileID number) {
    return watch(file, number, Watched::Role::file);
}

void FanotifyWatcher::unwatch(FileID number) {
    const MutexLock lock(mutex_);
    watched_.unwatch(number);
}

Expected<Watcher::Drained> FanotifyWatcher::drain(const Sink& sink) {
    return queue_.drain(
        [&](void* buffer, std::size_t size) { return calls_->read(group_.get(), buffer, size); },
        [&](std::span<const std::byte> bytes, Drained& drained) { take(bytes, drained, sink); });
}

void FanotifyWatcher::take(std::span<const std::byte> bytes, Drained& drained, const Sink& sink) {
    bool overflowed = false;
    FanotifyRecords records(bytes);
    while (const auto record = records.next()) {
        ++drained.events;
        ++events_;
        overflowed = overflowed || record->isOverflow();
        tell(*record, resolve(*record), sink);
    }
    // What can't be read is as good as lost.
    if (overflowed || records.isMalformed()) {
        ++overflows_;
        drained.overflowed = true;
    }
}

FanotifyWatcher::Resolved FanotifyWatcher::resolve(const FanotifyRecord& record) {
    const FanotifyRecord::Place nowhere;  // an empty handle is nobody's
    const MutexLock lock(mutex_);
    const Resolved resolved{watched_.find(record.place.value_or(nowhere).folder),
                            watched_.find(record.from.value_or(nowhere).folder),
                            watched_.find(record.to.value_or(nowhere).folder),
                            watched_.find(record.thing)};
    // The mark of a removed folder went with it.
    constexpr std::uint64_t folderGone = FAN_DELETE | FAN_ONDIR;
    if (resolved.thing && (record.mask & folderGone) == folderGone) {
        watched_.forget(record.thing);
    }
    return resolved;
}

void FanotifyWatcher::tell(const FanotifyRecord& record, const Resolved& resolved,
                           const Sink& sink) {
    const std::uint32_t what = FanotifyMasks::what(record.mask);
    tellRename(record, resolved, sink);
    if (resolved.place) {
        const bool aboutRoot =
            resolved.place->role == Watched::Role::root && record.place->name.empty();
        WatchHint hint;
        hint.what = aboutRoot ? what : what & ~WatchHint::rootMoved;
        hint.folder = resolved.place->number;
        hint.name = record.place->name;
        if (hint.what != 0) {
            sink(hint);
        }
    }
    if (resolved.thing && resolved.thing->role == Watched::Role::file &&
        (what & WatchHint::changed) != 0) {
        WatchHint hint;
        hint.what = WatchHint::changed;
        hint.file = resolved.thing->number;
        sink(hint);
    }
}

void FanotifyWatcher::tellRename(const FanotifyRecord& record, const Resolved& resolved,
                                 const Sink& sink) {
    if (resolved.from) {
        WatchHint hint;
        hint.what = WatchHint::movedFrom;
        hint.folder = resolved.from->number;
        hint.name = record.from->name;
        sink(hint);
    }
    if (resolved.to) {
        WatchHint hint;
        hint.what = WatchHint::movedTo;
        hint.folder = resolved.to->number;
        hint.name = record.to->name;
        hint.fromFolder = resolved.from ? resolved.from->number : FileID{};
        hint.fromName = resolved.from ? record.from->name : std::string_view();
        hint.fingerprint = record.thing.empty() ? 0 : fingerprintOfHandle(record.thing);
        sink(hint);
    }
}

Watcher::Status FanotifyWatcher::status() const {
    Status status;
    status.kind = Kind::fanotify;
    status.reason = reason_;
    status.marksLimit = kernelLimit("fanotify/max_user_marks");
    status.queueLimit = queueLimit_;
    status.events = events_;
    status.overflows = overflows_;
    const MutexLock lock(mutex_);
    status.marks = watched_.size();
    return status;
}

}  // namespace marrowdale::native
