#pragma once

#include <algorithm>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/foundation/Date.h"
#include "platform/foundation/Error.h"
#include "platform/linux/store/EventBatch.h"
#include "platform/linux/store/EventHistory.h"
#include "platform/linux/store/IdentifierRange.h"
#include "platform/linux/store/Index.h"
#include "platform/linux/store/LogView.h"
#include "platform/linux/store/Record.h"
#include "platform/linux/store/Retention.h"
#include "platform/linux/store/SegmentReader.h"
#include "platform/linux/store/SegmentWriter.h"
#include "platform/linux/store/Snapshot.h"
#include "platform/linux/store/StoreFolder.h"
#include "platform/linux/store/StoreHead.h"

namespace marrowdale::native {

// The durable side of a store: log, snapshot, head, witness and identifier ranges. Loads the index
// and commits its changes and the events. One thread at a time, but for `log`, which any thread may
// read; the folder's lock is held by the caller.
class Journal {
  public:
    struct Options {
        Retention retention;
        // Says when segments are made, and how old they are.
        std::function<Date()> clock = Date::now;
    };

    // Loads the store in `folder` into the empty `index` and makes the files ready for writing.
    // `cacheFolder` may be empty. Damage and later formats as StoreDamage.h has it; then nothing
    // was written.
    [[nodiscard]] static Expected<std::unique_ptr<Journal>> load(const StoreFolder& folder,
                                                                 const StoreIdentity& identity,
                                                                 const std::string& cacheFolder,
                                                                 Index& index, Options options);

    [[nodiscard]] std::uint64_t lastEvent() const { return lastEvent_; }
    // The last one that was committed before this journal was loaded.
    [[nodiscard]] std::uint64_t lastLoadedEvent() const { return lastLoadedEvent_; }
    // The last document identifier that anybody may have seen: above what the log says, after an
    // end that was not clean.
    [[nodiscard]] std::uint32_t lastDocument() const {
        return std::max(lastDocument_, documentFloor_);
    }
    [[nodiscard]] const std::vector<EventGap>& gaps() const { return gaps_; }

    // The history. The view may be kept beyond the journal's life.
    [[nodiscard]] std::shared_ptr<const LogView> log() const { return log_; }
    [[nodiscard]] EventHistory::Standing standingOf(EventID since) const {
        return log_->standingOf(since);
    }
    [[nodiscard]] Expected<std::unique_ptr<EventCursor>> eventsSince(EventID since) const {
        return log_->eventsSince(since);
    }

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
    // Writes one; the segments it covers go when retention lets them. The index must be clean. An
    // error costs nothing but the snapshot.
    [[nodiscard]] Expected<void> writeSnapshot(Index& index);
    // A clean end.
    [[nodiscard]] Expected<void> close();

    // Of the segments that the next start has to read.
    [[nodiscard]] std::uint64_t logBytes() const;
    [[nodiscard]] std::uint64_t snapshotBytes() const { return snapshotBytes_; }
    // What stands in the way of the witness; empty when it is kept.
    [[nodiscard]] const std::string& witnessProblem() const { return witnessProblem_; }
    // Why history begins later than it could; empty when that is so by retention alone.
    [[nodiscard]] const std::string& historyProblem() const { return historyProblem_; }

  private:
    struct Replay;

    Journal(StoreFolder folder, StoreIdentity identity, Options options);

    [[nodiscard]] Expected<void> openSmallFiles(const std::string& cacheFolder);
    void openWitness(const std::string& cacheFolder);
    [[nodiscard]] LogPosition mustReach() const;
    [[nodiscard]] Expected<void> loadSnapshot(Index& index);
    [[nodiscard]] Expected<void> replayLog(Index& index);
    [[nodiscard]] Expected<bool> replaySegment(Replay& replay, Index& index);
    [[nodiscard]] bool takeCommit(Replay& replay, Index& index);
    [[nodiscard]] Expected<void> checkReach(const Replay& replay) const;
    [[nodiscard]] Expected<void> startWriting(const Replay& replay);
    [[nodiscard]] Expected<std::vector<std::pair<SegmentHeader, std::uint64_t>>> olderSegments(
        const SegmentHeader& first);
    void noteGap();
    void trimGaps();

    [[nodiscard]] Expected<void> writeCommit(const Index& index, const EventBatch& events,
                                             std::uint32_t lastDocument);
    // One commit of what `put` gives to a FrameStream.
    template <typename Put>
    [[nodiscard]] Expected<void> write(std::uint32_t lastDocument, const Put& put);
    [[nodiscard]] Expected<void> rollSegment();
    [[nodiscard]] Expected<void> writeHead();
    [[nodiscard]] std::uint32_t seconds() const;
    // Removes what retention gives up.
    void trim();
    void removeSegmentsBefore(std::uint64_t oldest) const;

    StoreFolder folder_;
    StoreIdentity identity_;
    StoreHead head_;
    StoreHead witness_;
    std::string witnessProblem_;
    std::string historyProblem_;
    IdentifierRange range_;
    SegmentWriter writer_;
    std::uint64_t sequence_ = 0;  // of the last frame
    std::uint64_t lastEvent_ = 0;
    std::uint64_t lastLoadedEvent_ = 0;
    std::uint32_t lastDocument_ = 0;   // as the log says
    std::uint32_t documentFloor_ = 0;  // end of the range that the run before had
    std::vector<EventGap> gaps_;
    bool gapIsNew_ = false;  // the last of gaps_ is not in the log yet
    std::uint64_t snapshotSegment_ = 1;
    std::uint64_t snapshotBytes_ = 0;
    std::optional<Error> failure_;
    const Options options_;
    const std::shared_ptr<LogView> log_;
};

}  // namespace marrowdale::native
