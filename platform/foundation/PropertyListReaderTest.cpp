#include <cerrno>
#include <initializer_list>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "platform/foundation/PropertyListExamples.h"
#include "platform/foundation/PropertyListReader.h"

// Lists that no writer makes: damaged ones, and ones made to do harm.

namespace marrowdale {
namespace {

// A list put together by hand: objects as bytes, with their true offsets unless said.
class HandMadeList {
  public:
    HandMadeList& object(const std::string& bytes) {
        offsets_.push_back(8 + body_.size());
        body_ += bytes;
        return *this;
    }
    HandMadeList& objectAtOffset(std::size_t offset) {
        offsets_.push_back(offset);
        return *this;
    }
    // Bytes of no object.
    HandMadeList& filler(std::size_t count) {
        body_ += std::string(count, '\0');
        return *this;
    }
    HandMadeList& top(std::uint64_t number) {
        top_ = number;
        return *this;
    }
    HandMadeList& referenceSize(std::uint8_t size) {
        referenceSize_ = size;
        return *this;
    }

    [[nodiscard]] std::string bytes() const {
        std::string result = "bplist00" + body_;
        for (const std::size_t offset : offsets_) {
            append(result, offset, 4);
        }
        append(result, 0, 6);
        append(result, 4, 1);
        append(result, referenceSize_, 1);
        append(result, offsets_.size(), 8);
        append(result, top_, 8);
        append(result, 8 + body_.size(), 8);
        return result;
    }

  private:
    static void append(std::string& text, std::uint64_t number, int size) {
        for (int i = size - 1; i >= 0; --i) {
            text += static_cast<char>(i > 7 ? 0 : number >> (8 * i));
        }
    }

    std::string body_;
    std::vector<std::size_t> offsets_;
    std::uint64_t top_ = 0;
    std::uint8_t referenceSize_ = 1;
};

Expected<PropertyList> decoded(const std::string& bytes, const PropertyListLimits& limits = {}) {
    return decodePropertyList(Data::fromText(bytes).bytes(), limits);
}

// Empty when the bytes were read.
std::string reason(const std::string& bytes, const PropertyListLimits& limits = {}) {
    const auto list = decoded(bytes, limits);
    if (list) {
        return "";
    }
    EXPECT_EQ(list.error(), errorWithPOSIXCode(EBADMSG));
    const std::string prefix = "decode property list: ";
    EXPECT_TRUE(list.error().operation.starts_with(prefix));
    return list.error().operation.substr(prefix.size());
}

std::string reason(const HandMadeList& list) {
    return reason(list.bytes());
}

std::string bytesOf(std::initializer_list<int> values) {
    std::string bytes;
    for (const int value : values) {
        bytes += static_cast<char>(value);
    }
    return bytes;
}

std::string exampleBytes() {
    return encodePropertyList(PropertyListExamples::nontrivial())->text();
}

TEST(PropertyListReaderTest, everyTruncationIsRefused) {
    const std::string bytes = exampleBytes();
    for (std::size_t length = 0; length < bytes.size(); ++length) {
        EXPECT_NE(reason(bytes.substr(0, length)), "") << length;
        EXPECT_NE(reason(bytes.substr(bytes.size() - length)), "") << length;
    }
}

TEST(PropertyListReaderTest, everyChangedByteIsReadWholeOrRefused) {
    const std::string bytes = exampleBytes();
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        for (int value = 0; value < 256; ++value) {
            std::string damaged = bytes;
            damaged[i] = static_cast<char>(value);
            if (const auto list = decoded(damaged)) {
                EXPECT_TRUE(encodePropertyList(*list)) << i << " " << value;
            }
        }
    }
}

TEST(PropertyListReaderTest, everyInsertedAndEveryRemovedByteIsReadWholeOrRefused) {
    const std::string bytes = exampleBytes();
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        std::string longer = bytes;
        longer.insert(i, 1, '\x51');
        std::string shorter = bytes;
        shorter.erase(i, 1);
        for (const std::string& damaged : {longer, shorter}) {
            if (const auto list = decoded(damaged)) {
                EXPECT_TRUE(encodePropertyList(*list)) << i;
            }
        }
    }
}

TEST(PropertyListReaderTest, bytesAfterTheTrailerAreRefused) {
    EXPECT_NE(reason(exampleBytes() + '\0'), "");
    EXPECT_NE(reason(exampleBytes() + exampleBytes()), "");
}

TEST(PropertyListReaderTest, theOffsetTableFillsItsPlace) {
    std::string bytes = exampleBytes();
    bytes.insert(bytes.size() - 32, 1, '\0');
    EXPECT_EQ(reason(bytes), "the offset table does not fill its place");
}

TEST(PropertyListReaderTest, hugeNumbersInTheTrailerAreRefused) {
    for (const std::size_t field : {24U, 16U, 8U}) {
        std::string bytes = exampleBytes();
        bytes.replace(bytes.size() - field, 8, 8, '\xFF');
        EXPECT_NE(reason(bytes), "") << field;
    }
    for (const std::size_t size : {26U, 25U}) {
        for (const int value : {0, 9, 255}) {
            std::string bytes = exampleBytes();
            bytes[bytes.size() - size] = static_cast<char>(value);
            EXPECT_EQ(reason(bytes), "bad sizes in the trailer");
        }
    }
}

