#include "platform/linux/store/Record.h"

namespace marrowdale::native {

namespace {

constexpr std::uint32_t headSize = 4;
constexpr std::uint32_t rowBodySize = 56;

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
        case Record::Type::passedOver:
            break;
    }
    return true;
}

std::optional<Record::Type> typeOf(std::uint32_t number) {
    constexpr std::uint32_t lastPassedOver = 0x7F;
    if (number >= static_cast<std::uint32_t>(Record::Type::passedOver) &&
        number <= lastPassedOver) {
        return Record::Type::passedOver;
    }
    if (number >= static_cast<std::uint32_t>(Record::Type::rowPut) &&
        number <= static_cast<std::uint32_t>(Record::Type::documentCounter)) {
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

void putRemoval(ByteWriter& out, RowNumber number) {
    putHead(out, Record::Type::rowRemoved, sizeof number);
    out.put(number);
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
