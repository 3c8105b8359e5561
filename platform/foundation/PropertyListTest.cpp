#include <cerrno>
#include <cmath>
#include <limits>
#include <string>

#include <gtest/gtest.h>

#include "platform/foundation/PropertyList.h"
#include "platform/foundation/PropertyListExamples.h"

namespace marrowdale {
namespace {

using Bits = std::numeric_limits<std::int64_t>;

PropertyList decodedAgain(const PropertyList& list) {
    const auto encoded = encodePropertyList(list);
    EXPECT_TRUE(encoded) << encoded.error().description();
    const auto decoded = decodePropertyList(encoded->bytes());
    EXPECT_TRUE(decoded) << decoded.error().description();
    return *decoded;
}

class PropertyListValueTest : public testing::TestWithParam<PropertyList> {};

TEST_P(PropertyListValueTest, comesBack) {
    EXPECT_EQ(decodedAgain(GetParam()), GetParam());
}

INSTANTIATE_TEST_SUITE_P(
    Values, PropertyListValueTest,
    testing::Values(PropertyList(false), PropertyList(true), PropertyList(std::int64_t{0}),
                    PropertyList(std::int64_t{255}), PropertyList(std::int64_t{256}),
                    PropertyList(std::int64_t{65'535}), PropertyList(std::int64_t{65'536}),
                    PropertyList(std::int64_t{4'294'967'295}),
                    PropertyList(std::int64_t{4'294'967'296}), PropertyList(std::int64_t{-1}),
                    PropertyList(Bits::max()), PropertyList(Bits::min()),
                    PropertyList(std::uint64_t{1} << 63),
                    PropertyList(std::numeric_limits<std::uint64_t>::max()), PropertyList(0.0),
                    PropertyList(-1.5), PropertyList(std::numeric_limits<double>::infinity()),
                    PropertyList(std::numeric_limits<double>::denorm_min()),
                    PropertyList(std::string()), PropertyList(std::string("text")),
                    PropertyList(std::string(14, 'a')), PropertyList(std::string(15, 'a')),
                    PropertyList(std::string(70'000, 'a')),
                    PropertyList(std::string("\xC3\xA4 \xE2\x82\xAC \xF0\x9F\x98\x80")),
                    PropertyList(std::string("nul\0inside", 10)), PropertyList(Data()),
                    PropertyList(Data::fromText("\xFF\x00")), PropertyList(Data(Bytes(300, 7))),
                    PropertyList(Date{0, 0}), PropertyList(Date{978'307'200, 0}),
                    PropertyList(Date{978'307'199, 500'000'000}),
                    PropertyList(Date{-11'644'473'600, 0}), PropertyList(PropertyListArray()),
                    PropertyList(PropertyListDictionary()), PropertyListExamples::nontrivial()));

TEST(PropertyListTest, smallUnsignedIntegersAreReadAsSigned) {
    EXPECT_EQ(decodedAgain(PropertyList(std::uint64_t{7})), PropertyList(std::int64_t{7}));
}

TEST(PropertyListTest, unsignedReadingTakesEitherType) {
    EXPECT_EQ(PropertyList(std::int64_t{7}).asUnsigned(), 7U);
    EXPECT_EQ(PropertyList(std::uint64_t{1} << 63).asUnsigned(), std::uint64_t{1} << 63);
    EXPECT_EQ(PropertyList(std::int64_t{-1}).asUnsigned(), std::nullopt);
    EXPECT_EQ(PropertyList(1.0).asUnsigned(), std::nullopt);
    EXPECT_EQ(PropertyList(true).asUnsigned(), std::nullopt);
}

TEST(PropertyListTest, datesKeepAMicrosecond) {
    const Date date{1'769'903'999, 123'456'789};
    const PropertyList decoded = decodedAgain(PropertyList(date));
    const auto* read = decoded.as<Date>();
    ASSERT_NE(read, nullptr);
    EXPECT_EQ(read->seconds, date.seconds);
    EXPECT_NEAR(read->nanoseconds, date.nanoseconds, 1000);
}

TEST(PropertyListTest, datesJustBelowASecondCarry) {
    const PropertyList decoded = decodedAgain(PropertyList(Date{1'769'903'999, 999'999'999}));
    EXPECT_EQ(decoded, PropertyList(Date{1'769'904'000, 0}));
}

TEST(PropertyListTest, notANumberComesBack) {
    const PropertyList decoded = decodedAgain(PropertyList(std::nan("")));
    EXPECT_TRUE(std::isnan(*decoded.as<double>()));
}

TEST(PropertyListTest, equalStringsAreWrittenOnce) {
    const std::string text(1000, 'a');
    const PropertyList list(PropertyListArray(50, PropertyList(text)));
    EXPECT_LT(encodePropertyList(list)->size(), 1200U);
    EXPECT_EQ(decodedAgain(list), list);
}

TEST(PropertyListTest, writesTheBytesOfTheFormat) {
    PropertyListDictionary dictionary;
    dictionary.emplace("k", PropertyList(std::int64_t{300}));
    const std::string expected(
        "bplist00"
        "\xD1\x01\x02"  // a dictionary of one entry, objects 1 and 2
        "\x51k"
        "\x11\x01\x2C"
        "\x08\x0B\x0D"  // the offsets
        "\0\0\0\0\0\0\x01\x01"
        "\0\0\0\0\0\0\0\x03"
        "\0\0\0\0\0\0\0\0"
        "\0\0\0\0\0\0\0\x10",
        8 + 3 + 2 + 3 + 3 + 32);
    EXPECT_EQ(encodePropertyList(PropertyList(dictionary))->text(), expected);
}

TEST(PropertyListTest, manyObjectsTakeLongerReferences) {
    for (const std::size_t count : {255U, 256U, 70'000U}) {
        PropertyListArray array;
        for (std::size_t i = 0; i < count; ++i) {
            array.emplace_back(static_cast<std::int64_t>(i));
        }
        const PropertyList list(std::move(array));
        EXPECT_EQ(decodedAgain(list), list);
    }
}

PropertyList nested(std::size_t depth) {
    PropertyList list(PropertyListArray{});
    for (std::size_t i = 1; i < depth; ++i) {
        list = PropertyList(PropertyListArray{list});
    }
    return list;
}

TEST(PropertyListTest, theDeepestListThatIsWrittenIsRead) {
    EXPECT_EQ(decodedAgain(nested(64)), nested(64));
    EXPECT_EQ(encodePropertyList(nested(65)).error(), errorWithPOSIXCode(EINVAL));
}

TEST(PropertyListTest, whatCannotBeWrittenIsRefused) {
    const auto refused = [](PropertyList::Value value) {
        const auto encoded = encodePropertyList(PropertyList(std::move(value)));
        return !encoded && encoded.error() == errorWithPOSIXCode(EINVAL) &&
               encoded.error().operation.starts_with("encode property list: ");
    };
    EXPECT_TRUE(refused(std::string("\xFF")));
    EXPECT_TRUE(refused(PropertyListDictionary{{"\xED\xA0\x80", PropertyList(true)}}));
    EXPECT_TRUE(refused(Date{Bits::max(), 0}));
    EXPECT_TRUE(refused(Date{Bits::min(), 0}));
    EXPECT_TRUE(refused(PropertyListArray(1U << 20)));
    EXPECT_TRUE(refused(Data(Bytes((64U << 20) + 1))));
    EXPECT_TRUE(refused(PropertyListArray(1025, PropertyList(std::string(1U << 16, 'a')))));
}

TEST(PropertyListTest, theLimitsAreTheReadersToChoose) {
    const auto encoded = encodePropertyList(PropertyListExamples::nontrivial());
    ASSERT_TRUE(encoded);
    EXPECT_FALSE(decodePropertyList(encoded->bytes(), {.depth = 1}));
    EXPECT_FALSE(decodePropertyList(encoded->bytes(), {.objects = 5}));
    EXPECT_FALSE(decodePropertyList(encoded->bytes(), {.bytes = encoded->size() - 1}));
}

}  // namespace
}  // namespace marrowdale
