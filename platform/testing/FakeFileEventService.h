#pragma once

#include <memory>
#include <optional>

#include "platform/services/FileEventService.h"

namespace marrowdale {

// Says what it is told to say. One thread.
class FakeFileEventService : public FileEventService {
  public:
    EventID eventID{1};
    std::optional<Error> eventIDError;
    UUID uuid = *UUID::fromText("C0FFEE00-0000-4000-8000-000000000001");
    std::optional<Error> uuidError;

    Expected<EventID> currentEventID() override {
        if (eventIDError) {
            return Unexpected(*eventIDError);
        }
        return eventID;
    }
    Expected<UUID> volumeUUID(const URL& /*url*/) override {
        if (uuidError) {
            return Unexpected(*uuidError);
        }
        return uuid;
    }
    std::unique_ptr<FileEventStream> makeStream(FileEventStreamRequest /*request*/) override {
        return nullptr;
    }
};

}  // namespace marrowdale
