#pragma once

#include <chrono>
#include <compare>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Date.h"
#include "platform/foundation/Log.h"
#include "platform/linux/events/Watcher.h"
#include "platform/linux/files/PackageTypes.h"
#include "platform/linux/store/Retention.h"

namespace marrowdale::native {

// A folder that a store records beside its root: an application's documents.
struct LibraryFolder {
    // Names it for good: what was known of it is found again under it. 1 to 254 bytes, no "/".
    std::string key;
    std::string path;  // absolute, no links in it

    friend auto operator<=>(const LibraryFolder&, const LibraryFolder&) = default;
};

// What a store is opened with. Paths are absolute.
struct StoreOptions {
    enum class Recording : std::uint8_t {
        // Looks at the tree when it is opened, and when something is asked that it does not know.
        once,
        // Listens, and works through what it was told when somebody wants to know.
        whenAsked,
        // Goes on listening, on a thread of its own, and records what happens as it happens.
        live,
    };
    // Holds the stores of all root folders that were ever opened with it, and one lock. Made (mode
    // 0700) when missing, with the folders above it. It may lie below the root: then it is never
    // indexed.
    std::string stateFolder;
    // Holds the witness of the last identifiers, which tells a store that was restored from a
    // back-up. Made when missing; empty for none. A cache folder that can't be written costs that
    // protection, nothing else (StoreReport::witness says so). Never indexed either.
    std::string cacheFolder;
    // The folder whose tree is indexed, canonical (no links in it). Must exist and be a folder.
    std::string rootPath;
    // Folders outside of the root whose trees are recorded beside it from the start; see
    // Store::setLibraries. Options that are named one by one may leave it out.
    std::vector<LibraryFolder> libraries = {};  // NOLINT(readability-redundant-member-init)
    // How long to wait while another process has the store. Zero: not at all; no value: for ever.
    std::optional<std::chrono::milliseconds> lockWait = std::chrono::milliseconds(0);
    // Asked while another process has the store, whenever something appears in the state folder:
    // true ends the waiting. May be null.
    std::function<bool()> isServed = nullptr;
    // May be null. Must outlive the store.
    Log* log = nullptr;
    // Extended attributes whose names (without the system's prefix) begin so belong to documents:
    // they are kept, and put on the file in which a document comes to rest, where it has none.
    std::string carriedAttributePrefix = "com.quillory.";
    Recording recording = Recording::once;
    // The kind of watcher to use; none: the best there is.
    std::optional<Watcher::Kind> watcher = std::nullopt;
    // Which folders are packages; null: those that are whatever applications say. Must outlive the
    // store.
    const PackageTypes* packages = nullptr;
    // How much history is kept.
    Retention retention = {};
    // Says how old history is.
    std::function<Date()> clock = Date::now;
};

}  // namespace marrowdale::native
