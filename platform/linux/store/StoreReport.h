#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Date.h"
#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/events/Watcher.h"

namespace marrowdale::native {

// What the last reconcile found.
struct ReconcileReport {
    Date finished;
    std::chrono::nanoseconds duration{};
    std::uint64_t folders = 0;      // that were listed
    std::uint64_t entries = 0;      // that were looked at
    std::uint64_t differences = 0;  // rows that were made, changed, moved or removed
    // Paths below the root, absolute ones in libraries; the first 100 of each kind, the counts are
    // whole.
    std::vector<std::string> unreadableFolders;  // what was known below them is kept
    std::uint64_t unreadableFolderCount = 0;
    std::vector<std::string>
        skippedMounts;  // entries on which something is mounted, and subvolumes
    std::uint64_t skippedMountCount = 0;
};

// A folder that is recorded beside the root.
struct LibraryReport {
    std::string key;
    std::string path;
    std::optional<Error> problem;  // why it can't be recorded now; ENOENT: there is none
};

// How a store listens to what happens.
struct RecorderReport {
    bool isLive = false;
    std::optional<Watcher::Status> watcher;  // none: there is none, and `problem` says why
    std::string problem;                 // why there is no watcher, or why folders are not watched
    std::uint64_t unwatchedFolders = 0;  // listed again at each request instead
    std::uint64_t passes = 0;            // batches of hints that were worked through
    std::optional<Date> lastOverflow;    // the kernel's queue was full
    std::optional<Error> rootProblem;    // the root does not stand where it stood
};

// One of the stores in a state folder.
struct StoredRoot {
    std::string folder;    // where it lies
    std::string rootPath;  // where its root folder stood when it was last opened; empty when that
                           // can't be read
    std::uint64_t bytes = 0;
};

// The state of a store, for people. Sizes in bytes.
struct StoreReport {
    std::string stateFolder;
    std::string storeFolder;
    std::string rootPath;
    std::vector<StoredRoot> stores;  // all in the state folder, this one too
    UUID uuid;
    Date created;
    // Why this store was made in place of an earlier one, or beside that of an earlier folder at
    // the same path; empty when there was none before.
    std::string rebuildReason;
    // Where the earlier store was set aside; empty when there is none.
    std::string damagedFolder;
    // What stands in the way of the witness; empty when it is kept.
    std::string witness;
    std::uint64_t entries = 0;
    std::uint64_t documents = 0;  // entries that have a document identifier
    std::uint64_t memory = 0;     // held by the index
    std::uint64_t logBytes = 0;   // of the segments that the next start reads
    std::uint64_t snapshotBytes = 0;
    EventID lastEventID{};
    // The history that is kept: its first event (one more than the last when there is none), the
    // date at which it begins at the latest, and the size of all segments.
    EventID oldestEventID{};
    Date oldestEventDate;
    std::uint64_t events = 0;
    std::uint64_t historyBytes = 0;
    // What was found wrong with older history, which is therefore gone; empty when nothing was.
    std::string historyProblem;
    std::uint64_t documentIDsUsed = 0;  // given out or skipped, of 2^32 less the start
    std::uint64_t documentIDsLeft = 0;
    // The error that ended writing: no new identifiers are given out until the store is opened
    // again.
    std::optional<Error> writeError;
    ReconcileReport reconcile;
    RecorderReport recorder;
    std::vector<LibraryReport> libraries;
};

}  // namespace marrowdale::native
