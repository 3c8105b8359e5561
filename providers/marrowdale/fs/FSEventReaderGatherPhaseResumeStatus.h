#pragma once

#include <cstdint>
#include <string>
#include <utility>

#include "platform/foundation/Identifiers.h"

namespace marrowdale {

// Whether a listing may go on where it was left.
struct FSEventReaderGatherPhaseResumeStatus {
    enum class Kind : std::uint8_t {
        deletionOccurred,  // something under the roots is gone, so the offset means another entry
        canResume,
        cantReplayHistoricalFSEvents,  // nobody knows what happened
    };
    Kind kind = Kind::canResume;
    std::string path;  // of what is gone; empty for the other kinds

    [[nodiscard]] static FSEventReaderGatherPhaseResumeStatus deletionOccurred(std::string path) {
        return {Kind::deletionOccurred, std::move(path)};
    }
    [[nodiscard]] static FSEventReaderGatherPhaseResumeStatus canResume() {
        return {Kind::canResume, {}};
    }
    [[nodiscard]] static FSEventReaderGatherPhaseResumeStatus cantReplayHistoricalFSEvents() {
        return {Kind::cantReplayHistoricalFSEvents, {}};
    }
    friend bool operator==(const FSEventReaderGatherPhaseResumeStatus&,
                           const FSEventReaderGatherPhaseResumeStatus&) = default;
};

// The answer of FSEventReader::canResumeGatherPhase.
struct FSEventReaderGatherPhaseResume {
    FSEventReaderGatherPhaseResumeStatus status;
    // The newest event when the check began: the status holds for everything up to it.
    EventID eventID{};
};

}  // namespace marrowdale
