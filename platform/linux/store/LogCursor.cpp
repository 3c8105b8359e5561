#include "platform/linux/store/LogCursor.h"

#include <cerrno>
#include <utility>

#include "platform/linux/store/StoreDamage.h"

namespace marrowdale::native {

namespace {

// Small frames are the rule: most are one save of one file.
constexpr std::size_t readAhead = 1U << 16U;

}  // namespace

LogCursor::LogCursor(std::shared_ptr<const LogView> view, SegmentReader reader, const Start& start)
    : view_(std::move(view)),
      segment_(start.segment),
      reader_(std::move(reader)),
      sequence_(start.sequence),
      passed_(start.since) {}

Expected<SegmentReader> LogCursor::openSegment(const LogView& view, const LogSegment& segment) {
    const std::string path = view.folder().segment(segment.header.number);
    auto reader = SegmentReader::open(path, view.store(), segment.header.number);
    if (!reader) {
        // Retention takes segments from the view first, and only then from the disk.
        if (reader.error().code == ENOENT) {
            if (auto stands = view.segmentAfter(segment.header.number - 1); !stands) {
                return Unexpected(stands.error());
            }
        }
        return Unexpected(missingIsDamage(reader.error(), path));
    }
    const SegmentHeader& found = reader->segment();
    if (found.firstSequence != segment.header.firstSequence ||
        found.lastEventBefore != segment.header.lastEventBefore) {
        return Unexpected(damageOf(path, "its header changed"));
    }
    reader->setReadAhead(readAhead);
    return reader;
}

Expected<std::unique_ptr<EventCursor>> LogCursor::open(std::shared_ptr<const LogView> view,
                                                       const Start& start) {
    auto reader = openSegment(*view, *start.segment);
    if (!reader) {
        return Unexpected(reader.error());
    }
    reader->seek(start.offset);
    return std::unique_ptr<EventCursor>(new LogCursor(std::move(view), std::move(*reader), start));
}

Expected<std::optional<StoredEvent>> LogCursor::next() {
    if (failure_) {
        return Unexpected(*failure_);
    }
    auto event = step();
    if (!event) {
        failure_ = event.error();
    }
    return event;
}

Expected<std::optional<StoredEvent>> LogCursor::step() {
    while (true) {
        if (records_) {
            auto event = nextInFrame();
            if (!event || *event) {
                return event;
            }
            records_.reset();
        }
        const auto taken = nextFrame();
        if (!taken) {
            return Unexpected(taken.error());
        }
        if (!*taken) {
            reader_.releaseBuffer();
            return std::optional<StoredEvent>();
        }
    }
}

Expected<std::optional<StoredEvent>> LogCursor::nextInFrame() {
    while (const auto record = records_->next()) {
        if (recordsLeft_ == 0) {
            return Unexpected(damage("a frame has more records than its header tells"));
        }
        --recordsLeft_;
        if (record->type == Record::Type::gap) {
            ++nextID_;
        }
        if (record->type != Record::Type::event) {
            continue;
        }
        if (record->shared > path_.size()) {
            return Unexpected(damage("an event goes on where none was"));
        }
        path_.resize(record->shared);
        path_.append(record->event.path);
        const std::uint64_t identifier = nextID_++;
        if (identifier > passed_) {
            passed_ = identifier;
            StoredEvent event = record->event;
            event.id = EventID{identifier};
            event.path = path_;
            return std::optional(event);
        }
    }
    if (!records_->isGood() || recordsLeft_ != 0 || nextID_ != reader_.header().lastEvent + 1) {
        return Unexpected(damage("a frame is not as its header tells"));
    }
    passed_ = reader_.header().lastEvent;
    return std::optional<StoredEvent>();
}

Expected<bool> LogCursor::nextFrame() {
    while (true) {
        // Asked before the end is read: with a segment behind this one, the end is the last.
        const auto behind = view_->segmentAfter(segment_->header.number);
        const std::uint64_t end = segment_->end;
        if (reader_.offset() < end) {
            reader_.limitTo(end);
            const auto taken = lookAtFrame();
            if (!taken || *taken) {
                return taken;
            }
            continue;
        }
        if (!behind) {
            return Unexpected(behind.error());
        }
        if (!*behind) {
            return false;
        }
        if (auto entered = enter(*behind); !entered) {
            return Unexpected(entered.error());
        }
    }
}

Expected<bool> LogCursor::lookAtFrame() {
    auto step = reader_.nextHeader();
    if (!step) {
        return Unexpected(step.error());
    }
    const FrameHeader& header = reader_.header();
    if (*step != SegmentReader::Step::frame || header.sequence != sequence_ + 1) {
        return Unexpected(damage("a frame's checksum does not hold, or it was cut"));
    }
    const bool isPassed = header.lastEvent <= passed_;
    step = isPassed ? reader_.skipRecords() : reader_.takeRecords();
    if (!step) {
        return Unexpected(step.error());
    }
    if (*step != SegmentReader::Step::frame) {
        return Unexpected(damage("a frame's checksum does not hold, or it was cut"));
    }
    sequence_ = header.sequence;
    if (isPassed) {
        return false;
    }
    if (header.firstEvent == 0 || header.firstEvent > header.lastEvent) {
        return Unexpected(damage("a frame's events have no good identifiers"));
    }
    records_.emplace(reader_.records());
    recordsLeft_ = header.recordCount;
    nextID_ = header.firstEvent;
    path_.clear();
    return true;
}

Expected<void> LogCursor::enter(const LogView::Segment& segment) {
    if (segment->header.firstSequence != sequence_ + 1) {
        return Unexpected(damage("frames at its end are missing"));
    }
    auto reader = openSegment(*view_, *segment);
    if (!reader) {
        return Unexpected(reader.error());
    }
    reader_ = std::move(*reader);
    segment_ = segment;
    return {};
}

Error LogCursor::damage(std::string_view what) const {
    return damageOf(view_->folder().segment(segment_->header.number), what);
}

}  // namespace marrowdale::native
