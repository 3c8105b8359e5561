#include "platform/linux/store/Reconciler.h"

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <system_error>
#include <thread>
#include <utility>

#include "platform/linux/store/FolderDigest.h"

namespace marrowdale::native {

namespace {

constexpr std::size_t crawlBuffer = 256U << 10U;
constexpr std::size_t batchSize = 512;
constexpr std::size_t reportedPaths = 100;
// Folders that keep changing are listed again this often; what is in limbo then stays there until
// the next reconcile.
constexpr int mostRounds = 5;
constexpr std::int64_t clockTick = 10'000'000;

bool isWithinTick(const Date& modified, const Date& now) {
    const std::int64_t seconds = now.seconds - modified.seconds;
    return seconds <= 1 && seconds * 1'000'000'000 + now.nanoseconds -
                                   static_cast<std::int64_t>(modified.nanoseconds) <
                               clockTick;
}

void note(std::vector<std::string>& paths, std::uint64_t& count, std::string path) {
    ++count;
    if (paths.size() < reportedPaths) {
        paths.push_back(std::move(path));
    }
}

}  // namespace

Reconciler::Reconciler(const TreeScope& scope)
    : mutex_(scope.mutex),
      index_(scope.index),
      changes_(scope.changes),
      merger_(scope.index, scope.changes, scope.saves),
      watches_(scope.watches),
      carrier_(scope.carrier),
      roots_(scope.roots),
      device_(scope.device),
      skipped_(scope.skipped) {}

Expected<ReconcileReport> Reconciler::run() {
    startAtRoots();
    return walkUntilSettled(Threads::two);
}

Expected<ReconcileReport> Reconciler::runOn(std::vector<RowNumber> folders) {
    {
        const MutexLock lock(mutex_);
        stack_ = std::move(folders);
    }
    return walkUntilSettled(Threads::one);
}

Expected<ReconcileReport> Reconciler::walkUntilSettled(Threads threads) {
    const auto started = std::chrono::steady_clock::now();
    settled_ = false;
    for (int round = 0; round < mostRounds && !settled_; ++round) {
        walk(threads);
        // What changes in a watched folder after it was listed is told.
        settled_ = (watches_.isWatching() && watches_.isComplete()) || !pushChangedFolders();
    }
    const MutexLock lock(mutex_);
    if (failure_) {
        return Unexpected(*failure_);
    }
    report_.finished = Date::now();
    report_.duration = std::chrono::steady_clock::now() - started;
    return report_;
}

// A library that can't be recorded now keeps what is known of it.
void Reconciler::startAtRoots() {
    const auto libraries = roots_.libraries();
    const MutexLock lock(mutex_);
    stack_.push_back(rootRow);
    for (const auto& library : libraries) {
        const RowNumber row = index_.child(rootRow, library->storedPath());
        if (row != noRow && library->isOpen()) {
            stack_.push_back(row);
        }
    }
}

void Reconciler::walk(Threads threads) {
    std::thread second;
    try {
        if (threads == Threads::two) {
            second = std::thread([this] { work(); });
        }
    } catch (const std::system_error&) {
        work();  // one thread does it too
        return;
    }
    work();
    if (second.joinable()) {
        second.join();
    }
}

void Reconciler::work() {
    while (auto next = takeFolder()) {
        visit(*next);
        const MutexLock lock(mutex_);
        index_.row(next->folder).set(Row::visiting, false);
        --busy_;
        stack_.insert(stack_.end(), later_.begin(), later_.end());
        later_.clear();
        changed_.notify_all();
    }
}

// No value when the walk is over.
std::optional<Reconciler::Visit> Reconciler::takeFolder() {
    const MutexLock lock(mutex_);
    while (true) {
        while (stack_.empty() && busy_ > 0) {
            changed_.wait(mutex_);
        }
        if (stack_.empty() || failure_) {
            stack_.clear();
            return std::nullopt;
        }
        Visit next;
        next.folder = stack_.back();
        stack_.pop_back();
        Row& row = index_.row(next.folder);
        if (row.has(Row::visiting)) {
            later_.push_back(next.folder);
            continue;
        }
        // One that went to limbo meanwhile is met again, or gone.
        if (index_.path(next.folder, next.path)) {
            row.set(Row::visiting, true);
            next.cursor = row.firstChild();
            ++busy_;
            return next;
        }
        missed_.push_back(next.folder);
    }
}

void Reconciler::visit(Visit& visit) {
    Batch batch;
    const Outcome outcome = list(visit, batch);
    if (outcome == Outcome::unreadable) {
        noteUnreadable(visit);
    }
    finishFolder(visit, outcome);
}

void Reconciler::noteUnreadable(const Visit& visit) {
    const auto place = roots_.place(visit.path);
    if (!place) {
        return;
    }
    if (const auto status = statEntry(place->folder(), place->path.c_str())) {
        const MutexLock lock(mutex_);
        merger_.noteFolderDigest(visit.folder, folderDigest(-1, *status));
        watches_.noteUnwatched(status->fileID, "can't read " + visit.path);
    }
}

Reconciler::Outcome Reconciler::outcomeOf(const Error& error) {
    switch (error.code) {
        case ENOENT:
        case ENOTDIR:
        case ELOOP:
        case EXDEV:
        case ESTALE:
            return Outcome::vanished;
        case EMFILE:
        case ENFILE:
        case ENOMEM: {
            const MutexLock lock(mutex_);
            failure_ = failure_ ? failure_ : error;
            return Outcome::unreadable;
        }
        default:
            return Outcome::unreadable;
    }
}

Reconciler::Outcome Reconciler::list(Visit& visit, Batch& batch) {
    const auto place = roots_.place(visit.path);
    auto folder = place ? openFolderBeneath(place->folder(), place->path)
                        : Unexpected(errorWithPOSIXCode(ENOENT, "list", visit.path));
    if (!folder) {
        return outcomeOf(folder.error());
    }
    const Date now = Date::now();
    const auto status = statEntry(folder->get(), "");
    if (!status) {
        return outcomeOf(status.error());
    }
    {
        const MutexLock lock(mutex_);
        if (status->device != device_ || raw(status->fileID) != index_.row(visit.folder).fileID) {
            return Outcome::vanished;
        }
    }
    watches_.watchFolder(folder->get(), status->fileID, place->path.empty());
    const std::uint32_t digest = folderDigest(folder->get(), *status);
    {
        const MutexLock lock(mutex_);
        stamps_.push_back({visit.folder, isWithinTick(status->modified, now), status->modified});
        merger_.noteFolderDigest(visit.folder, digest);
    }
    DirectoryReader reader(std::move(*folder), crawlBuffer);
    bool atEnd = false;
    while (!atEnd) {
        const Outcome outcome = fillBatch(visit, reader, batch, atEnd);
        if (outcome != Outcome::listed) {
            return outcome;
        }
        mergeBatch(visit, reader.descriptor(), batch);
    }
    return Outcome::listed;
}

Reconciler::Outcome Reconciler::fillBatch(Visit& visit, DirectoryReader& reader, Batch& batch,
                                          bool& atEnd) {
    batch.clear();
    batch.lookedAt = Date::now();
    while (batch.entries.size() < batchSize) {
        const auto entry = reader.next();
        if (!entry) {
            return outcomeOf(entry.error());
        }
        if (!*entry) {
            atEnd = true;
            break;
        }
        const auto status = statEntry(reader.descriptor(), (*entry)->cName());
        if (!status) {
            if (status.error().code == ENOENT) {
                continue;
            }
            return outcomeOf(status.error());
        }
        if (isForeign(*status)) {
            keepMountPoint(visit, (*entry)->name);
        } else if (std::ranges::find(skipped_, status->fileID) == skipped_.end()) {
            watches_.watchFile(reader.descriptor(), (*entry)->cName(), *status);
            addToBatch(**entry, *status, batch);
        }
    }
    return Outcome::listed;
}

void Reconciler::addToBatch(const DirectoryReader::Entry& entry, const EntryStatus& status,
                            Batch& batch) {
    batch.entries.push_back({batch.names.size(), entry.name.size(), status});
    batch.names.append(entry.name);
    batch.names.push_back('\0');
}

// A folder of the same file system that is bound to another place has two places in the tree, and a
// place outside of it may be bound into it.
bool Reconciler::isForeign(const EntryStatus& status) const {
    return status.device != device_ || status.isMountPoint;
}

// What was known under the name is hidden by the mount, not gone.
void Reconciler::keepMountPoint(const Visit& visit, std::string_view name) {
    const MutexLock lock(mutex_);
    const RowNumber known = index_.child(visit.folder, name);
    if (known != noRow) {
        index_.row(known).set(Row::seen, true);
    }
    const std::string path =
        visit.path.empty() ? std::string(name) : visit.path + "/" + std::string(name);
    if (std::ranges::find(report_.skippedMounts, path) == report_.skippedMounts.end()) {
        note(report_.skippedMounts, report_.skippedMountCount, path);
    }
}

void Reconciler::meet(RowNumber row) {
    Row& met = index_.row(row);
    met.set(Row::seen, true);
    if (met.isFolder()) {
        stack_.push_back(row);
        changed_.notify_one();
    }
}

// Answers which entries are left.
std::vector<std::size_t> Reconciler::passUnchanged(Visit& visit, const Batch& batch) {
    std::vector<std::size_t> left;
    const MutexLock lock(mutex_);
    report_.entries += batch.entries.size();
    for (std::size_t i = 0; i < batch.entries.size(); ++i) {
        const Found& entry = batch.entries[i];
        const RowNumber row =
            merger_.unchangedRow(visit.folder, batch.name(entry), entry.status, visit.cursor);
        if (row == noRow) {
            left.push_back(i);
            continue;
        }
        meet(row);
        visit.cursor = index_.row(row).next;
    }
    return left;
}

void Reconciler::mergeBatch(Visit& visit, int folder, const Batch& batch) {
    struct Looked {
        std::size_t entry;
        EntryLook look;
    };
    std::vector<Looked> looked;
    for (const std::size_t i : passUnchanged(visit, batch)) {
        // The handle first and then the status again: both are of what stands there now, or the
        // folder is seen to have changed since it was listed.
        const char* name = batch.names.data() + batch.entries[i].nameStart;
        const auto fingerprint = handleFingerprint(folder, name);
        const auto status = statEntry(folder, name);
        if (status && !isForeign(*status)) {
            const EntryStatus& before = batch.entries[i].status;
            const bool same =
                fingerprint && status->fileID == before.fileID && status->birth == before.birth;
            auto attributes = status->isRegular() ? carrier_.read(folder, name) : std::nullopt;
            looked.push_back(
                {i, {*status, same ? *fingerprint : 0, batch.lookedAt, std::move(attributes)}});
        }
    }
    const MutexLock lock(mutex_);
    for (const Looked& entry : looked) {
        const std::string_view name = batch.name(batch.entries[entry.entry]);
        const RowNumber row = merger_.merge(visit.folder, name, entry.look);
        if (row == noRow) {
            unsettled_ = true;
        } else {
            meet(row);
        }
    }
}

void Reconciler::setUnreadable(RowNumber folder, bool unreadable) {
    if (index_.row(folder).has(Row::unreadable) != unreadable) {
        index_.row(folder).set(Row::unreadable, unreadable);
        index_.markDirty(folder);
    }
}

void Reconciler::finishFolder(const Visit& visit, Outcome outcome) {
    const MutexLock lock(mutex_);
    RowNumber next = index_.row(visit.folder).firstChild();
    while (next != noRow) {
        const RowNumber child = next;
        Row& row = index_.row(child);
        next = row.next;
        if (row.has(Row::seen)) {
            row.set(Row::seen, false);
        } else if (outcome == Outcome::listed && !index_.isLibrary(child)) {
            changes_.leave(child);
        }
    }
    if (outcome == Outcome::vanished) {
        unsettled_ = true;
        missed_.push_back(visit.folder);
        return;
    }
    setUnreadable(visit.folder, outcome == Outcome::unreadable);
    index_.row(visit.folder).set(Row::unlisted, false);
    if (outcome == Outcome::unreadable) {
        note(report_.unreadableFolders, report_.unreadableFolderCount, visit.path);
    } else {
        ++report_.folders;
    }
}

bool Reconciler::hasChanged(const Stamp& stamp) {
    std::string path;
    {
        const MutexLock lock(mutex_);
        if (index_.row(stamp.folder).isFree() || !index_.path(stamp.folder, path)) {
            return false;
        }
    }
    const auto place = roots_.place(path);
    const auto status = place ? statEntry(place->folder(), place->path.c_str())
                              : Unexpected(errorWithPOSIXCode(ENOENT, "look at", path));
    return !status || stamp.unsure || status->modified != stamp.modified;
}

// Only where something was not met, or was met in an odd way, is it worth a look at every folder.
// True when there is something to walk again.
bool Reconciler::pushChangedFolders() {
    std::vector<Stamp> stamps;
    {
        const MutexLock lock(mutex_);
        if (failure_ || (!index_.hasLimbo() && !unsettled_)) {
            return false;
        }
        unsettled_ = false;
        stamps.swap(stamps_);
    }
    if (std::ranges::any_of(stamps, &Stamp::unsure)) {
        // Listed within a tick of its last change: the same time may stand for another one.
        constexpr timespec tick{.tv_sec = 0, .tv_nsec = clockTick + 1'000'000};
        ::clock_nanosleep(CLOCK_MONOTONIC, 0, &tick, nullptr);
    }
    std::vector<RowNumber> again;
    std::vector<Stamp> kept;
    for (const Stamp& stamp : stamps) {
        if (hasChanged(stamp)) {
            again.push_back(stamp.folder);
        } else {
            kept.push_back(stamp);
        }
    }
    const MutexLock lock(mutex_);
    stamps_.insert(stamps_.end(), kept.begin(), kept.end());
    stack_ = again;
    return !again.empty();
}

}  // namespace marrowdale::native
