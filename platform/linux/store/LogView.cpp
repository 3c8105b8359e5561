#include "platform/linux/store/LogView.h"

#include <algorithm>
#include <cerrno>

#include "platform/linux/store/LogCursor.h"

namespace marrowdale::native {

EventID LogView::lastEvent() const {
    const MutexLock lock(mutex_);
    return EventID{lastEvent_};
}

EventHistory::Standing LogView::standingOf(EventID since) const {
    const std::uint64_t event = raw(since);
    const MutexLock lock(mutex_);
    if (event > lastEvent_) {
        return EventHistory::Standing::future;
    }
    if (std::ranges::any_of(gaps_, [event](const EventGap& gap) {
            return gap.first <= event && event <= gap.last;
        })) {
        return EventHistory::Standing::lost;
    }
    return event < segments_.front()->header.lastEventBefore ? EventHistory::Standing::pruned
                                                             : EventHistory::Standing::good;
}

Expected<std::unique_ptr<EventCursor>> LogView::eventsSince(EventID since) const {
    LogCursor::Start start;
    start.since = raw(since);
    {
        const MutexLock lock(mutex_);
        const auto behind =
            std::ranges::find_if(segments_, [&start](const std::shared_ptr<LogSegment>& segment) {
                return segment->header.lastEventBefore > start.since;
            });
        if (behind == segments_.begin()) {
            return Unexpected(errorWithPOSIXCode(ENODATA, "read the history of", folder_.store()));
        }
        const bool atEnd = start.since >= lastEvent_;
        start.segment = atEnd ? segments_.back() : *std::prev(behind);
        start.offset = atEnd ? start.segment->end.load() : segmentHeaderSize;
        start.sequence = atEnd ? sequence_ : start.segment->header.firstSequence - 1;
    }
    return LogCursor::open(shared_from_this(), start);
}

LogView::Extent LogView::extent() const {
    const MutexLock lock(mutex_);
    Extent extent;
    extent.lastEventBefore = segments_.front()->header.lastEventBefore;
    extent.created = segments_.front()->header.created;
    extent.events = countBehind(extent.lastEventBefore);
    for (const auto& segment : segments_) {
        extent.bytes += segment->end;
    }
    return extent;
}

Expected<LogView::Segment> LogView::segmentAfter(std::uint64_t number) const {
    const MutexLock lock(mutex_);
    if (number >= segments_.back()->header.number) {
        return Segment();
    }
    const std::uint64_t oldest = segments_.front()->header.number;
    if (number + 1 < oldest) {
        return Unexpected(errorWithPOSIXCode(ENODATA, "read the history of", folder_.store()));
    }
    return Segment(segments_[number + 1 - oldest]);
}

std::vector<LogView::Segment> LogView::segments() const {
    const MutexLock lock(mutex_);
    return {segments_.begin(), segments_.end()};
}

std::uint64_t LogView::eventsBehind(std::uint64_t event) const {
    const MutexLock lock(mutex_);
    return countBehind(event);
}

std::uint64_t LogView::countBehind(std::uint64_t event) const {
    std::uint64_t count = lastEvent_ - std::min(event, lastEvent_);
    for (const EventGap& gap : gaps_) {
        const std::uint64_t first = std::max(gap.first, event + 1);
        const std::uint64_t last = std::min(gap.last, lastEvent_);
        count -= first <= last ? last - first + 1 : 0;
    }
    return count;
}

void LogView::begin(const SegmentHeader& header, std::uint64_t end) {
    const MutexLock lock(mutex_);
    segments_.push_back(std::make_shared<LogSegment>(header, end));
}

void LogView::advance(std::uint64_t end, std::uint64_t sequence, std::uint64_t lastEvent) {
    const MutexLock lock(mutex_);
    segments_.back()->end = end;
    sequence_ = sequence;
    lastEvent_ = lastEvent;
}

void LogView::setGaps(const std::vector<EventGap>& gaps, std::uint64_t lastEvent) {
    const MutexLock lock(mutex_);
    gaps_ = gaps;
    lastEvent_ = lastEvent;
}

void LogView::removeBefore(std::uint64_t number) {
    const MutexLock lock(mutex_);
    std::erase_if(segments_, [number](const std::shared_ptr<LogSegment>& segment) {
        return segment->header.number < number;
    });
}

}  // namespace marrowdale::native
