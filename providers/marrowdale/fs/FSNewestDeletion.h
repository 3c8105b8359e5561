#pragma once

#include <optional>

#include "platform/Platform.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/URL.h"

namespace marrowdale {

// The newest event behind `since` that tells of something that left its place at or below the
// folder, or 0 when there is none; no value when nobody knows. Replays the history since then, with
// a reader of its own, and waits for its end, as FSEventReader::canResumeGatherPhase does.
[[nodiscard]] std::optional<EventID> newestDeletion(const Platform& platform, const URL& folder,
                                                    EventID since);

}  // namespace marrowdale
