#pragma once

#include <memory>
#include <utility>

#include "host/daemon/LibraryWitness.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::host {

// The history of what happened, under a UUID that also changes when the list of app libraries was
// lost. Any thread.
class MarkedFileEvents final : public FileEventService {
  public:
    // Both outlive it.
    MarkedFileEvents(FileEventService& history, const LibraryWitness& witness)
        : history_(history), witness_(witness) {}

    Expected<EventID> currentEventID() override { return history_.currentEventID(); }
    Expected<UUID> volumeUUID(const URL& url) override {
        auto uuid = history_.volumeUUID(url);
        return uuid ? Expected<UUID>(witness_.marked(*uuid)) : uuid;
    }
    std::unique_ptr<FileEventStream> makeStream(FileEventStreamRequest request) override {
        return history_.makeStream(std::move(request));
    }

  private:
    FileEventService& history_;
    const LibraryWitness& witness_;
};

}  // namespace marrowdale::host
