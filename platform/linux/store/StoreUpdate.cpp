// Bringing the index up to what is on disk: by a look at everything, or at the places that the
// watcher named. Both end alike, with one commit of rows and events.

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <fcntl.h>
#include <iterator>
#include <new>
#include <utility>

#include "platform/linux/store/DiskCheck.h"
#include "platform/linux/store/LiveUpdate.h"
#include "platform/linux/store/StoreCore.h"

namespace marrowdale::native {

namespace {

// Batches of hints that one pass works through before it lets others have their turn.
constexpr int mostRounds = 64;
// Walks that one pass makes when so much happens under them that one does not see it all.
constexpr int mostWalks = 3;
// Rows that are looked at once more, so that no doubt is left for the next start.
constexpr std::size_t mostUnsure = 1000;

}  // namespace

void Store::Core::waitUntilIdle() {
    while (updating_) {
        idle_.wait(mutex_);
    }
}

std::vector<FileID> Store::Core::unindexedFolders() const {
    std::vector<FileID> folders;
    for (const std::string& path : {state_.path(), cacheFolder_}) {
        if (path.empty()) {
            continue;
        }
        const auto status = statEntry(AT_FDCWD, path.c_str());
        if (status && status->device == device_) {
            folders.push_back(status->fileID);
        }
    }
    return folders;
}

TreeScope Store::Core::scope() {
    return {.index = index_,
            .mutex = mutex_,
            .changes = changes_,
            .saves = saves_,
            .watches = *watches_,
            .carrier = carrier_,
            .roots = roots_,
            .device = device_,
            .skipped = unindexedFolders()};
}

Expected<void> Store::Core::reconcile() {
    if (auto done = runOnce(Pass::full); !done) {
        return done;
    }
    const MutexLock lock(mutex_);
    waitUntilIdle();
    return writeError_ ? Unexpected(*writeError_) : Expected<void>();
}

Expected<void> Store::Core::lookForMissing() {
    return runOnce(watcher_ ? Pass::hints : Pass::full);
}

Expected<EventID> Store::Core::barrier() {
    if (recording_ != StoreOptions::Recording::once) {
        if (auto done = lookForMissing(); !done) {
            return Unexpected(done.error());
        }
    }
    const MutexLock lock(mutex_);
    waitUntilIdle();
    if (auto committed = commit(); !committed) {
        return Unexpected(committed.error());
    }
    return EventID{journal_->lastEvent()};
}

Expected<void> Store::Core::runOnce(Pass pass) {
    {
        const MutexLock lock(mutex_);
        const auto& started = pass == Pass::full ? fullPassesStarted_ : passesStarted_;
        const std::uint64_t startedBefore = started;
        waitUntilIdle();
        if (started > startedBefore) {
            return lastRunError_ ? Unexpected(*lastRunError_) : Expected<void>();
        }
        updating_ = true;
        ++passesStarted_;
        fullPassesStarted_ += pass == Pass::full ? 1 : 0;
    }
    // However the pass ends, those who wait go on.
    Expected<void> done = Unexpected(errorWithPOSIXCode(ENOMEM, "look at", rootPath()));
    try {
        done = run(pass);
    } catch (const std::bad_alloc&) {
        // As it stands.
    }
    const MutexLock lock(mutex_);
    lastRunError_ = done ? std::optional<Error>() : done.error();
    updating_ = false;
    idle_.notify_all();
    return done;
}

// Where the disk is full the index is right all the same, and what is known can be answered; so a
// commit that fails is told to those who need one.
Expected<void> Store::Core::run(Pass pass) {
    if (auto root = checkRoot(); !root) {
        HintSet unused;
        (void)drain(unused);  // the root's own error is what counts
        mustLookAtAll_ = true;
        return root;
    }
    if (auto done = look(pass); !done) {
        mustLookAtAll_ = true;
        return done;
    }
    const MutexLock lock(mutex_);
    ++recorderReport_.passes;
    (void)commit();
    return {};
}

Expected<void> Store::Core::look(Pass pass) {
    const TreeScope tree = scope();
    if (pass == Pass::hints && !mustLookAtAll_) {
        const auto whole = runHints(tree);
        if (!whole) {
            return Unexpected(whole.error());
        }
        if (*whole) {
            return {};
        }
    }
    // Whoever asked for this pass counts on all of it; a tree that never rests is left to the next.
    mustLookAtAll_ = true;
    for (int walk = 0; walk < mostWalks && mustLookAtAll_; ++walk) {
        mustLookAtAll_ = false;
        if (auto done = runFull(tree); !done) {
            return done;
        }
    }
    return {};
}

// Another folder at the root's path, or none, is not to be taken for a tree that was emptied.
Expected<void> Store::Core::checkRoot() {
    const auto standing = statEntry(AT_FDCWD, rootPath().c_str());
    const auto held = statEntry(roots_.root().open.get(), "");
    std::optional<Error> problem;
    if (!standing || !held || standing->fileID != held->fileID ||
        standing->device != held->device) {
        problem =
            errorWithPOSIXCode(standing ? ESTALE : standing.error().code, "look at", rootPath());
    }
    noteRootProblem(problem);
    return problem ? Unexpected(*problem) : Expected<void>();
}

Expected<void> Store::Core::noteRootRow() {
    const Date now = Date::now();
    const int root = roots_.root().open.get();
    const auto status = statEntry(root, "");
    if (!status) {
        return Unexpected(errorWithPOSIXCode(status.error().code, "look at", rootPath()));
    }
    const auto fingerprint = handleFingerprint(root, "");
    const EntryLook look{*status, fingerprint ? *fingerprint : 0, now};
    const MutexLock lock(mutex_);
    if (index_.endOfRows() <= rootRow) {
        (void)index_.add(noRow, {}, EntryMerger::valuesOf(look));
    } else if (!EntryMerger::isUnchanged(index_.row(rootRow), *status)) {
        Row values = EntryMerger::valuesOf(look);
        values.set(Row::unreadable, index_.row(rootRow).has(Row::unreadable));
        index_.update(rootRow, values);
    }
    return {};
}

void Store::Core::noteRootProblem(const std::optional<Error>& problem) {
    bool isNew = false;
    {
        const MutexLock lock(mutex_);
        isNew = problem && !recorderReport_.rootProblem;
        recorderReport_.rootProblem = problem;
    }
    if (isNew) {
        tell(EventHistory::News::broken);
    }
}

Expected<bool> Store::Core::drain(HintSet& hints) {
    if (!watcher_) {
        return true;
    }
    const auto drained = watcher_->drain([&](const WatchHint& hint) { hints.add(hint); });
    if (!drained) {
        return Unexpected(drained.error());
    }
    if (drained->overflowed) {
        const MutexLock lock(mutex_);
        recorderReport_.lastOverflow = Date::now();
    }
    return !drained->overflowed;
}

Expected<bool> Store::Core::runHints(const TreeScope& scope) {
    if (auto known = followLibraries(scope); !known || !*known) {
        return known;
    }
    if (auto listed = listUnwatched(scope); !listed) {
        return Unexpected(listed.error());
    }
    const auto whole = followHints(scope);
    if (whole && *whole) {
        settle(SafeSaves::Knowledge::live);
    }
    return whole;
}

// Goes on while something is in limbo: a rename is queued before the look that missed the file, so
// one more reading of the queue tells where it went. When that brings nothing, it is gone.
Expected<bool> Store::Core::followHints(const TreeScope& scope) {
    HintSet hints;
    LiveUpdate update(scope);
    std::vector<HintSet::Hint> unreached;
    std::vector<RowNumber> missed;
    bool mayReach = false;
    for (int round = 0; round < mostRounds; ++round) {
        auto whole = drain(hints);
        if (!whole || !*whole) {
            return whole;
        }
        // Worth another try only when something moved.
        if (hints.empty() && !mayReach) {
            break;
        }
        const std::size_t unreachedBefore = unreached.size();
        const bool hasNews = !hints.empty();
        for (const HintSet::Hint& hint : std::exchange(unreached, {})) {
            hints.add(hint);
        }
        // What was read may be of a library that went, or came, just before.
        if (!hints.empty()) {
            if (auto known = followLibraries(scope); !known || !*known) {
                return known;
            }
        }
        auto left = update.process(hints);
        if (!left) {
            return Unexpected(left.error());
        }
        if (left->rootMoved) {
            if (auto root = checkRoot(); !root) {
                return Unexpected(root.error());
            }
        }
        unreached = std::move(left->hints);
        missed.insert(missed.end(), left->missedFolders.begin(), left->missedFolders.end());
        mayReach = !unreached.empty() && (hasNews || unreached.size() < unreachedBefore);
        const MutexLock lock(mutex_);
        if (unreached.empty() && !index_.hasLimbo()) {
            break;
        }
    }
    return !anyStands(missed) && (unreached.empty() || watches_->isComplete());
}

bool Store::Core::anyStands(std::span<const RowNumber> folders) {
    const MutexLock lock(mutex_);
    for (const RowNumber number : folders) {
        std::string path;
        const Row& row = index_.row(number);
        if (!row.isFree() && row.isFolder() && index_.path(number, path) && roots_.place(path)) {
            return true;
        }
    }
    return false;
}

Expected<void> Store::Core::listUnwatched(const TreeScope& scope) {
    std::vector<RowNumber> folders;
    for (const FileID folder : watches_->unwatched()) {
        const MutexLock lock(mutex_);
        const RowNumber number = folderRow(folder);
        if (number == noRow) {
            watches_->unwatch(folder);
        } else {
            folders.push_back(number);
        }
    }
    if (folders.empty()) {
        return {};
    }
    auto listed = Reconciler(scope).runOn(std::move(folders));
    return listed ? Expected<void>() : Unexpected(listed.error());
}

Expected<void> Store::Core::runFull(const TreeScope& scope) {
    HintSet hints;
    if (const auto drained = drain(hints); !drained) {  // what the walk sees anyway
        return Unexpected(drained.error());
    }
    bool isFresh = false;
    {
        const MutexLock lock(mutex_);
        isFresh = std::exchange(isFresh_, false);
        changes_.setSilent(isFresh);
    }
    auto noted = noteRootRow();
    if (noted) {
        (void)bindLibraries();
    }
    Reconciler reconciler(scope);
    auto report = noted ? reconciler.run() : Unexpected(noted.error());
    if (!report) {
        const MutexLock lock(mutex_);
        isFresh_ = isFresh;
        return Unexpected(report.error());
    }
    tellReturnedLibraries();
    // What happened under the walk was told; where too much happened, the next pass walks again.
    const auto whole = watcher_ ? followHints(scope) : Expected<bool>(true);
    if (!whole) {
        return Unexpected(whole.error());
    }
    mustLookAtAll_ = !*whole || (watcher_ && anyStands(reconciler.missedFolders()));
    if (*whole && reconciler.isSettled()) {
        settle(SafeSaves::Knowledge::result);
    }
    makeSure();
    const MutexLock lock(mutex_);
    changes_.setSilent(false);
    lastReconcile_ = std::move(*report);
    lastReconcile_.differences = index_.dirty().size();
    return {};
}

void Store::Core::settle(SafeSaves::Knowledge knowledge) {
    {
        const MutexLock lock(mutex_);
        auto transfers = saves_.settle(device_, knowledge, SafeSaves::Clock::now());
        std::ranges::move(transfers, std::back_inserter(uncarried_));
        removeLimbo();
    }
    carryAttributes();
}

// A file that can't be written to now may be so later; until then it has no tags, and the store
// keeps them.
void Store::Core::carryAttributes() {
    std::vector<SafeSaves::Transfer> left;
    for (SafeSaves::Transfer& transfer : std::exchange(uncarried_, {})) {
        std::vector<Place> places;
        {
            const MutexLock lock(mutex_);
            if (index_.row(transfer.to).document == transfer.document) {
                addPlace(transfer.to, places);
            }
        }
        if (places.empty() || transfer.attributes.empty()) {
            continue;
        }
        const Place& place = places.front();
        const auto found = roots_.place(place.path);
        const auto outcome = found ? carrier_.write(found->folder(), found->path,
                                                    FileID{place.row.fileID}, transfer.attributes)
                                   : AttributeCarrier::Outcome::refused;
        if (outcome == AttributeCarrier::Outcome::refused) {
            left.push_back(std::move(transfer));
        } else if (outcome == AttributeCarrier::Outcome::written) {
            noteCarried(place, transfer.attributes);
        }
    }
    uncarried_ = std::move(left);
}

void Store::Core::noteCarried(const Place& place, const CarriedAttributes& attributes) {
    auto look = lookAt(place);
    const MutexLock lock(mutex_);
    if (look && EntryMerger::isSameFile(index_.row(place.number), *look, true)) {
        look->attributes = attributes;
        EntryMerger(index_, changes_, saves_).noteChanged(place.number, *look);
    }
}

void Store::Core::removeLimbo() {
    for (const RowNumber number : index_.limboRows()) {
        changes_.remove(number);
    }
    for (const FileID folder : changes_.takeRemovedFolders()) {
        if (folderRow(folder) == noRow) {
            watches_->unwatch(folder);
        }
    }
}

// A change within a clock tick of an earlier one may not show in a file's times. Where nobody
// listens, the tick is waited for and the file looked at again, so that the next start is not in
// doubt about it.
void Store::Core::makeSure() {
    if (watcher_) {
        return;
    }
    std::vector<Place> unsure;
    {
        const MutexLock lock(mutex_);
        for (const RowNumber number : index_.dirty()) {
            const Row& row = index_.row(number);
            if (!row.isFree() && row.has(Row::unsure) && unsure.size() < mostUnsure) {
                addPlace(number, unsure);
            }
        }
    }
    if (unsure.empty()) {
        return;
    }
    constexpr timespec tick{.tv_sec = 0, .tv_nsec = 11'000'000};
    ::clock_nanosleep(CLOCK_MONOTONIC, 0, &tick, nullptr);
    for (const Place& place : unsure) {
        const auto look = lookAt(place);
        if (!look) {
            continue;
        }
        const MutexLock lock(mutex_);
        EntryMerger(index_, changes_, saves_).makeSure(place.number, *look);
    }
}

Expected<void> Store::Core::commit() {
    changes_.flush(events_);
    const bool hasEvents = !events_.empty();
    auto committed = journal_->commit(index_, events_, lastDocument_);
    if (committed) {
        writeError_.reset();
        if (hasEvents) {
            tell(EventHistory::News::committed);
        }
    } else {
        writeError_ = committed.error();
    }
    return committed;
}

// Something that a request saw moving is in limbo: where it went is found now, while it is known
// where it came from.
void Store::Core::finishUpdates() {
    bool isNeeded = false;
    {
        const MutexLock lock(mutex_);
        isNeeded = journal_ && watches_ && index_.hasLimbo();
    }
    // The next process would not know any more that a removal was ours.
    if (isNeeded || watcher_ || own_.hasRemovals()) {
        if (auto done = lookForMissing(); !done) {
            log("the last changes could not be looked at: " + done.error().description());
        }
    }
}

}  // namespace marrowdale::native
