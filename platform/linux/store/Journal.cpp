#include "platform/linux/store/Journal.h"

#include <algorithm>
#include <cerrno>
#include <limits>
#include <string_view>
#include <utility>

#include "platform/linux/store/Bytes.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::native {

namespace {

constexpr std::uint64_t segmentLimit = 8U << 20U;
constexpr std::uint64_t smallestTail = 1U << 20U;

// Collects records and gives them to the segment frame by frame.
class FrameStream {
  public:
    FrameStream(SegmentWriter& writer, std::uint64_t sequence, std::uint64_t lastEvent)
        : writer_(writer), sequence_(sequence), lastEvent_(lastEvent) {}

    [[nodiscard]] ByteWriter& records() { return records_; }
    // Cuts off what is too long to be looked at by path anyway: the folder changed.
    void putEvent(const StoredEvent& event);
    // The record that was put has an event identifier of its own.
    void countEvent() {
        ++lastEvent_;
        header_.firstEvent = header_.firstEvent == 0 ? lastEvent_ : header_.firstEvent;
        header_.lastEvent = lastEvent_;
    }
    [[nodiscard]] Expected<void> endRecord() {
        ++header_.recordCount;
        return records_.size() < frameSize ? Expected<void>() : flush(FrameHeader::commitGoesOn);
    }
    [[nodiscard]] Expected<void> finish() { return flush(0); }
    [[nodiscard]] std::uint64_t sequence() const { return sequence_; }
    [[nodiscard]] std::uint64_t lastEvent() const { return lastEvent_; }

  private:
    [[nodiscard]] Expected<void> flush(std::uint32_t flags) {
        header_.sequence = ++sequence_;
        header_.flags = flags;
        auto written = writer_.append(header_, records_.bytes());
        header_ = {};
        records_.clear();
        path_.clear();
        return written;
    }

    SegmentWriter& writer_;
    ByteWriter records_;
    std::string path_;  // of the last event in the frame
    FrameHeader header_;
    std::uint64_t sequence_;
    std::uint64_t lastEvent_;
};

void FrameStream::putEvent(const StoredEvent& event) {
    StoredEvent fitting = event;
    if (event.path.size() > longestEventPath) {
        const std::size_t end = event.path.substr(0, longestEventPath + 1).rfind('/');
        fitting.path = event.path.substr(0, end == std::string_view::npos ? 0 : end);
        fitting.flags = FileEventFlag::changed | FileEventFlag::isFolder;
        fitting.fileID = {};
    }
    native::putEvent(records_, fitting, path_);
    path_ = fitting.path;
    countEvent();
}

Expected<void> putEvents(FrameStream& out, const EventBatch& events) {
    Expected<void> done;
    events.forEach([&](const StoredEvent& event) {
        if (done) {
            out.putEvent(event);
            done = out.endRecord();
        }
    });
    return done;
}

Expected<void> putDirtyRows(FrameStream& out, const Index& index) {
    for (const RowNumber number : index.dirty()) {
        const Row& row = index.row(number);
        if (row.isFree()) {
            putRemoval(out.records(), number);
        } else if (row.has(Row::renewed)) {
            putRow(out.records(), number, row, index.name(number));
        } else {
            putTouch(out.records(), number, row);
        }
        if (auto done = out.endRecord(); !done) {
            return done;
        }
        // Of a row that is removed the attributes go with it.
        if (!row.isFree() && index.hasNewAttributes(number)) {
            putAttributes(out.records(), number, index.attributes(number));
            if (auto done = out.endRecord(); !done) {
                return done;
            }
        }
    }
    return {};
}

// A snapshot has none: they begin the log behind it.
Expected<void> putAllAttributes(FrameStream& out, const Index& index) {
    for (const auto& [number, attributes] : index.allAttributes()) {
        putAttributes(out.records(), number, attributes);
        if (auto done = out.endRecord(); !done) {
            return done;
        }
    }
    return {};
}

}  // namespace

Journal::Journal(StoreFolder folder, StoreIdentity identity, Options options)
    : folder_(std::move(folder)),
      identity_(std::move(identity)),
      options_(std::move(options)),
      log_(std::make_shared<LogView>(folder_, identity_.uuid)) {}

bool Journal::hasChanges(const Index& index, const EventBatch& events,
                         std::uint32_t lastDocument) const {
    return gapIsNew_ || !index.dirty().empty() || !events.empty() || lastDocument != lastDocument_;
}

Expected<void> Journal::commit(Index& index, EventBatch& events, std::uint32_t lastDocument) {
    if (!hasChanges(index, events, lastDocument)) {
        return {};
    }
    if (failure_) {
        return Unexpected(*failure_);
    }
    const std::uint64_t count = events.count() + (gapIsNew_ ? 1U : 0U);
    if (auto reserved = range_.reserve(lastEvent_ + count, lastDocument); !reserved) {
        return reserved;
    }
    if (writer_.offset() > segmentLimit) {
        trim();  // first, so that a full disk gets room
        if (auto rolled = rollSegment(); !rolled) {
            return rolled;
        }
        trim();
    }
    if (auto written = writeCommit(index, events, lastDocument); !written) {
        return written;
    }
    index.clearDirty();
    events.clear();
    gapIsNew_ = false;
    return {};
}

