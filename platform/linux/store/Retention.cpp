#include "platform/linux/store/Retention.h"

#include <algorithm>
#include <vector>

namespace marrowdale::native {

namespace {

// For each segment the date at which its last event had happened for sure.
std::vector<std::int64_t> endDates(std::span<const SegmentAge> segments, std::int64_t now) {
    std::vector<bool> credible(segments.size());
    std::int64_t newest = 0;
    for (std::size_t i = 0; i < segments.size(); ++i) {
        credible[i] = segments[i].created >= newest && segments[i].created <= now;
        newest = credible[i] ? segments[i].created : newest;
    }
    std::vector<std::int64_t> ends(segments.size(), now);
    std::int64_t next = now;
    for (std::size_t i = segments.size(); i-- > 0;) {
        ends[i] = next;
        next = credible[i] ? segments[i].created : next;
    }
    return ends;
}

}  // namespace

std::size_t surplusSegments(std::span<const SegmentAge> segments, std::size_t needed,
                            const Retention& retention, std::int64_t now) {
    std::uint64_t bytes = 0;
    for (const SegmentAge& segment : segments) {
        bytes += segment.bytes;
    }
    const auto ends = endDates(segments, now);
    const std::size_t most =
        segments.size() - std::min(segments.size(), std::max<std::size_t>(needed, 1));
    std::size_t surplus = 0;
    for (; surplus < most; ++surplus) {
        const SegmentAge& segment = segments[surplus];
        const bool isOld = now - ends[surplus] > retention.age.count();
        const bool isWanted = !isOld || segment.eventsBehind < retention.events;
        if (isWanted && bytes <= retention.bytes) {
            break;
        }
        bytes -= segment.bytes;
    }
    return surplus;
}

}  // namespace marrowdale::native
