#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Platform.h"
#include "platform/foundation/Error.h"
#include "platform/foundation/URL.h"
#include "platform/services/DirectoryEnumerator.h"
#include "providers/marrowdale/fs/FSWalkPosition.h"

namespace marrowdale {

// A listing request: which roots to walk, and which stretch of the walk to hand out. A plain value.
//
// One position counter runs across all roots. Hidden files and the contents of packages are left
// out, and, unless `recursively`, the contents of subfolders too.
struct FSDirectoryEnumerator {
    std::vector<URL> urls;  // walked in order
    bool recursively = false;
    std::uint64_t offset = 0;  // walked entries to pass over before the first one handed out
    std::uint64_t limit = 0;   // most entries to hand out; 0 hands out nothing
    // Told of each folder that the walk can't look into; answers whether to go on. Empty: a line
    // "can't enumerate PATH; ERROR" in the log, and on.
    std::function<bool(const URL&, const Error&)> errorHandler;
    // Options for a root in place of the defaults. Empty, or no options: the defaults.
    std::function<std::optional<DirectoryEnumerationOptions>(const URL&)>
        directoryEnumerationOptionsFor;

    // What each URL brings along, so that its reader need not ask the system again.
    ResourceKeySet keys;
    std::vector<std::string> attributeNames;

    // Where an earlier walk over the same roots stood after `offset` entries. None: the walk begins
    // at the first root and counts its way to the offset, without looking at the entries.
    std::optional<FSWalkPosition> startPosition;

    struct Result {
        // Entries walked since the beginning of the listing: the next page's offset. Below `offset`
        // when the roots hold fewer entries than that.
        std::uint64_t position = 0;
        // Set when the limit was reached: where the next page goes on, and the walk itself, which
        // may be handed in again with that position as long as its folders may be kept open.
        std::optional<FSWalkPosition> nextPosition;
        std::unique_ptr<DirectoryEnumerator> restingWalk;
    };
    // Appends the URLs handed out to `collected`. A root that can't be opened, and one that becomes
    // unreadable under the walk, is told to the log or the error handler and the walk goes on with
    // the next. An error means that the whole page is lost: document identifiers could not be made
    // durable.
    // `restingWalk`: the walk that came with `startPosition`, if it was kept.
    [[nodiscard]] Expected<Result> enumerate(
        const Platform& platform, std::vector<URL>& collected,
        std::unique_ptr<DirectoryEnumerator> restingWalk = nullptr) const;
};

}  // namespace marrowdale
