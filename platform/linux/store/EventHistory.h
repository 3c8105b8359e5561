#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/URL.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/store/EventBatch.h"

namespace marrowdale::native {

// One of the trees that a history tells of.
struct EventRoot {
    // What the paths of its events begin with: empty for the root, "/KEY" for a library.
    std::string prefix;
    std::string path;        // where it stands; absolute
    bool isRecorded = true;  // false: what happens there is missed now
};

// Goes through the history in order. Reads what is committed from the segments on disk, checks
// every byte it hands out, and holds the segment it reads open, so that retention does not take it
// away. One thread at a time; it may outlive commits, not the store.
class EventCursor {
  public:
    virtual ~EventCursor() = default;
    // The next event; its path is good until the next call. No value behind the newest committed
    // one; after later commits the same cursor goes on. Errors: the segment can't be read or is
    // damaged (StoreDamage.h); ENODATA when retention took away what was not read yet.
    [[nodiscard]] virtual Expected<std::optional<StoredEvent>> next() = 0;
};

// The history that a store keeps. Any thread.
class EventHistory {
  public:
    // What an identifier is good for, as the place to go on from.
    enum class Standing : std::uint8_t {
        good,
        pruned,  // older than the oldest event that is kept
        lost,    // from a run that ended before it could commit
        future,  // beyond every event
    };

    virtual ~EventHistory() = default;

    // The identifier of the newest event, once everything that anybody did before the call is
    // recorded and committed. A store that does not listen tells of what it saw at its last look:
    // when it was opened, or when something was asked for that it did not know.
    [[nodiscard]] virtual Expected<EventID> barrier() = 0;
    // The newest committed event; no look at the disk.
    [[nodiscard]] virtual EventID lastEventID() = 0;
    [[nodiscard]] virtual Standing standingOf(EventID since) = 0;
    // A cursor that begins behind `since`, which is good.
    [[nodiscard]] virtual Expected<std::unique_ptr<EventCursor>> eventsSince(EventID since) = 0;

    // The trees that it tells of, as they are now, the root first; and the volume they lie on.
    [[nodiscard]] virtual std::vector<EventRoot> roots() = 0;
    [[nodiscard]] virtual DeviceID device() = 0;
    [[nodiscard]] virtual Expected<UUID> volumeUUID(const URL& url) = 0;

    // What listeners are told of.
    enum class News : std::uint8_t {
        committed,  // there are new events
        broken,   // from now on events may be missing: the root is gone, or nothing can be written
        closing,  // the store is being closed; the last call
    };
    // Called after a commit, on the thread that committed; must return at once and call nothing
    // here. The number names the listener for `removeListener`, which waits for a call that runs.
    [[nodiscard]] virtual std::uint64_t addListener(std::function<void(News)> listener) = 0;
    virtual void removeListener(std::uint64_t number) = 0;
};

}  // namespace marrowdale::native
