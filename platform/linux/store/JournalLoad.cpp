// Loading a store: what must be there, what may be cut off, and what is damage.

#include <algorithm>
#include <cerrno>
#include <utility>

#include "platform/linux/store/Journal.h"
#include "platform/linux/store/StoreDamage.h"

namespace marrowdale::native {

namespace {

// More gaps than this become one: an anchor between them is then expired without need, which is
// safe.
constexpr std::size_t mostGaps = 64;

bool isBefore(std::uint64_t segment, std::uint64_t offset, const LogPosition& position) {
    return segment != position.segment ? segment < position.segment : offset < position.offset;
}

// Puts one record into the index or the counters. False when it can't be.
bool applyRecord(const Record& record, Index& index, std::vector<EventGap>& gaps,
                 std::uint32_t& lastDocument) {
    switch (record.type) {
        case Record::Type::rowPut:
            index.restoreRow(record.row, record.values, record.name);
            lastDocument = std::max(lastDocument, record.values.document);
            return true;
        case Record::Type::rowRemoved:
            if (record.row >= index.endOfRows()) {
                // Made and removed within one commit.
                return true;
            }
            index.freeRestoredRow(record.row);
            return true;
        case Record::Type::rowTouched:
            return index.restoreTouch(record.row, record.values);
        case Record::Type::attributes:
            return index.restoreAttributes(record.row, record.attributes);
        case Record::Type::gap:
            gaps.push_back(record.gap);
            return true;
        case Record::Type::documentCounter:
            lastDocument = std::max(lastDocument, record.document);
            return true;
        case Record::Type::event:
        case Record::Type::passedOver:
            return true;
    }
    return false;
}

}  // namespace

// Where the reading of the log stands.
struct Journal::Replay {
    std::uint64_t segment = 1;
    std::uint64_t sequence = 0;   // of the last frame that was taken
    std::uint64_t goodEnd = 0;    // in `segment`, behind the last whole commit
    std::vector<std::byte> open;  // records of a commit whose end was not met yet
    std::uint64_t openSequence = 0;
    std::uint64_t openLastEvent = 0;
    std::vector<std::pair<SegmentHeader, std::uint64_t>> met;  // segments and where they end
};

Expected<std::unique_ptr<Journal>> Journal::load(const StoreFolder& folder,
                                                 const StoreIdentity& identity,
                                                 const std::string& cacheFolder, Index& index,
                                                 Options options) {
    std::unique_ptr<Journal> journal(new Journal(folder, identity, std::move(options)));
    auto done = journal->openSmallFiles(cacheFolder);
    done = done ? journal->loadSnapshot(index) : done;
    done = done ? journal->replayLog(index) : done;
    if (!done) {
        return Unexpected(done.error());
    }
    journal->noteGap();
    return journal;
}

Expected<void> Journal::openSmallFiles(const std::string& cacheFolder) {
    auto range = IdentifierRange::open(folder_.identifiers(), identity_.uuid);
    if (!range) {
        return Unexpected(range.error());
    }
    auto head = StoreHead::open(folder_.head(), identity_.uuid);
    if (!head) {
        return Unexpected(head.error());
    }
    range_ = std::move(*range);
    head_ = std::move(*head);
    openWitness(cacheFolder);
    return {};
}

void Journal::openWitness(const std::string& cacheFolder) {
    if (cacheFolder.empty()) {
        witnessProblem_ = "there is no cache folder";
        return;
    }
    if (auto made = makeFolders(cacheFolder); !made) {
        witnessProblem_ = made.error().description();
        return;
    }
    const std::string path = folder_.witness(cacheFolder);
    auto witness = StoreHead::open(path, identity_.uuid);
    if (!witness) {
        witness = StoreHead::create(path, identity_.uuid, head_.position());
    }
    if (witness) {
        witness_ = std::move(*witness);
    } else {
        witnessProblem_ = witness.error().description();
    }
}

// Head and witness are written one after the other, so either may be the newer one.
LogPosition Journal::mustReach() const {
    const LogPosition& head = head_.position();
    return witness_ && witness_.position().sequence > head.sequence ? witness_.position() : head;
}

Expected<void> Journal::loadSnapshot(Index& index) {
    auto loaded = readSnapshot(folder_.snapshot(), identity_.uuid, index);
    if (!loaded) {
        return Unexpected(loaded.error());
    }
    lastDocument_ = identity_.firstDocument - 1;
    if (*loaded) {
        const SnapshotHeader& header = (*loaded)->header;
        snapshotSegment_ = header.segment;
        snapshotBytes_ = (*loaded)->bytes;
        sequence_ = header.sequence;
        lastEvent_ = header.lastEvent;
        lastDocument_ = header.lastDocument;
        gaps_ = std::move((*loaded)->gaps);
    }
    return {};
}

Expected<void> Journal::replayLog(Index& index) {
    Replay replay;
    replay.segment = snapshotSegment_;
    replay.sequence = sequence_;
    while (true) {
        const auto goesOn = replaySegment(replay, index);
        if (!goesOn) {
            return Unexpected(goesOn.error());
        }
        if (!*goesOn) {
            break;
        }
        ++replay.segment;
        replay.goodEnd = 0;
    }
    if (auto reached = checkReach(replay); !reached) {
        return reached;
    }
    if (!index.finishRestoring()) {
        return Unexpected(damageOf(folder_.store(), "the rows are no tree"));
    }
    return startWriting(replay);
}

// True when the next segment is to be looked for.
Expected<bool> Journal::replaySegment(Replay& replay, Index& index) {
    const std::string path = folder_.segment(replay.segment);
    const LogPosition reach = mustReach();
    // A segment behind the head may have been in the making when the process ended.
    const bool mayBeMissing = replay.segment > reach.segment && replay.segment != snapshotSegment_;
    auto reader = SegmentReader::open(path, identity_.uuid, replay.segment);
    if (!reader) {
        const Error error = missingIsDamage(reader.error(), path);
        if (mayBeMissing && isDamage(error)) {
            return false;
        }
        return Unexpected(error);
    }
    if (reader->segment().firstSequence != replay.sequence + 1) {
        return Unexpected(damageOf(path, "it does not follow the one before"));
    }
    replay.goodEnd = segmentHeaderSize;
    replay.met.emplace_back(reader->segment(), segmentHeaderSize);
    auto step = reader->next();
    for (; step && *step == SegmentReader::Step::frame; step = reader->next()) {
        const FrameHeader& header = reader->header();
        replay.open.insert(replay.open.end(), reader->records().begin(), reader->records().end());
        replay.openSequence = replay.openSequence == 0 ? replay.sequence + 1 : replay.openSequence;
        if (header.sequence != replay.openSequence) {
            step = SegmentReader::Step::bad;
            break;
        }
        ++replay.openSequence;
        replay.openLastEvent = std::max(replay.openLastEvent, header.lastEvent);
        if ((header.flags & FrameHeader::commitGoesOn) == 0) {
            if (!takeCommit(replay, index)) {
                return Unexpected(damageOf(path, "a record of a wrong shape"));
            }
            replay.goodEnd = reader->offset();
            replay.met.back().second = replay.goodEnd;
        }
    }
    if (!step) {
        return Unexpected(step.error());
    }
    const bool whole = *step == SegmentReader::Step::end && replay.open.empty();
    if (!whole && isBefore(replay.segment, replay.goodEnd, reach)) {
        return Unexpected(damageOf(path, "a frame's checksum does not hold, or it was cut"));
    }
    return whole;
}

bool Journal::takeCommit(Replay& replay, Index& index) {
    RecordReader records(replay.open);
    while (const auto record = records.next()) {
        if (!applyRecord(*record, index, gaps_, lastDocument_)) {
            return false;
        }
    }
    replay.sequence = replay.openSequence - 1;
    lastEvent_ = std::max(lastEvent_, replay.openLastEvent);
    replay.open.clear();
    replay.openSequence = 0;
    return records.isGood();
}

Expected<void> Journal::checkReach(const Replay& replay) const {
    for (const StoreHead* head : {&head_, &witness_}) {
        if (!*head) {
            continue;
        }
        const LogPosition& position = head->position();
        if (replay.sequence < position.sequence || lastEvent_ < position.lastEvent ||
            lastDocument_ < position.lastDocument) {
            return Unexpected(damageOf(folder_.store(), head == &head_
                                                            ? "the log ends before its head"
                                                            : "it is older than its witness"));
        }
    }
    if (lastEvent_ > range_.eventEnd() || lastDocument_ > range_.documentEnd()) {
        return Unexpected(damageOf(folder_.identifiers(), "identifiers beyond its ranges"));
    }
    return {};
}

Expected<void> Journal::startWriting(const Replay& replay) {
    sequence_ = replay.sequence;
    const auto older = olderSegments(replay.met.front().first);
    if (!older) {
        return Unexpected(older.error());
    }
    for (const auto& [header, end] : *older) {
        log_->begin(header, end);
    }
    for (const auto& [header, end] : replay.met) {
        log_->begin(header, end);
    }
    // Behind it there may be one whose header never reached the disk.
    const auto& [last, end] = replay.met.back();
    const auto numbers = folder_.segments();
    if (!numbers) {
        return Unexpected(numbers.error());
    }
    for (const std::uint64_t number : *numbers) {
        if (number > last.number) {
            if (auto removed = removeFile(folder_.segment(number)); !removed) {
                return removed;
            }
        }
    }
    auto writer = SegmentWriter::resume(folder_.store(), last.number, end);
    if (!writer) {
        return Unexpected(writer.error());
    }
    writer_ = std::move(*writer);
    log_->advance(end, sequence_, lastEvent_);
    return writeHead();
}

// The segments that only history needs. Where one is missing or damaged, history begins behind it:
// that costs those a fresh start who read from further back, and nobody an identifier.
Expected<std::vector<std::pair<SegmentHeader, std::uint64_t>>> Journal::olderSegments(
    const SegmentHeader& first) {
    std::vector<std::pair<SegmentHeader, std::uint64_t>> older;
    SegmentHeader next = first;
    while (next.number > 1) {
        const std::string path = folder_.segment(next.number - 1);
        const auto reader = SegmentReader::open(path, identity_.uuid, next.number - 1);
        if (!reader && reader.error().code == ENOENT) {
            break;  // it was given up
        }
        const bool fits = reader && reader->segment().firstSequence <= next.firstSequence &&
                          reader->segment().lastEventBefore <= next.lastEventBefore;
        if (!fits && (reader || isDamage(reader.error()))) {
            historyProblem_ =
                (reader ? damageOf(path, "it does not go with the one behind it") : reader.error())
                    .description();
            break;
        }
        const auto size =
            reader ? reader->fileSize() : Expected<std::uint64_t>(Unexpected(reader.error()));
        if (!size) {
            return Unexpected(size.error());
        }
        next = reader->segment();
        older.emplace_back(next, *size);
    }
    std::ranges::reverse(older);
    return older;
}

void Journal::noteGap() {
    lastLoadedEvent_ = lastEvent_;
    if (range_.eventEnd() > lastEvent_) {
        gaps_.push_back({lastEvent_ + 1, range_.eventEnd()});
        gapIsNew_ = true;
        lastEvent_ = range_.eventEnd();
    }
    documentFloor_ = range_.documentEnd();
    trimGaps();
    log_->setGaps(gaps_, lastEvent_);
    trim();
}

void Journal::trimGaps() {
    if (gaps_.size() > mostGaps) {
        const std::size_t surplus = gaps_.size() - mostGaps;
        gaps_[surplus].first = gaps_.front().first;
        gaps_.erase(gaps_.begin(), gaps_.begin() + static_cast<std::ptrdiff_t>(surplus));
    }
}

}  // namespace marrowdale::native
