#include <algorithm>
#include <random>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/events/FanotifyRecords.h"
#include "platform/linux/events/FanotifyTestBytes.h"

namespace marrowdale::native {
namespace {

const std::string folder = FanotifyTestBytes::handle(1, "folder__");
const std::string other = FanotifyTestBytes::handle(0x81, "other_folder");
const std::string thing = FanotifyTestBytes::handle(1, "thing___");

std::string infoOf(std::uint8_t kind, std::string_view handle, std::string_view name = {},
                   std::size_t padding = 0) {
    return FanotifyTestBytes::info(kind, handle, name, padding);
}

// The only record of the bytes.
FanotifyRecord only(const FanotifyTestBytes& bytes) {
    FanotifyRecords records(bytes.bytes());
    const auto record = records.next();
    EXPECT_TRUE(record);
    EXPECT_FALSE(records.next());
    EXPECT_FALSE(records.isMalformed());
    return record.value_or(FanotifyRecord{});
}

TEST(FanotifyRecordsTest, nameInAFolderAndTheThing) {
    FanotifyTestBytes bytes;
    bytes.event(FAN_CREATE, infoOf(FAN_EVENT_INFO_TYPE_DFID_NAME, folder, "name", 3) +
                                infoOf(FAN_EVENT_INFO_TYPE_FID, thing));
    const FanotifyRecord record = only(bytes);
    EXPECT_EQ(record.mask, FAN_CREATE);
    ASSERT_TRUE(record.place);
    EXPECT_EQ(record.place->folder, folder);
    EXPECT_EQ(record.place->name, "name");
    EXPECT_EQ(record.thing, thing);
    EXPECT_FALSE(record.from || record.to || record.isOverflow());
}

TEST(FanotifyRecordsTest, folderItselfHasAnEmptyName) {
    for (const std::string& info : {infoOf(FAN_EVENT_INFO_TYPE_DFID_NAME, folder, "."),
                                    infoOf(FAN_EVENT_INFO_TYPE_DFID_NAME, folder, ""),
                                    infoOf(FAN_EVENT_INFO_TYPE_DFID, folder)}) {
        FanotifyTestBytes bytes;
        const FanotifyRecord record = only(bytes.event(FAN_ATTRIB | FAN_ONDIR, info));
        ASSERT_TRUE(record.place);
        EXPECT_EQ(record.place->folder, folder);
        EXPECT_EQ(record.place->name, "");
    }
}

TEST(FanotifyRecordsTest, renameHasBothPlacesOrOneOfThem) {
    const std::string from = infoOf(FAN_EVENT_INFO_TYPE_OLD_DFID_NAME, folder, "old");
    const std::string to = infoOf(FAN_EVENT_INFO_TYPE_NEW_DFID_NAME, other, "new", 1);
    FanotifyTestBytes both;
    FanotifyRecord record =
        only(both.event(FAN_RENAME, from + to + infoOf(FAN_EVENT_INFO_TYPE_FID, thing)));
    ASSERT_TRUE(record.from && record.to);
    EXPECT_EQ(record.from->folder, folder);
    EXPECT_EQ(record.from->name, "old");
    EXPECT_EQ(record.to->folder, other);
    EXPECT_EQ(record.to->name, "new");
    EXPECT_EQ(record.thing, thing);
    FanotifyTestBytes away;
    record = only(away.event(FAN_RENAME, from));
    EXPECT_TRUE(record.from && !record.to);
    FanotifyTestBytes here;
    record = only(here.event(FAN_RENAME, to));
    EXPECT_TRUE(record.to && !record.from);
}

TEST(FanotifyRecordsTest, everyEventOfAReadIsTold) {
    FanotifyTestBytes bytes;
    for (std::size_t i = 0; i < 100; ++i) {
        bytes.event(FAN_MODIFY,
                    infoOf(FAN_EVENT_INFO_TYPE_DFID_NAME, folder, std::string(i + 1, 'n')));
    }
    bytes.event(FAN_Q_OVERFLOW, "");
    FanotifyRecords records(bytes.bytes());
    for (std::size_t i = 0; i < 100; ++i) {
        const auto record = records.next();
        ASSERT_TRUE(record && record->place);
        EXPECT_EQ(record->place->name.size(), i + 1);
    }
    EXPECT_TRUE(records.next()->isOverflow());
    EXPECT_FALSE(records.next());
    EXPECT_FALSE(records.isMalformed());
}

TEST(FanotifyRecordsTest, unknownInformationAndUnknownBitsArePassedOver) {
    constexpr std::uint64_t unknown = std::uint64_t{1} << 52U;
    FanotifyTestBytes bytes;
    bytes.event(FAN_MODIFY | unknown,
                FanotifyTestBytes::unknownInfo(200, "what may come one day") +
                    FanotifyTestBytes::unknownInfo(FAN_EVENT_INFO_TYPE_PIDFD, "1234") +
                    infoOf(FAN_EVENT_INFO_TYPE_DFID_NAME, folder, "name"));
    const FanotifyRecord record = only(bytes);
    EXPECT_EQ(record.mask, FAN_MODIFY | unknown);
    ASSERT_TRUE(record.place);
    EXPECT_EQ(record.place->name, "name");
}

TEST(FanotifyRecordsTest, longerMetadataOfALaterKernelIsPassedOver) {
    const std::string info = infoOf(FAN_EVENT_INFO_TYPE_DFID_NAME, folder, "name");
    FanotifyTestBytes bytes;
    bytes.event(FAN_MODIFY, std::string(8, '\xff') + info);
    const std::uint16_t longer = sizeof(fanotify_event_metadata) + 8;
    std::memcpy(bytes.text().data() + offsetof(fanotify_event_metadata, metadata_len), &longer,
                sizeof longer);
    EXPECT_EQ(only(bytes).place->name, "name");
}

// Reads a copy that ends where the memory does, so that a sanitizer sees each step beyond it, and
// touches everything that was told.
std::size_t readAll(std::string_view text, bool& malformed) {
    const std::vector<std::byte> exact(
        reinterpret_cast<const std::byte*>(text.data()),
        reinterpret_cast<const std::byte*>(text.data()) + text.size());
    const auto inside = [&](std::string_view view) {
        const auto* begin = reinterpret_cast<const char*>(exact.data());
        return view.empty() ||
               (view.data() >= begin && view.data() + view.size() <= begin + exact.size());
    };
    FanotifyRecords records(exact);
    std::size_t count = 0;
    while (const auto record = records.next()) {
        ++count;
        EXPECT_TRUE(inside(record->thing));
        for (const auto& place : {record->place, record->from, record->to}) {
            EXPECT_TRUE(!place || (inside(place->folder) && inside(place->name)));
        }
    }
    malformed = records.isMalformed();
    return count;
}

FanotifyTestBytes threeEvents() {
    FanotifyTestBytes bytes;
    bytes
        .event(FAN_CREATE, infoOf(FAN_EVENT_INFO_TYPE_DFID_NAME, folder, "name", 3) +
                               infoOf(FAN_EVENT_INFO_TYPE_FID, thing))
        .event(FAN_RENAME, infoOf(FAN_EVENT_INFO_TYPE_OLD_DFID_NAME, folder, "old") +
                               infoOf(FAN_EVENT_INFO_TYPE_NEW_DFID_NAME, other, "new") +
                               infoOf(FAN_EVENT_INFO_TYPE_FID, thing))
        .event(FAN_Q_OVERFLOW, "");
    return bytes;
}

TEST(FanotifyRecordsTest, cutAtAnyLengthIsMalformedButBetweenEvents) {
    FanotifyTestBytes bytes = threeEvents();
    std::vector<std::size_t> ends{0};
    for (std::uint32_t length = 0; ends.back() < bytes.text().size();) {
        std::memcpy(&length, bytes.text().data() + ends.back(), sizeof length);
        ends.push_back(ends.back() + length);
    }
    for (std::size_t length = 0; length < bytes.text().size(); ++length) {
        bool malformed = false;
        const std::size_t count = readAll(bytes.text().substr(0, length), malformed);
        const auto end = std::find(ends.begin(), ends.end(), length);
        EXPECT_EQ(malformed, end == ends.end()) << length;
        EXPECT_EQ(count, std::upper_bound(ends.begin(), ends.end(), length) - ends.begin() - 1);
    }
}

TEST(FanotifyRecordsTest, anyByteMayBeAnyOtherWithoutALookBeyondTheBytes) {
    const FanotifyTestBytes good = threeEvents();
    for (std::size_t at = 0; at < good.bytes().size(); ++at) {
        for (int value = 0; value < 256; ++value) {
            FanotifyTestBytes bad = good;
            bad.text()[at] = static_cast<char>(value);
            bool malformed = false;
            EXPECT_LE(readAll(bad.text(), malformed), 10U);
        }
    }
}

TEST(FanotifyRecordsTest, lengthsThatMakeNoSenseEndTheReading) {
    const auto with = [](std::size_t at, std::uint32_t value, std::size_t bytes) {
        FanotifyTestBytes bad = threeEvents();
        std::memcpy(bad.text().data() + at, &value, bytes);
        bool malformed = false;
        EXPECT_EQ(readAll(bad.text(), malformed), 0U) << at << " " << value;
        EXPECT_TRUE(malformed) << at << " " << value;
    };
    constexpr std::size_t info = sizeof(fanotify_event_metadata);
    constexpr std::size_t handleBytes = info + offsetof(fanotify_event_info_fid, handle);
    for (const std::uint32_t length : {0U, 1U, 23U, 25U, 0x7fffffffU, 0xffffffffU}) {
        with(offsetof(fanotify_event_metadata, event_len), length, 4);
    }
    with(offsetof(fanotify_event_metadata, vers), FANOTIFY_METADATA_VERSION + 1, 1);
    for (const std::uint32_t length : {0U, 23U, 0xffffU}) {
        with(offsetof(fanotify_event_metadata, metadata_len), length, 2);
    }
    for (const std::uint32_t length : {0U, 3U, 5U, 0xffffU}) {
        with(info + offsetof(fanotify_event_info_header, len), length, 2);
    }
    for (const std::uint32_t length : {1000U, 0x80000000U, 0xfffffff0U, 0xffffffffU}) {
        with(handleBytes, length, 4);
    }
}

TEST(FanotifyRecordsTest, noiseEnds) {
    std::mt19937 random(4711);
    for (int round = 0; round < 2000; ++round) {
        std::string noise(random() % 300, '\0');
        for (char& c : noise) {
            c = static_cast<char>(random());
        }
        bool malformed = false;
        EXPECT_LE(readAll(noise, malformed), noise.size());
    }
}

}  // namespace
}  // namespace marrowdale::native
