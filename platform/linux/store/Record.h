#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>

#include "platform/linux/store/Bytes.h"
#include "platform/linux/store/CarriedAttributes.h"
#include "platform/linux/store/EventBatch.h"
#include "platform/linux/store/Row.h"

namespace marrowdale::native {

// Event identifiers that were lost between two runs, both ends included.
struct EventGap {
    std::uint64_t first = 0;
    std::uint64_t last = 0;
};

// One record of a frame (docs/formats/store.md).
struct Record {
    enum class Type : std::uint8_t {
        rowPut = 0x01,
        rowRemoved = 0x02,
        gap = 0x03,
        documentCounter = 0x04,
        rowTouched = 0x05,
        event = 0x40,
        attributes = 0x42,
        passedOver = 0x41,  // and up to 0x7F: nothing of the index
    };
    Type type = Type::passedOver;
    RowNumber row = noRow;       // rowPut, rowRemoved, rowTouched
    Row values{};                // rowPut; rowTouched: what Index::update sets
    std::string_view name;       // rowPut; lies in the bytes that were read
    EventGap gap;                // gap
    std::uint32_t document = 0;  // documentCounter
    // event, without its identifier; the path is what follows the first `shared` bytes of the path
    // of the event before it in the frame, and lies in the bytes that were read.
    StoredEvent event;
    std::uint64_t shared = 0;
    CarriedAttributes attributes;  // attributes: all that the row has
};

void putRow(ByteWriter& out, RowNumber number, const Row& row, std::string_view name);
void putTouch(ByteWriter& out, RowNumber number, const Row& row);
void putRemoval(ByteWriter& out, RowNumber number);
void putAttributes(ByteWriter& out, RowNumber number, const CarriedAttributes& attributes);
void putGap(ByteWriter& out, const EventGap& gap);
void putDocumentCounter(ByteWriter& out, std::uint32_t last);

// No event has a longer path.
inline constexpr std::size_t longestEventPath = 0xFFFF;
// `before` is the path of the event before it in the same frame; empty for the first.
void putEvent(ByteWriter& out, const StoredEvent& event, std::string_view before);

// Takes the records of one frame apart.
class RecordReader {
  public:
    explicit RecordReader(std::span<const std::byte> records) : in_(records) {}
    // No value at the end, or when a record has no good shape; then `isGood` is false.
    [[nodiscard]] std::optional<Record> next();
    [[nodiscard]] bool isGood() const { return good_; }

  private:
    ByteReader in_;
    bool good_ = true;
};

}  // namespace marrowdale::native
