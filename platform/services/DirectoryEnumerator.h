#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/URL.h"

namespace marrowdale {

struct DirectoryEnumerationOptions {
    bool skipSubdirectoryDescendants = false;
    bool skipPackageDescendants = false;
    bool skipHiddenFiles = false;
    friend bool operator==(const DirectoryEnumerationOptions&,
                           const DirectoryEnumerationOptions&) = default;
};

// Where a walk stands between two entries: for each open folder, from the root of the walk down,
// its name below the one before (empty for the root), its number, and the system's position in it.
// Small enough to be kept by the dozen; holds nothing open. Positions stay good while folders
// change.
struct DirectoryPosition {
    struct Level {
        std::string name;
        FileID folder{};
        std::int64_t offset = 0;  // 0 is the start
        friend bool operator==(const Level&, const Level&) = default;
    };
    std::vector<Level> levels;  // empty: at the start
    bool atEnd = false;
    friend bool operator==(const DirectoryPosition&, const DirectoryPosition&) = default;
};

struct DirectoryEnumerationRequest {
    URL url;
    // Values to bring along on each URL. Keys not named here are read when somebody asks.
    ResourceKeySet keys;
    // Extended attributes to bring along (without the system's prefix).
    std::vector<std::string> attributeNames;
    // Whether each entry's status, links followed, is brought along too.
    bool prefetchStatus = true;
    DirectoryEnumerationOptions options;
    // Where to begin; the default is the start.
    DirectoryPosition position;
    // Told of each folder below the root that can't be opened, and of each folder, the root among
    // them, that can't be read; answers whether to go on.
    std::function<bool(const URL&, const Error&)> errorHandler;
};

// A walk over the entries of one folder, and of the folders below it where the options let it: each
// entry first, then what is in it; in the order of the directory, never sorted. "." and ".." never
// appear; neither does the walk's own folder. Links are entries and never followed. Entries that
// lie on another device (mount points) are walked over and never handed out nor entered.
//
// Threads: one at a time. Memory does not grow with the number of entries.
class DirectoryEnumerator {
  public:
    virtual ~DirectoryEnumerator() = default;

    // Walks past up to `count` entries without looking at them; answers how many there were (fewer
    // only at the end).
    [[nodiscard]] virtual Expected<std::uint64_t> skip(std::uint64_t count) = 0;

    // Walks up to `limit` entries and appends their URLs with the values asked for. Answers how
    // many entries were walked, fewer than `limit` only at the end; entries that vanished meanwhile
    // or lie on another device are counted and not appended. Document identifiers that are given
    // out on the way are durable when the call returns (one sync for all of them).
    //
    // An error ends the walk: the error handler said stop (without a handler: any of its cases but
    // vanished folders), or the identifiers could not be made durable (then nothing is appended).
    [[nodiscard]] virtual Expected<std::uint64_t> next(std::uint64_t limit,
                                                       std::vector<URL>& urls) = 0;

    // Where the walk stands now; a request with this position goes on from here. A folder on the
    // way that is gone or was replaced meanwhile is left out, the walk goes on behind it.
    [[nodiscard]] virtual DirectoryPosition position() const = 0;

    // Takes up a walk that has rested since the last call, with a new error handler. False when it
    // can't be: a folder it is in changed meanwhile, so what was read of it in advance is old. Then
    // the caller opens another one at `position()`.
    [[nodiscard]] virtual bool takeUp(
        std::function<bool(const URL&, const Error&)> /*errorHandler*/) {
        return false;
    }
};

}  // namespace marrowdale
