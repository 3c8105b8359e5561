#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/SerialQueue.h"
#include "platform/foundation/URL.h"
#include "platform/foundation/UUID.h"

namespace marrowdale {

// What an event says, as bits of FileEvent::flags. Several may be set at once; a reader keeps those
// it does not know.
namespace FileEventFlag {
// Events were lost, because the reader or the service could not keep up, or because the history no
// longer reaches back that far. Whoever follows must start over.
inline constexpr std::uint32_t userDropped = 0x02;
inline constexpr std::uint32_t kernelDropped = 0x04;
// Identifiers began again: the one that the stream was to start from lies in the future.
inline constexpr std::uint32_t eventIDsWrapped = 0x08;
// Everything older than the stream's start was told. No path, no file.
inline constexpr std::uint32_t historyDone = 0x10;
// What happened to the item at the path.
inline constexpr std::uint32_t appeared = 0x1'0000;   // made, or moved in from elsewhere
inline constexpr std::uint32_t changed = 0x2'0000;    // its contents or its metadata
inline constexpr std::uint32_t renamed = 0x4'0000;    // with `gone`: from here; else: to here
inline constexpr std::uint32_t gone = 0x8'0000;       // it no longer stands at the path
inline constexpr std::uint32_t isFolder = 0x10'0000;  // a folder that is no package
// The path tells of a document identifier that came to rest on another file:
// "/.docid/DEVICE/changed/DOCUMENT/src=SOURCE,dst=DESTINATION".
inline constexpr std::uint32_t documentMoved = 0x20'0000;
}  // namespace FileEventFlag

struct FileEvent {
    EventID id{};
    std::uint32_t flags = 0;          // FileEventFlag
    std::optional<std::string> path;  // absolute; none for what concerns the stream as a whole
    // The file that the event is about: the one that stands at the path, or stood there.
    std::optional<FileID> fileID;
    // The document that is gone from the volume with this event; 0: none is.
    DocumentID goneDocument{};
};

// Bits of FileEventStreamRequest::creationFlags. The service's events always are as these three
// say.
namespace FileEventCreationFlag {
inline constexpr std::uint32_t valueTypes = 0x01;
inline constexpr std::uint32_t fileEvents = 0x10;
inline constexpr std::uint32_t extendedData = 0x40;
}  // namespace FileEventCreationFlag

struct FileEventStreamRequest {
    // Absolute paths of folders, for a stream by path: events at them and below them. With
    // `device`: paths relative to that volume, "/.docid" for the feed of moved documents.
    std::vector<std::string> paths;
    std::optional<DeviceID> device;
    EventID since{};  // events after this one
    // How long live events may be held back to come together. History comes without delay.
    std::chrono::milliseconds latency{0};
    std::uint32_t creationFlags = 0;
    // Where batches are handed over.
    SerialQueue queue;
    // Gets each batch: never empty, in the order of the identifiers. Never called after `stop`
    // returned on the queue itself, or after a later block of the queue began.
    std::function<void(std::span<const FileEvent>)> callback;
};

// One stream of events: first those that are recorded already, batch by batch as the reader takes
// them, then one event with the history-done flag, then what happens from now on, until it is
// stopped. The history-done event always comes, behind a dropped or wrapped condition too, when a
// root is gone, and when the service ends; it may carry other flags besides. It carries the
// identifier of the newest event before it; on a stream relative to a device the identifier that
// the stream was to start from.
//
// Any thread; each call once, in this order: start, stop, invalidate. Releasing the stream before
// it was stopped stops it.
class FileEventStream {
  public:
    virtual ~FileEventStream() = default;
    // Returns at once.
    virtual void start() = 0;
    // No new batch is handed to the queue after it returns.
    virtual void stop() = 0;
    // Lets go of the queue and of the callback.
    virtual void invalidate() = 0;
};

// The history of what happened in the served trees. Any thread.
class FileEventService {
  public:
    virtual ~FileEventService() = default;

    // The identifier of the newest event: everything that happened before the call has this or a
    // lower one.
    [[nodiscard]] virtual Expected<EventID> currentEventID() = 0;

    // The UUID of the history kept for the volume that holds the URL. It changes when identifiers
    // handed out earlier mean nothing any more. ENXIO for a volume without a history.
    [[nodiscard]] virtual Expected<UUID> volumeUUID(const URL& url) = 0;

    // Never fails for what the disk or the history is like: that arrives as an event. Null where
    // the system has no means for another stream.
    [[nodiscard]] virtual std::unique_ptr<FileEventStream> makeStream(
        FileEventStreamRequest request) = 0;
};

}  // namespace marrowdale
