#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/store/EventHistory.h"
#include "platform/linux/store/Frame.h"
#include "platform/linux/store/Mutex.h"
#include "platform/linux/store/Record.h"
#include "platform/linux/store/StoreFolder.h"

namespace marrowdale::native {

// One segment of the log, as far as it is committed.
struct LogSegment {
    LogSegment(const SegmentHeader& itsHeader, std::uint64_t itsEnd)
        : header(itsHeader), end(itsEnd) {}
    const SegmentHeader header;
    // Behind the last committed frame. Only grows, and stays once there is a next segment.
    std::atomic<std::uint64_t> end;
};

// The committed part of a store's log, for whoever reads history while the journal goes on writing:
// which segments there are, and how far they are good. The journal alone changes it; everything
// else is for any thread. Cursors hold it, so it outlives them and, if need be, the journal.
class LogView : public std::enable_shared_from_this<LogView> {
  public:
    using Segment = std::shared_ptr<const LogSegment>;

    LogView(StoreFolder folder, const UUID& store) : folder_(std::move(folder)), store_(store) {}

    [[nodiscard]] EventID lastEvent() const MARROWDALE_EXCLUDES(mutex_);
    // 0 is good as long as nothing was taken away, and then stands for "from the beginning".
    [[nodiscard]] EventHistory::Standing standingOf(EventID since) const
        MARROWDALE_EXCLUDES(mutex_);
    // Begins behind `since`, which is good; ENODATA when it is pruned meanwhile. Reads nothing but
    // the header of the segment; the first step then passes over the frames of that segment, by
    // their headers, that lie before.
    [[nodiscard]] Expected<std::unique_ptr<EventCursor>> eventsSince(EventID since) const
        MARROWDALE_EXCLUDES(mutex_);

    // What is kept.
    struct Extent {
        std::uint64_t lastEventBefore = 0;  // of the oldest segment
        std::uint32_t created = 0;          // the oldest segment, in seconds since 1970
        std::uint64_t events = 0;
        std::uint64_t bytes = 0;
    };
    [[nodiscard]] Extent extent() const MARROWDALE_EXCLUDES(mutex_);

    // For cursors. The segment behind that number; none behind the last, ENODATA when it is gone.
    [[nodiscard]] Expected<Segment> segmentAfter(std::uint64_t number) const
        MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] const StoreFolder& folder() const { return folder_; }
    [[nodiscard]] const UUID& store() const { return store_; }

    // For the journal. Oldest first.
    [[nodiscard]] std::vector<Segment> segments() const MARROWDALE_EXCLUDES(mutex_);
    // Events behind that identifier that are kept; those that were lost in gaps do not count.
    [[nodiscard]] std::uint64_t eventsBehind(std::uint64_t event) const MARROWDALE_EXCLUDES(mutex_);
    // A segment begins behind the last one; it is committed up to `end`.
    void begin(const SegmentHeader& header, std::uint64_t end) MARROWDALE_EXCLUDES(mutex_);
    // The last segment is committed up to `end`, with a frame of that number as the last.
    void advance(std::uint64_t end, std::uint64_t sequence, std::uint64_t lastEvent)
        MARROWDALE_EXCLUDES(mutex_);
    void setGaps(const std::vector<EventGap>& gaps, std::uint64_t lastEvent)
        MARROWDALE_EXCLUDES(mutex_);
    // Segments with lower numbers are no longer handed out; then their files may go.
    void removeBefore(std::uint64_t number) MARROWDALE_EXCLUDES(mutex_);

  private:
    [[nodiscard]] std::uint64_t countBehind(std::uint64_t event) const MARROWDALE_REQUIRES(mutex_);

    const StoreFolder folder_;
    const UUID store_;
    mutable Mutex mutex_;
    std::vector<std::shared_ptr<LogSegment>> segments_ MARROWDALE_GUARDED_BY(mutex_);
    std::vector<EventGap> gaps_ MARROWDALE_GUARDED_BY(mutex_);
    std::uint64_t sequence_ MARROWDALE_GUARDED_BY(mutex_) = 0;  // of the last frame
    std::uint64_t lastEvent_ MARROWDALE_GUARDED_BY(mutex_) = 0;
};

}  // namespace marrowdale::native