Expected<void> Journal::writeCommit(const Index& index, const EventBatch& events,
                                    std::uint32_t lastDocument) {
    return write(lastDocument, [&](FrameStream& out) {
        Expected<void> done;
        if (gapIsNew_) {
            putGap(out.records(), gaps_.back());
            out.countEvent();
            done = out.endRecord();
        }
        if (done && lastDocument != lastDocument_) {
            putDocumentCounter(out.records(), lastDocument);
            done = out.endRecord();
        }
        done = done ? putEvents(out, events) : done;
        return done ? putDirtyRows(out, index) : done;
    });
}

template <typename Put>
Expected<void> Journal::write(std::uint32_t lastDocument, const Put& put) {
    const std::uint64_t start = writer_.offset();
    FrameStream out(writer_, sequence_, lastEvent_);
    auto done = put(out);
    done = done ? out.finish() : done;
    if (!done) {
        // Nothing was synced: what was written can be taken back, and a later commit tried.
        if (auto cut = writer_.cut(start); !cut) {
            failure_ = cut.error();
        }
        return done;
    }
    if (auto synced = writer_.sync(); !synced) {
        failure_ = synced.error();
        return synced;
    }
    sequence_ = out.sequence();
    lastEvent_ = out.lastEvent();
    lastDocument_ = lastDocument;
    if (auto written = writeHead(); !written) {
        return written;
    }
    log_->advance(writer_.offset(), sequence_, lastEvent_);
    return {};
}

Expected<void> Journal::writeHead() {
    const LogPosition position{writer_.number(), writer_.offset(), sequence_, lastEvent_,
                               lastDocument_};
    if (auto written = head_.write(position); !written) {
        failure_ = written.error();
        return written;
    }
    if (witness_) {
        if (auto written = witness_.write(position); !written) {
            witnessProblem_ = written.error().description();
        }
    }
    return {};
}

Expected<void> Journal::rollSegment() {
    const SegmentHeader header{writer_.number() + 1, sequence_ + 1, lastEvent_, seconds()};
    auto next = SegmentWriter::create(folder_.store(), identity_.uuid, header);
    if (!next) {
        return Unexpected(next.error());
    }
    writer_ = std::move(*next);
    log_->begin(header, writer_.offset());
    return writeHead();
}

bool Journal::wantsSnapshot() const {
    return logBytes() > std::max(smallestTail, snapshotBytes_ / 4);
}

Expected<void> Journal::writeSnapshot(Index& index) {
    if (failure_) {
        return Unexpected(*failure_);
    }
    // Even where there is no room for another snapshot.
    trim();
    if (writer_.offset() > segmentHeaderSize) {
        if (auto rolled = rollSegment(); !rolled) {
            return rolled;
        }
    }
    index.compactNames();
    const SnapshotHeader header{writer_.number(), sequence_, lastEvent_, lastDocument_};
    if (!index.allAttributes().empty()) {
        auto written =
            write(lastDocument_, [&](FrameStream& out) { return putAllAttributes(out, index); });
        if (!written) {
            return written;
        }
    }
    const auto bytes =
        native::writeSnapshot(folder_.snapshot(), identity_.uuid, header, index, gaps_);
    if (!bytes) {
        return Unexpected(bytes.error());
    }
    snapshotBytes_ = *bytes;
    snapshotSegment_ = writer_.number();
    trim();
    return {};
}

std::uint64_t Journal::logBytes() const {
    std::uint64_t bytes = 0;
    for (const LogView::Segment& segment : log_->segments()) {
        bytes += segment->header.number >= snapshotSegment_ ? segment->end.load() : 0;
    }
    return bytes;
}

std::uint32_t Journal::seconds() const {
    constexpr std::int64_t most = std::numeric_limits<std::uint32_t>::max();
    return static_cast<std::uint32_t>(std::clamp<std::int64_t>(options_.clock().seconds, 0, most));
}

void Journal::trim() {
    const auto segments = log_->segments();
    std::vector<SegmentAge> ages;
    std::size_t needed = 0;
    for (std::size_t i = 0; i < segments.size(); ++i) {
        const std::uint64_t lastEvent =
            i + 1 < segments.size() ? segments[i + 1]->header.lastEventBefore : lastEvent_;
        ages.push_back(
            {segments[i]->header.created, log_->eventsBehind(lastEvent), segments[i]->end.load()});
        needed += segments[i]->header.number >= snapshotSegment_ ? 1U : 0U;
    }
    const std::size_t surplus = surplusSegments(ages, needed, options_.retention, seconds());
    const std::uint64_t oldest = segments[surplus]->header.number;
    log_->removeBefore(oldest);
    removeSegmentsBefore(oldest);
}

void Journal::removeSegmentsBefore(std::uint64_t oldest) const {
    const auto numbers = folder_.segments();
    if (!numbers) {
        return;  // they are removed another time
    }
    for (const std::uint64_t number : *numbers) {
        if (number < oldest) {
            (void)removeFile(folder_.segment(number));
        }
    }
}

Expected<void> Journal::close() {
    // After a failure the ranges must stay as wide as they are: nobody knows what is on the disk.
    if (failure_ || gapIsNew_) {
        return {};
    }
    if (range_.eventEnd() == lastEvent_ && range_.documentEnd() == lastDocument_) {
        return {};
    }
    return range_.close(lastEvent_, lastDocument_);
}

}  // namespace marrowdale::native
