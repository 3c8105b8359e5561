#pragma once

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/URL.h"
#include "platform/foundation/UUID.h"

namespace marrowdale {

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
};

}  // namespace marrowdale
