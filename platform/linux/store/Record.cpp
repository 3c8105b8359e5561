#include "platform/linux/store/Record.h"

#include <algorithm>
#include <bit>
#include <limits>

namespace marrowdale::native {

namespace {

constexpr std::uint32_t headSize = 4;
constexpr std::uint32_t rowBodySize = 56;
constexpr std::uint32_t touchBodySize = 32;

void putHead(ByteWriter& out, Record::Type type, std::size_t bodySize) {
    const auto length = static_cast<std::uint32_t>(bodySize) + headSize;
    out.put(static_cast<std::uint32_t>(type) | length << 8U);
}

bool isRowNumber(RowNumber number) {
    return number >= rootRow && number < (1U << 27U);
}

bool takeRow(ByteReader& body, Record& record) {
    Row& row = record.values;
    record.row = body.take<RowNumber>();
    row.parent = body.take<RowNumber>();
    row.document = body.take<std::uint32_t>();
    row.flags = body.take<std::uint32_t>();
    row.fileID = body.take<std::uint64_t>();
    row.birth = body.take<std::int64_t>();
    row.changed = body.take<std::int64_t>();
    row.size = body.take<std::uint64_t>();
    row.fingerprint = body.take<std::uint32_t>();
    row.attributes = body.take<std::uint32_t>();
    record.name = body.rest();
    return body.ok() && isRowNumber(record.row) && !row.isFree() && record.name.size() <= 255 &&
           record.name.empty() == (record.row == rootRow);
}

bool takeTouch(ByteReader& body, Record& record) {
    Row& row = record.values;
    record.row = body.take<RowNumber>();
    row.flags = body.take<std::uint32_t>();
    row.changed = body.take<std::int64_t>();
    row.size = body.take<std::uint64_t>();
    row.fingerprint = body.take<std::uint32_t>();
    row.attributes = body.take<std::uint32_t>();
    return body.finished() && isRowNumber(record.row) && !row.isFree();
}

// The flags of an item begin at bit 16, so turned by that much they mostly are one byte. The bit
// below them says that a document is gone.
constexpr int flagTurn = 16;

bool takeEvent(ByteReader& body, Record& record) {
    StoredEvent& event = record.event;
    const std::uint64_t head = body.takeVarint();
    const std::uint64_t turned = head >> 1U;
    event.flags = std::rotl(static_cast<std::uint32_t>(turned), flagTurn);
    event.fileID = FileID{body.takeVarint()};
    const std::uint64_t gone = (head & 1U) != 0 ? body.takeVarint() : 0;
    event.goneDocument = DocumentID{static_cast<std::uint32_t>(gone)};
    record.shared = body.takeVarint();
    event.path = body.rest();
    constexpr std::uint64_t most = std::numeric_limits<std::uint32_t>::max();
    return body.ok() && turned <= most && gone <= most && (gone != 0) == ((head & 1U) != 0) &&
           record.shared <= longestEventPath &&
           event.path.size() <= longestEventPath - record.shared;
}

bool takeAttributes(ByteReader& body, Record& record) {
    record.row = body.take<RowNumber>();
    while (body.ok() && body.left() > 0) {
        std::string name(body.takeTextWithLength());
        record.attributes.emplace_back(std::move(name), body.takeTextWithLength());
    }
    return body.finished() && isRowNumber(record.row);
}

bool takeBody(ByteReader& body, Record& record) {
    switch (record.type) {
        case Record::Type::rowPut:
            return takeRow(body, record);
        case Record::Type::rowRemoved:
            record.row = body.take<RowNumber>();
            return body.finished() && isRowNumber(record.row);
        case Record::Type::gap:
            record.gap.first = body.take<std::uint64_t>();
            record.gap.last = body.take<std::uint64_t>();
            return body.finished() && record.gap.first <= record.gap.last;
        case Record::Type::documentCounter:
            record.document = body.take<std::uint32_t>();
            return body.finished();
        case Record::Type::rowTouched:
            return takeTouch(body, record);
        case Record::Type::event:
            return takeEvent(body, record);
        case Record::Type::attributes:
            return takeAttributes(body, record);
        case Record::Type::passedOver:
            break;
    }
    return true;
}

std::optional<Record::Type> typeOf(std::uint32_t number) {
    constexpr std::uint32_t lastPassedOver = 0x7F;
    if (number == static_cast<std::uint32_t>(Record::Type::event)) {
        return Record::Type::event;
    }
    if (number == static_cast<std::uint32_t>(Record::Type::attributes)) {
        return Record::Type::attributes;
    }
    if (number >= static_cast<std::uint32_t>(Record::Type::passedOver) &&
        number <= lastPassedOver) {
        return Record::Type::passedOver;
    }
    if (number >= static_cast<std::uint32_t>(Record::Type::rowPut) &&
        number <= static_cast<std::uint32_t>(Record::Type::rowTouched)) {
        return static_cast<Record::Type>(number);
    }
    return std::nullopt;
}

}  // namespace

void putRow(ByteWriter& out, RowNumber number, const Row& row, std::string_view name) {
    putHead(out, Record::Type::rowPut, rowBodySize + name.size());
    out.put(number);
    out.put(row.parent);
    out.put(row.document);
    out.put(row.flags & Row::lastingFlags);
    out.put(row.fileID);
    out.put(row.birth);
    out.put(row.changed);
    out.put(row.isFolder() ? std::uint64_t{0} : row.size);
    out.put(row.fingerprint);
    out.put(row.attributes);
    out.text(name);
}

void putTouch(ByteWriter& out, RowNumber number, const Row& row) {
    putHead(out, Record::Type::rowTouched, touchBodySize);
    out.put(number);
    out.put(row.flags & Row::lastingFlags);
    out.put(row.changed);
    out.put(row.isFolder() ? std::uint64_t{0} : row.size);
    out.put(row.fingerprint);
    out.put(row.attributes);
}

void putRemoval(ByteWriter& out, RowNumber number) {
    putHead(out, Record::Type::rowRemoved, sizeof number);
    out.put(number);
}

void putAttributes(ByteWriter& out, RowNumber number, const CarriedAttributes& attributes) {
    std::size_t size = sizeof number;
    for (const auto& [name, value] : attributes) {
        size += 2 * sizeof(std::uint32_t) + name.size() + value.size();
    }
    putHead(out, Record::Type::attributes, size);
    out.put(number);
    for (const auto& [name, value] : attributes) {
        out.textWithLength(name);
        out.textWithLength(value);
    }
}

void putGap(ByteWriter& out, const EventGap& gap) {
    putHead(out, Record::Type::gap, sizeof gap.first + sizeof gap.last);
    out.put(gap.first);
    out.put(gap.last);
}

void putDocumentCounter(ByteWriter& out, std::uint32_t last) {
    putHead(out, Record::Type::documentCounter, sizeof last);
    out.put(last);
}

void putEvent(ByteWriter& out, const StoredEvent& event, std::string_view before) {
    const auto shared = static_cast<std::size_t>(std::ranges::mismatch(event.path, before).in1 -
                                                 event.path.begin());
    const std::uint32_t gone = raw(event.goneDocument);
    const std::size_t start = out.size();
    putHead(out, Record::Type::event, 0);
    out.putVarint(std::uint64_t{std::rotr(event.flags, flagTurn)} << 1U | (gone != 0 ? 1U : 0U));
    out.putVarint(raw(event.fileID));
    if (gone != 0) {
        out.putVarint(gone);
    }
    out.putVarint(shared);
    out.text(event.path.substr(shared));
    const auto length = static_cast<std::uint32_t>(out.size() - start);
    out.putAt(start, static_cast<std::uint32_t>(Record::Type::event) | length << 8U);
}

std::optional<Record> RecordReader::next() {
    if (in_.left() == 0) {
        return std::nullopt;
    }
    const auto head = in_.take<std::uint32_t>();
    const std::uint32_t length = head >> 8U;
    const auto type = typeOf(head & 0xFFU);
    Record record;
    if (in_.ok() && type && length >= headSize) {
        record.type = *type;
        ByteReader body(in_.takeBytes(length - headSize));
        if (in_.ok() && takeBody(body, record)) {
            return record;
        }
    }
    good_ = false;
    return std::nullopt;
}

}  // namespace marrowdale::native