TEST(PropertyListReaderTest, cyclesAreRefused) {
    EXPECT_EQ(reason(HandMadeList().object(bytesOf({0xA1, 0}))), "an object contains itself");
    EXPECT_EQ(reason(HandMadeList().object(bytesOf({0xA1, 1})).object(bytesOf({0xA1, 0}))),
              "an object contains itself");
    EXPECT_EQ(reason(HandMadeList().object(bytesOf({0xD1, 1, 0})).object("\x51k")),
              "an object contains itself");
}

TEST(PropertyListReaderTest, sharedObjectsAreReadEachTime) {
    const auto list = decoded(HandMadeList()
                                  .object(bytesOf({0xA2, 1, 1}))
                                  .object(bytesOf({0xA1, 2}))
                                  .object("\x09")
                                  .bytes());
    const PropertyList inner(PropertyListArray{PropertyList(true)});
    ASSERT_TRUE(list);
    EXPECT_EQ(*list, PropertyList(PropertyListArray{inner, inner}));
}

// Twenty arrays, each of ten times the next: 10^20 objects in 250 bytes.
TEST(PropertyListReaderTest, expansionBombsAreRefused) {
    HandMadeList list;
    for (int i = 1; i <= 20; ++i) {
        list.object("\xAA" + std::string(10, static_cast<char>(i)));
    }
    list.object("\x09");
    EXPECT_EQ(reason(list), "too many objects");
}

