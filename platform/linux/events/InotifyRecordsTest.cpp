#include <cstring>
#include <string>
#include <sys/inotify.h>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/events/InotifyRecords.h"

namespace marrowdale::native {
namespace {

std::string event(int watch, std::uint32_t mask, std::uint32_t cookie, std::string_view name,
                  std::size_t padding) {
    inotify_event head{};
    head.wd = watch;
    head.mask = mask;
    head.cookie = cookie;
    head.len = static_cast<std::uint32_t>(name.size() + padding);
    std::string bytes(sizeof head, '\0');
    std::memcpy(bytes.data(), &head, sizeof head);
    return bytes + std::string(name) + std::string(padding, '\0');
}

// A copy that ends where its memory does.
std::vector<std::byte> bytesOf(std::string_view text) {
    const auto* begin = reinterpret_cast<const std::byte*>(text.data());
    return {begin, begin + text.size()};
}

TEST(InotifyRecordsTest, everyEventOfAReadIsTold) {
    const auto bytes =
        bytesOf(event(3, IN_CREATE, 0, "name", 12) + event(4, IN_ATTRIB, 0, "", 0) +
                event(5, IN_MOVED_TO, 77, "x", 15) + event(-1, IN_Q_OVERFLOW, 0, "", 0));
    InotifyRecords records(bytes);
    auto record = records.next();
    ASSERT_TRUE(record);
    EXPECT_EQ(record->watch, 3);
    EXPECT_EQ(record->mask, IN_CREATE);
    EXPECT_EQ(record->name, "name");
    record = records.next();
    ASSERT_TRUE(record);
    EXPECT_EQ(record->watch, 4);
    EXPECT_EQ(record->name, "");
    record = records.next();
    ASSERT_TRUE(record);
    EXPECT_EQ(record->cookie, 77U);
    record = records.next();
    ASSERT_TRUE(record);
    EXPECT_EQ(record->watch, -1);
    EXPECT_FALSE(records.next());
    EXPECT_FALSE(records.isMalformed());
}

TEST(InotifyRecordsTest, nameMayFillItsRoom) {
    const auto bytes = bytesOf(event(3, IN_CREATE, 0, "name", 0));
    EXPECT_EQ(InotifyRecords(bytes).next()->name, "name");
}

TEST(InotifyRecordsTest, cutAtAnyLengthIsMalformedButBetweenEvents) {
    const std::string first = event(3, IN_CREATE, 0, "name", 12);
    const std::string text = first + event(4, IN_ATTRIB, 0, "", 0);
    for (std::size_t length = 0; length < text.size(); ++length) {
        const auto bytes = bytesOf(text.substr(0, length));
        InotifyRecords records(bytes);
        std::size_t count = 0;
        while (records.next()) {
            ++count;
        }
        EXPECT_EQ(count, length < first.size() ? 0U : 1U);
        EXPECT_EQ(records.isMalformed(), length != 0 && length != first.size()) << length;
    }
}

TEST(InotifyRecordsTest, lengthBeyondTheBytesEndsTheReading) {
    for (const std::uint32_t length : {17U, 0x7fffffffU, 0xfffffff0U, 0xffffffffU}) {
        std::string text = event(3, IN_CREATE, 0, "name", 12);
        std::memcpy(text.data() + offsetof(inotify_event, len), &length, sizeof length);
        const auto bytes = bytesOf(text);
        InotifyRecords records(bytes);
        EXPECT_FALSE(records.next());
        EXPECT_TRUE(records.isMalformed());
    }
}

}  // namespace
}  // namespace marrowdale::native
