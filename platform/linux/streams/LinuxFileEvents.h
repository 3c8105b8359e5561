#pragma once

#include <memory>

#include "platform/foundation/Log.h"
#include "platform/linux/store/EventHistory.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::native {

class StreamHub;

// The event service over the history of one store. A stream starts with a barrier, so that what
// happened before `start` is history. Where the history can't tell all (the stream's start lies
// beyond its ends or in what a crash took, a path lies outside its tree, it can't be read) the
// stream says that events were dropped, or that identifiers wrapped, ahead of its history-done
// event, and goes on with what happens from then on.
//
// When `stop` is called on another thread than the queue's, a call of the callback that was begun
// is not waited for, because it may need what the caller holds.
//
// Any thread. Streams may outlive it: those that have not told their history-done event tell it.
class LinuxFileEvents final : public FileEventService {
  public:
    // The history must outlive it, or have said that it is closing. `log` may be null; it must
    // outlive the streams.
    explicit LinuxFileEvents(EventHistory& history, Log* log = nullptr);
    // Waits for what streams are reading, not for callbacks.
    ~LinuxFileEvents() override;
    LinuxFileEvents(const LinuxFileEvents&) = delete;
    LinuxFileEvents& operator=(const LinuxFileEvents&) = delete;

    [[nodiscard]] Expected<EventID> currentEventID() override;
    [[nodiscard]] Expected<UUID> volumeUUID(const URL& url) override;
    // Never null.
    [[nodiscard]] std::unique_ptr<FileEventStream> makeStream(
        FileEventStreamRequest request) override;

  private:
    EventHistory& history_;
    Log* const log_;
    const std::shared_ptr<StreamHub> hub_;
};

}  // namespace marrowdale::native
