#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/linux/store/EventBatch.h"
#include "platform/linux/store/IdentifierRange.h"
#include "platform/linux/store/Index.h"
#include "platform/linux/store/Record.h"
#include "platform/linux/store/SegmentReader.h"
#include "platform/linux/store/SegmentWriter.h"
#include "platform/linux/store/Snapshot.h"
#include "platform/linux/store/StoreFolder.h"
#include "platform/linux/store/StoreHead.h"

namespace marrowdale::native {

// The durable side of a store: log, snapshot, head, witness and identifier ranges. Loads the index
// and commits its changes. One thread at a time; the folder's lock is held by the caller.
class Journal {
  public:
    // Loads the store in `folder` into the empty `index` and makes the files ready for writing.
    // `cacheFolder` may be empty. Damage and later formats as StoreDamage.h has it; then nothing
    // was written.
    [[nodiscard]] static Expected<std::unique_ptr<Journal>> load(const StoreFolder& folder,
                                                                 const StoreIdentity& identity,
                                                                 const std::string& cacheFolder,
                                                                 Index& index);

    [[nodiscard]] std::uint64_t lastEvent() const { return lastEvent_; }
    // The last document identifier that anybody may have seen: above what the log says, after an
    // end that was not clean.
    [[nodiscard]] std::uint32_t lastDocument() const {
        return std::max(lastDocument_, documentFloor_);
    }
    [[nodiscard]] const std::vector<EventGap>& gaps() const { return gaps_; }

    [[nodiscard]] bool hasChanges(const Index& index, const EventBatch& events,
                                  std::uint32_t lastDocument) const;
    // Writes the events, each under a new identifier, and the rows that are dirty, and syncs it:
    // all of it counts, or nothing. Then index and batch are clean. Costs nothing when nothing
    // changed. After an error both are as they were before, and so are the counters.
    [[nodiscard]] Expected<void> commit(Index& index, EventBatch& events,
                                        std::uint32_t lastDocument);
    // The error that ended writing for good (a failed sync says nothing about what is on the disk).
    [[nodiscard]] const std::optional<Error>& failure() const { return failure_; }

    // Whether the log behind the last snapshot has grown long.
    [[nodiscard]] bool wantsSnapshot() const;
    // Writes one and removes the segments it covers. The index must be clean. An error costs
    // nothing but the snapshot.
    [[nodiscard]] Expected<void> writeSnapshot(Index& index);
    // A clean end.
    [[nodiscard]] Expected<void> close();

    [[nodiscard]] std::uint64_t logBytes() const { return olderLogBytes_ + writer_.offset(); }
    [[nodiscard]] std::uint64_t snapshotBytes() const { return snapshotBytes_; }
    // What stands in the way of the witness; empty when it is kept.
    [[nodiscard]] const std::string& witnessProblem() const { return witnessProblem_; }

  private:
    struct Replay;

    Journal(const StoreFolder& folder, StoreIdentity identity)
        : folder_(folder), identity_(std::move(identity)) {}

    [[nodiscard]] Expected<void> openSmallFiles(const std::string& cacheFolder);
    void openWitness(const std::string& cacheFolder);
    [[nodiscard]] LogPosition mustReach() const;
    [[nodiscard]] Expected<void> loadSnapshot(Index& index);
    [[nodiscard]] Expected<void> replayLog(Index& index);
    [[nodiscard]] Expected<bool> replaySegment(Replay& replay, Index& index);
    [[nodiscard]] bool takeCommit(Replay& replay, Index& index);
    [[nodiscard]] Expected<void> checkReach(const Replay& replay) const;
    [[nodiscard]] Expected<void> startWriting(const Replay& replay);
    void noteGap();
    void trimGaps();

    [[nodiscard]] Expected<void> writeCommit(const Index& index, const EventBatch& events,
                                             std::uint32_t lastDocument);
    [[nodiscard]] Expected<void> rollSegment();
    [[nodiscard]] Expected<void> writeHead();
    void removeOldSegments();

    StoreFolder folder_;
    StoreIdentity identity_;
    StoreHead head_;
    StoreHead witness_;
    std::string witnessProblem_;
    IdentifierRange range_;
    SegmentWriter writer_;
    std::uint64_t sequence_ = 0;  // of the last frame
    std::uint64_t lastEvent_ = 0;
    std::uint32_t lastDocument_ = 0;   // as the log says
    std::uint32_t documentFloor_ = 0;  // end of the range that the run before had
    std::vector<EventGap> gaps_;
    bool gapIsNew_ = false;  // the last of gaps_ is not in the log yet
    std::uint64_t snapshotSegment_ = 1;
    std::uint64_t snapshotBytes_ = 0;
    std::uint64_t olderLogBytes_ = 0;  // of the segments before the one that is written
    std::optional<Error> failure_;
};

}  // namespace marrowdale::native
