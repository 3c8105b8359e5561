// Records of every kind, whole, cut and changed.

#include <algorithm>
#include <functional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/store/Record.h"

namespace marrowdale::native {
namespace {

Row someRow() {
    Row row{};
    row.fileID = 0x1122'3344'5566'7788;
    row.birth = -1;
    row.changed = 1'700'000'000'000'000'000;
    row.size = 12;
    row.fingerprint = 0xABCD'EF01;
    row.parent = rootRow;
    row.document = 9;
    row.flags = static_cast<std::uint32_t>(RowKind::file) | Row::unsure;
    return row;
}

StoredEvent someEvent() {
    return {
        .flags = 0x8'0000, .fileID = FileID{300}, .goneDocument = DocumentID{200}, .path = "a/b"};
}

using Put = std::function<void(ByteWriter&)>;
const std::vector<std::pair<Record::Type, Put>>& everyKind() {
    static const std::vector<std::pair<Record::Type, Put>> kinds{
        {Record::Type::rowPut, [](ByteWriter& out) { putRow(out, 5, someRow(), "name"); }},
        {Record::Type::rowTouched, [](ByteWriter& out) { putTouch(out, 5, someRow()); }},
        {Record::Type::rowRemoved, [](ByteWriter& out) { putRemoval(out, 5); }},
        {Record::Type::gap, [](ByteWriter& out) { putGap(out, {3, 4}); }},
        {Record::Type::documentCounter, [](ByteWriter& out) { putDocumentCounter(out, 7); }},
        {Record::Type::event, [](ByteWriter& out) { putEvent(out, someEvent(), ""); }}};
    return kinds;
}

TEST(RecordTest, EveryKindIsReadAndRefusedWhereItIsCut) {
    for (const auto& [type, put] : everyKind()) {
        ByteWriter out;
        put(out);
        RecordReader whole(out.bytes());
        const auto record = whole.next();
        ASSERT_TRUE(record);
        EXPECT_EQ(record->type, type);
        EXPECT_FALSE(whole.next());
        EXPECT_TRUE(whole.isGood());
        for (std::size_t length = 1; length < out.size(); ++length) {
            RecordReader cut(out.bytes().first(length));
            EXPECT_FALSE(cut.next()) << static_cast<int>(type) << " cut at " << length;
            EXPECT_FALSE(cut.isGood());
        }
    }
}

// A record that ends earlier than its kind needs, though its length says so.
TEST(RecordTest, EveryKindIsRefusedWhenItsLengthIsShort) {
    for (const auto& [type, put] : everyKind()) {
        ByteWriter out;
        put(out);
        const auto text = type == Record::Type::event    ? someEvent().path.size()
                          : type == Record::Type::rowPut ? std::string("name").size()
                                                         : 0;
        for (std::size_t length = 0; length < out.size() - text; ++length) {
            ByteWriter shorter;
            shorter.append(out.bytes());
            shorter.putAt(0, static_cast<std::uint32_t>(type) | static_cast<std::uint32_t>(length)
                                                                    << 8U);
            RecordReader reader(shorter.bytes().first(std::max<std::size_t>(length, 4)));
            EXPECT_FALSE(reader.next()) << static_cast<int>(type) << " of length " << length;
            EXPECT_FALSE(reader.isGood());
        }
    }
}

// Checksums find changed bytes first; should one slip through, reading must still end well.
TEST(RecordTest, NoChangedByteLeadsOutOfTheBytes) {
    for (const auto& [type, put] : everyKind()) {
        ByteWriter out;
        put(out);
        for (std::size_t at = 0; at < out.size(); ++at) {
            for (unsigned bit = 0; bit < 8; ++bit) {
                std::vector<std::byte> changed(out.bytes().begin(), out.bytes().end());
                changed[at] ^= std::byte{1} << bit;
                RecordReader reader(changed);
                while (reader.next()) {
                }
            }
        }
    }
}

TEST(RecordTest, AnEventTakesFewBytesBesideItsPath) {
    ByteWriter out;
    putEvent(out, {.flags = 0x2'0000, .fileID = FileID{1'000'000}, .path = "folder/file"},
             "folder/fine");
    EXPECT_EQ(out.size(), 4U + 1U + 3U + 1U + std::string_view("le").size());
    RecordReader reader(out.bytes());
    const auto record = reader.next();
    ASSERT_TRUE(record);
    EXPECT_EQ(record->shared, std::string_view("folder/fi").size());
    EXPECT_EQ(record->event.path, "le");
    EXPECT_EQ(record->event.flags, 0x2'0000U);
    EXPECT_EQ(record->event.fileID, FileID{1'000'000});
    EXPECT_EQ(record->event.goneDocument, DocumentID{});
}

TEST(RecordTest, AttributesComeBackWhole) {
    const CarriedAttributes attributes{{"user.a", std::string("\0\xff", 2)}, {"user.b", ""}};
    ByteWriter out;
    putAttributes(out, 7, attributes);
    putAttributes(out, 8, {});
    RecordReader reader(out.bytes());
    const auto first = reader.next();
    ASSERT_TRUE(first);
    EXPECT_EQ(first->type, Record::Type::attributes);
    EXPECT_EQ(first->row, 7U);
    EXPECT_EQ(first->attributes, attributes);
    const auto second = reader.next();
    ASSERT_TRUE(second);
    EXPECT_TRUE(second->attributes.empty());
    EXPECT_FALSE(reader.next());
    EXPECT_TRUE(reader.isGood());
    for (std::size_t length = 1; length < out.bytes().size(); ++length) {
        RecordReader cut(out.bytes().first(length));
        while (cut.next()) {
        }
        const bool isBoundary = cut.isGood();
        EXPECT_EQ(isBoundary, length == out.bytes().size() - 8) << length;
    }
}

TEST(RecordTest, TypesOfLaterProgramsThatTellNothingOfTheIndexArePassedOver) {
    for (std::uint32_t type = 0; type <= 0xFF; ++type) {
        const bool isPassed = type > 0x40 && type <= 0x7F;
        if ((type >= 1 && type <= 5) || type == 0x40 || type == 0x42) {
            continue;
        }
        ByteWriter out;
        out.put(type | 6U << 8U);
        out.put(std::uint16_t{1});
        RecordReader reader(out.bytes());
        EXPECT_EQ(reader.next().has_value(), isPassed) << type;
        EXPECT_EQ(reader.isGood(), isPassed) << type;
    }
}

TEST(RecordTest, VarintsAreReadAsTheyWereWritten) {
    std::vector<std::uint64_t> values{0, 1, 127, 128, 0xFFFF'FFFF'FFFF'FFFF};
    for (unsigned bit = 0; bit < 64; ++bit) {
        values.push_back(std::uint64_t{1} << bit);
        values.push_back((std::uint64_t{1} << bit) - 1);
    }
    for (const std::uint64_t value : values) {
        ByteWriter out;
        out.putVarint(value);
        ByteReader in(out.bytes());
        EXPECT_EQ(in.takeVarint(), value);
        EXPECT_TRUE(in.finished());
        ByteReader cut(out.bytes().first(out.size() - 1));
        EXPECT_EQ(cut.takeVarint(), 0U);
        EXPECT_FALSE(cut.ok());
    }
    std::vector<std::byte> tooLong(10, std::byte{0xFF});
    ByteReader in(tooLong);
    EXPECT_EQ(in.takeVarint(), 0U);
    EXPECT_FALSE(in.ok());
}

}  // namespace
}  // namespace marrowdale::native
