#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"

namespace marrowdale::native {

// What the kernel told of one name, for somebody to look at the disk there. Events that were queued
// together come merged, without the order in which they happened, so a hint says where to look and
// never what is there.
struct WatchHint {
    // Bits of `what`.
    static constexpr std::uint32_t changed = 1U;         // contents or metadata
    static constexpr std::uint32_t appeared = 1U << 1U;  // made or linked there
    static constexpr std::uint32_t gone = 1U << 2U;      // unlinked
    static constexpr std::uint32_t movedFrom = 1U << 3U;
    static constexpr std::uint32_t movedTo = 1U << 4U;
    // The watched thing itself was moved or removed, or its file system unmounted; told for the
    // root alone (`folder` is the root, `name` is empty).
    static constexpr std::uint32_t rootMoved = 1U << 5U;

    std::uint32_t what = 0;
    // The watched folder, by the number under which it was watched; 0 when the hint is about a file
    // that is watched itself (`file`).
    FileID folder{};
    // In that folder; empty: the folder itself. Good during the call.
    std::string_view name;
    FileID file{};  // 0, or the watched file
    // With movedTo: where it came from, when that is a watched folder; else 0 and empty. The hint
    // for the old place comes too.
    FileID fromFolder{};
    std::string_view fromName;
    // With movedTo: fingerprint of the handle of what was moved (handleFingerprint); 0: not told.
    std::uint32_t fingerprint = 0;
};

// Listens to what the kernel tells of folders. Two kinds: marks of fanotify, which any user may
// set, and watches of inotify where there is no fanotify for this user or file system.
//
// Threads: `drain` one at a time; everything else from any, while `drain` runs too.
class Watcher {
  public:
    enum class Kind : std::uint8_t { fanotify, inotify };

    struct Status {
        Kind kind = Kind::fanotify;
        std::string reason;            // why this kind and no other, for people
        std::uint64_t marks = 0;       // folders and files that are watched
        std::uint64_t marksLimit = 0;  // of this user, all his programs together; 0: not known
        std::uint64_t queueLimit = 0;  // events the kernel keeps; 0: not known
        std::uint64_t events = 0;      // read so far
        std::uint64_t overflows = 0;   // times the kernel's queue was full
    };

    struct Drained {
        std::uint64_t events = 0;
        // The kernel's queue was full: what it told is not all that happened.
        bool overflowed = false;
    };

    virtual ~Watcher() = default;

    // Watches the open folder (any descriptor of it, O_PATH too) under that number. What happens in
    // it after the call is told. Again for a folder that is watched already: success. Under a
    // number whose earlier folder is gone: the new one takes its place. Errors: ENOSPC when no more
    // can be watched; what the file system refuses (EOPNOTSUPP, ENODEV, EXDEV).
    [[nodiscard]] virtual Expected<void> watchFolder(int folder, FileID number) = 0;
    // The same for the root of the tree, of which its own moves are told too.
    [[nodiscard]] virtual Expected<void> watchRoot(int folder, FileID number) = 0;
    // Watches a file itself, for changes through names that are in no watched folder. `file` is
    // open for reading.
    [[nodiscard]] virtual Expected<void> watchFile(int file, FileID number) = 0;
    // Nothing is told of that number any more. Unknown numbers do nothing.
    virtual void unwatch(FileID number) = 0;

    // Reads everything that the kernel has queued, without waiting, and calls `sink` for each hint.
    // What was done before the call, by anybody, is among what is read by the time it returns.
    // Errors: reading fails (EIO, …).
    [[nodiscard]] virtual Expected<Drained> drain(
        const std::function<void(const WatchHint&)>& sink) = 0;

    // Readable (poll) when something is queued. The watcher's own.
    [[nodiscard]] virtual int descriptor() const = 0;

    [[nodiscard]] virtual Status status() const = 0;
};

// A watcher that works for the folder: fanotify where it does (`preferred` none), or the kind asked
// for. Sets and clears a mark to find out. Errors: neither works there; the error names both
// reasons.
[[nodiscard]] Expected<std::unique_ptr<Watcher>> makeWatcher(
    int folder, std::optional<Watcher::Kind> preferred = std::nullopt);

}  // namespace marrowdale::native
