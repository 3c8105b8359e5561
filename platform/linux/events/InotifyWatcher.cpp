#include "platform/linux/events/InotifyWatcher.h"

#include <cerrno>
#include <sys/inotify.h>
#include <utility>

#include "platform/linux/events/InotifyMasks.h"
#include "platform/linux/events/KernelLimit.h"

namespace marrowdale::native {

namespace {

std::uint32_t maskOf(Watched::Role role) {
    switch (role) {
        case Watched::Role::file:
            return InotifyMasks::file;
        case Watched::Role::root:
            return InotifyMasks::folder | InotifyMasks::rootToo;
        case Watched::Role::folder:
            break;
    }
    return InotifyMasks::folder;
}

}  // namespace

Expected<std::unique_ptr<InotifyWatcher>> InotifyWatcher::create(
    std::string reason, std::shared_ptr<InotifyCalls> calls) {
    UniqueFD group(calls->init(IN_NONBLOCK | IN_CLOEXEC));
    if (!group) {
        return Unexpected(errorWithPOSIXCode(errno, "inotify_init1", {}));
    }
    return std::unique_ptr<InotifyWatcher>(
        new InotifyWatcher(std::move(group), std::move(reason), std::move(calls)));
}

InotifyWatcher::InotifyWatcher(UniqueFD group, std::string reason,
                               std::shared_ptr<InotifyCalls> calls)
    : group_(std::move(group)),
      reason_(std::move(reason)),
      queueLimit_(kernelLimit("inotify/max_queued_events")),
      calls_(std::move(calls)),
      queue_(queueLimit_) {}

Expected<int> InotifyWatcher::add(int file, Watched::Role role) {
    // Through the open folder, so that no other can stand at its path by then. What is watched
    // already keeps what was asked for before (a root that comes again as a folder).
    const std::string path = "/proc/self/fd/" + std::to_string(file);
    const int watch = calls_->add(group_.get(), path.c_str(), maskOf(role) | IN_MASK_ADD);
    if (watch < 0) {
        return Unexpected(errorWithPOSIXCode(errno, "inotify_add_watch", {}));
    }
    return watch;
}

Expected<void> InotifyWatcher::tryFolder(int folder) {
    const auto watch = add(folder, Watched::Role::root);
    if (!watch) {
        return Unexpected(watch.error());
    }
    if (calls_->remove(group_.get(), *watch) != 0) {
        return Unexpected(errorWithPOSIXCode(errno, "inotify_rm_watch", {}));
    }
    return {};
}

Expected<void> InotifyWatcher::watch(int file, FileID number, Watched::Role role) {
    // Whoever reads an event that is queued once the watch is set finds the folder in the table.
    const MutexLock lock(mutex_);
    const auto watch = add(file, role);
    if (!watch) {
        return Unexpected(watch.error());
    }
    const auto earlier = watched_.watch(number, *watch, role);
    if (earlier) {
        // It went with its folder, most often; then there is nothing to remove.
        (void)calls_->remove(group_.get(), *earlier);
    }
    return {};
}

Expected<void> InotifyWatcher::watchFolder(int folder, FileID number) {
    return watch(folder, number, Watched::Role::folder);
}

Expected<void> InotifyWatcher::watchRoot(int folder, FileID number) {
    return watch(folder, number, Watched::Role::root);
}

Expected<void> InotifyWatcher::watchFile(int file, FileID number) {
    return watch(file, number, Watched::Role::file);
}

void InotifyWatcher::unwatch(FileID number) {
    const MutexLock lock(mutex_);
    const auto watch = watched_.unwatch(number);
    if (watch) {
        // It went with its folder, most often; then there is nothing to remove.
        (void)calls_->remove(group_.get(), *watch);
    }
}

Expected<Watcher::Drained> InotifyWatcher::drain(const Sink& sink) {
    moves_.clear();
    return queue_.drain(
        [&](void* buffer, std::size_t size) { return calls_->read(group_.get(), buffer, size); },
        [&](std::span<const std::byte> bytes, Drained& drained) { take(bytes, drained, sink); });
}

void InotifyWatcher::take(std::span<const std::byte> bytes, Drained& drained, const Sink& sink) {
    bool overflowed = false;
    InotifyRecords records(bytes);
    while (const auto record = records.next()) {
        ++drained.events;
        ++events_;
        overflowed = overflowed || (record->mask & IN_Q_OVERFLOW) != 0;
        const auto watched = resolve(*record);
        if (watched) {
            tell(*record, *watched, sink);
        }
    }
    // What can't be read is as good as lost.
    if (overflowed || records.isMalformed()) {
        ++overflows_;
        drained.overflowed = true;
    }
}

std::optional<Watched> InotifyWatcher::resolve(const InotifyRecord& record) {
    const MutexLock lock(mutex_);
    const auto watched = watched_.find(record.watch);
    if ((record.mask & IN_IGNORED) != 0) {
        watched_.forget(record.watch);
    }
    return watched;
}

void InotifyWatcher::tell(const InotifyRecord& record, const Watched& watched, const Sink& sink) {
    const std::uint32_t what = InotifyMasks::what(record.mask);
    const bool aboutRoot = watched.role == Watched::Role::root && record.name.empty();
    WatchHint hint;
    if (watched.role == Watched::Role::file) {
        hint.what = what & WatchHint::changed;
        hint.file = watched.number;
    } else {
        hint.what = aboutRoot ? what : what & ~WatchHint::rootMoved;
        hint.folder = watched.number;
        hint.name = record.name;
    }
    if (hint.what == 0) {
        return;
    }
    OldPlace old;
    if ((hint.what & WatchHint::movedFrom) != 0) {
        moves_[record.cookie] = {watched.number, std::string(record.name)};
    } else if ((hint.what & WatchHint::movedTo) != 0) {
        auto half = moves_.extract(record.cookie);
        old = half ? std::move(half.mapped()) : OldPlace{};
        hint.fromFolder = old.folder;
        hint.fromName = old.name;
    }
    sink(hint);
}

Watcher::Status InotifyWatcher::status() const {
    Status status;
    status.kind = Kind::inotify;
    status.reason = reason_;
    status.marksLimit = kernelLimit("inotify/max_user_watches");
    status.queueLimit = queueLimit_;
    status.events = events_;
    status.overflows = overflows_;
    const MutexLock lock(mutex_);
    status.marks = watched_.size();
    return status;
}

}  // namespace marrowdale::native