// One string of 64 KiB that an array holds 10,000 times: 640 MiB in 84 KiB.
TEST(PropertyListReaderTest, expansionOfSharedTextIsRefused) {
    const std::string text = bytesOf({0x5F, 0x12, 0, 1, 0, 0}) + std::string(1U << 16, 'a');
    const std::string array = bytesOf({0xAF, 0x11, 0x27, 0x10}) + std::string(10'000, '\1');
    EXPECT_EQ(reason(HandMadeList().object(array).object(text)), "too much text and data");
}

TEST(PropertyListReaderTest, nestingIsBounded) {
    HandMadeList list;
    for (int i = 1; i <= 64; ++i) {
        list.object(bytesOf({0xA1, i}));
    }
    EXPECT_EQ(reason(HandMadeList(list).object("\x09")), "");
    EXPECT_EQ(reason(HandMadeList(list).object("\xA0")), "nested too deeply");
}

TEST(PropertyListReaderTest, overlappingObjectsAreRefused) {
    // The second object begins inside the third.
    EXPECT_EQ(
        reason(
            HandMadeList().object(bytesOf({0xA2, 1, 2})).objectAtOffset(12).object("\x52\x09\x09")),
        "objects that overlap");
    // Two numbers for one object.
    EXPECT_EQ(
        reason(HandMadeList().object(bytesOf({0xA2, 1, 2})).object("\x09").objectAtOffset(11)),
        "objects that overlap");
}

TEST(PropertyListReaderTest, referencesAndOffsetsStayInRange) {
    EXPECT_EQ(reason(HandMadeList().object(bytesOf({0xA1, 1}))), "a reference to no object");
    EXPECT_EQ(reason(HandMadeList().object("\x09").top(1)), "a reference to no object");
    EXPECT_EQ(reason(HandMadeList().object("\x09").top(~0ULL)), "a reference to no object");
    for (const std::size_t offset : {0U, 7U, 9U, 0xFFFFFFFFU}) {
        EXPECT_EQ(reason(HandMadeList().filler(1).objectAtOffset(offset)), "an offset out of range")
            << offset;
    }
}

TEST(PropertyListReaderTest, countsStayInside) {
    for (const int kind : {0x40, 0x50, 0x60, 0xA0, 0xD0}) {
        EXPECT_EQ(reason(HandMadeList().object(bytesOf({kind | 1}))), "an object past the end");
        EXPECT_EQ(reason(HandMadeList().object(bytesOf({kind | 0xF}))), "a count past the end");
        EXPECT_EQ(reason(HandMadeList().object(bytesOf({kind | 0xF, 0x10}))), "a bad count");
        EXPECT_EQ(reason(HandMadeList().object(bytesOf({kind | 0xF, 0x14}))), "a bad count");
        EXPECT_EQ(reason(HandMadeList().object(bytesOf({kind | 0xF, 0x51, 'a'}))), "a bad count");
        EXPECT_EQ(reason(HandMadeList().object(bytesOf({kind | 0xF, 0x12, 255, 255, 255, 255}))),
                  "a count past the end");
        const std::string huge =
            bytesOf({kind | 0xF, 0x13, 255, 255, 255, 255, 255, 255, 255, 255});
        EXPECT_EQ(reason(HandMadeList().object(huge)), "a count past the end");
        const std::string half = bytesOf({kind | 0xF, 0x13, 128, 0, 0, 0, 0, 0, 0, 0});
        EXPECT_EQ(reason(HandMadeList().object(half)), "a count past the end");
    }
}

TEST(PropertyListReaderTest, wideReferencesStayInside) {
    EXPECT_EQ(reason(HandMadeList().object("\xA1" + std::string(8, '\xFF')).referenceSize(8)),
              "a reference to no object");
    EXPECT_EQ(reason(HandMadeList().object("\xA1" + std::string(7, '\0')).referenceSize(8)),
              "an object past the end");
}

TEST(PropertyListReaderTest, otherKindsOfObjectsAreRefused) {
    for (const int first : {0x00, 0x01, 0x0F}) {
        EXPECT_EQ(reason(HandMadeList().object(bytesOf({first}))), "an unknown constant");
    }
    for (const int first : {0x70, 0x80, 0x90, 0xB0, 0xC0, 0xE0, 0xF0}) {
        EXPECT_EQ(reason(HandMadeList().object(bytesOf({first, 0}))), "an unknown kind of object");
    }
    EXPECT_EQ(reason(HandMadeList().object("\x15" + std::string(32, '\0'))),
              "an integer of a bad size");
    EXPECT_EQ(reason(HandMadeList().object(bytesOf({0x20, 0}))), "a real of a bad size");
    EXPECT_EQ(reason(HandMadeList().object("\x32" + std::string(4, '\0'))), "a date of a bad size");
}

TEST(PropertyListReaderTest, integersOfSixteenBytesMustFitSixtyFourBits) {
    const auto integer = [](int high, int low) {
        return decoded(HandMadeList()
                           .object("\x14" + std::string(8, static_cast<char>(high)) +
                                   std::string(8, static_cast<char>(low)))
                           .bytes());
    };
    EXPECT_EQ(*integer(0, 0xFF), PropertyList(~std::uint64_t{0}));
    EXPECT_EQ(*integer(0, 1), PropertyList(std::int64_t{0x0101010101010101}));
    EXPECT_EQ(*integer(0xFF, 0xFF), PropertyList(std::int64_t{-1}));
    EXPECT_FALSE(integer(0xFF, 0x7F));
    EXPECT_FALSE(integer(1, 0));
}

TEST(PropertyListReaderTest, shortIntegersAreUnsignedAndShortRealsAreRead) {
    EXPECT_EQ(*decoded(HandMadeList().object(bytesOf({0x10, 0xFF})).bytes()),
              PropertyList(std::int64_t{255}));
    EXPECT_EQ(*decoded(HandMadeList().object(bytesOf({0x22, 0x3F, 0xC0, 0, 0})).bytes()),
              PropertyList(1.5));
}

TEST(PropertyListReaderTest, stringsAreWhatTheySay) {
    EXPECT_EQ(reason(HandMadeList().object("\x51\xC3")), "a string that is not ASCII");
    for (const std::string& units :
         {bytesOf({0x61, 0xD8, 0x00}), bytesOf({0x61, 0xDC, 0x00}),
          bytesOf({0x62, 0xD8, 0x00, 0x00, 0x61}), bytesOf({0x62, 0xDC, 0x00, 0xD8, 0x00}),
          bytesOf({0x62, 0xD8, 0x00, 0xD8, 0x00})}) {
        EXPECT_EQ(reason(HandMadeList().object(units)), "a string that is not UTF-16");
    }
    EXPECT_EQ(*decoded(HandMadeList().object(bytesOf({0x62, 0xD8, 0x3D, 0xDE, 0x00})).bytes()),
              PropertyList(std::string("\xF0\x9F\x98\x80")));
}

TEST(PropertyListReaderTest, datesAreNumbersInRange) {
    const auto date = [](std::initializer_list<int> bits) {
        return reason(HandMadeList().object("\x33" + bytesOf(bits)));
    };
    EXPECT_EQ(date({0x7F, 0xF8, 0, 0, 0, 0, 0, 0}), "a date out of range");  // not a number
    EXPECT_EQ(date({0x7F, 0xF0, 0, 0, 0, 0, 0, 0}), "a date out of range");  // infinity
    EXPECT_EQ(date({0xC3, 0xE0, 0, 0, 0, 0, 0, 0}), "a date out of range");  // -2^63
    EXPECT_EQ(date({0x43, 0xD0, 0, 0, 0, 0, 0, 0}), "");                     // 2^62
}

TEST(PropertyListReaderTest, keysAreStringsAndAllDifferent) {
    EXPECT_EQ(reason(HandMadeList().object(bytesOf({0xD1, 1, 1})).object("\x09")),
              "a key that is no string");
    EXPECT_EQ(reason(HandMadeList()
                         .object(bytesOf({0xD2, 1, 2, 3, 3}))
                         .object("\x51k")
                         .object("\x51k")
                         .object("\x09")),
              "a key twice in one dictionary");
}

TEST(PropertyListReaderTest, objectsThatNothingRefersToAreLeftOut) {
    EXPECT_EQ(*decoded(HandMadeList().object("\x09").object("\xFF").bytes()), PropertyList(true));
}

}  // namespace
}  // namespace marrowdale
