#include "platform/linux/store/Journal.h"

#include <algorithm>
#include <cerrno>
#include <utility>

#include "platform/linux/store/Bytes.h"

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
    // The record that was put stands for an event of its own.
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
        return written;
    }

    SegmentWriter& writer_;
    ByteWriter records_;
    FrameHeader header_;
    std::uint64_t sequence_;
    std::uint64_t lastEvent_;
};

Expected<void> putDirtyRows(FrameStream& out, const Index& index) {
    for (const RowNumber number : index.dirty()) {
        const Row& row = index.row(number);
        if (row.isFree()) {
            putRemoval(out.records(), number);
        } else {
            putRow(out.records(), number, row, index.name(number));
        }
        out.countEvent();
        if (auto done = out.endRecord(); !done) {
            return done;
        }
    }
    return {};
}

}  // namespace

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
    const std::uint64_t count = index.dirty().size() + (gapIsNew_ ? 1U : 0U);
    if (auto reserved = range_.reserve(lastEvent_ + count, lastDocument); !reserved) {
        return reserved;
    }
    if (writer_.offset() > segmentLimit) {
        if (auto rolled = rollSegment(); !rolled) {
            return rolled;
        }
    }
    if (auto written = writeCommit(index, events, lastDocument); !written) {
        return written;
    }
    index.clearDirty();
    events.clear();
    gapIsNew_ = false;
    return {};
}

Expected<void> Journal::writeCommit(const Index& index, const EventBatch& /*events*/,
                                    std::uint32_t lastDocument) {
    const std::uint64_t start = writer_.offset();
    FrameStream out(writer_, sequence_, lastEvent_);
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
    done = done ? putDirtyRows(out, index) : done;
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
    return writeHead();
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
    auto next = SegmentWriter::create(folder_.store(), identity_.uuid,
                                      {writer_.number() + 1, sequence_ + 1, lastEvent_});
    if (!next) {
        return Unexpected(next.error());
    }
    olderLogBytes_ += writer_.offset();
    writer_ = std::move(*next);
    return writeHead();
}

bool Journal::wantsSnapshot() const {
    return logBytes() > std::max(smallestTail, snapshotBytes_ / 4);
}

Expected<void> Journal::writeSnapshot(Index& index) {
    if (failure_) {
        return Unexpected(*failure_);
    }
    // Even where there is no room for another snapshot, what the last one covers can go.
    removeOldSegments();
    if (writer_.offset() > segmentHeaderSize) {
        if (auto rolled = rollSegment(); !rolled) {
            return rolled;
        }
    }
    index.compactNames();
    const auto bytes = native::writeSnapshot(
        folder_.snapshot(), identity_.uuid,
        {writer_.number(), sequence_, lastEvent_, lastDocument_}, index, gaps_);
    if (!bytes) {
        return Unexpected(bytes.error());
    }
    snapshotBytes_ = *bytes;
    snapshotSegment_ = writer_.number();
    removeOldSegments();
    olderLogBytes_ = 0;
    return {};
}

void Journal::removeOldSegments() {
    const auto numbers = folder_.segments();
    if (!numbers) {
        return;  // they are removed another time
    }
    for (const std::uint64_t number : *numbers) {
        if (number < snapshotSegment_) {
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
