#include <chrono>
#include <cstdint>
#include <limits>

#include <gtest/gtest.h>

#include "platform/foundation/Date.h"

namespace marrowdale {
namespace {

struct DateText {
    Date date;
    const char* text;
};

class DateTextTest : public testing::TestWithParam<DateText> {};

TEST_P(DateTextTest, isWrittenAndReadBack) {
    EXPECT_EQ(GetParam().date.rfc3339(), GetParam().text);
    EXPECT_EQ(Date::fromRFC3339(GetParam().text), GetParam().date);
}

constexpr std::int64_t leastSeconds = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t greatestSeconds = std::numeric_limits<std::int64_t>::max();

INSTANTIATE_TEST_SUITE_P(
    Dates, DateTextTest,
    testing::Values(DateText{{0, 0}, "1970-01-01T00:00:00.000000000Z"},
                    DateText{{0, 1}, "1970-01-01T00:00:00.000000001Z"},
                    DateText{{-1, 500'000'000}, "1969-12-31T23:59:59.500000000Z"},
                    DateText{{951'782'400, 0}, "2000-02-29T00:00:00.000000000Z"},
                    DateText{{4'107'542'400, 0}, "2100-03-01T00:00:00.000000000Z"},
                    DateText{{1'769'903'999, 1}, "2026-01-31T23:59:59.000000001Z"},
                    DateText{{253'402'300'799, 999'999'999}, "9999-12-31T23:59:59.999999999Z"},
                    DateText{{253'402'300'800, 0}, "+10000-01-01T00:00:00.000000000Z"},
                    DateText{{-62'167'219'200, 0}, "0000-01-01T00:00:00.000000000Z"},
                    DateText{{-62'167'219'201, 0}, "-0001-12-31T23:59:59.000000000Z"},
                    DateText{{leastSeconds, 0}, "-292277022657-01-27T08:29:52.000000000Z"},
                    DateText{{greatestSeconds, 7}, "+292277026596-12-04T15:30:07.000000007Z"}));

TEST(DateTest, readsOffsetsAndShortFractions) {
    const Date noon{43'200, 0};
    EXPECT_EQ(Date::fromRFC3339("1970-01-01T12:00:00Z"), noon);
    EXPECT_EQ(Date::fromRFC3339("1970-01-01t12:00:00z"), noon);
    EXPECT_EQ(Date::fromRFC3339("1970-01-01T12:00:00-00:00"), noon);
    EXPECT_EQ(Date::fromRFC3339("1970-01-01T17:30:00+05:30"), noon);
    EXPECT_EQ(Date::fromRFC3339("1969-12-31T23:00:00-13:00"), noon);
    EXPECT_EQ(Date::fromRFC3339("1970-01-01T12:00:00.5Z"), (Date{43'200, 500'000'000}));
    EXPECT_EQ(Date::fromRFC3339("1970-01-01T12:00:00.000000001+00:00"), (Date{43'200, 1}));
}

TEST(DateTest, readsLeapSecondsAtTheEndOfTheUTCDayOnly) {
    EXPECT_EQ(Date::fromRFC3339("2016-12-31T23:59:60Z"), (Date{1'483'228'800, 0}));
    EXPECT_EQ(Date::fromRFC3339("2016-12-31T18:59:60-05:00"), (Date{1'483'228'800, 0}));
    EXPECT_EQ(Date::fromRFC3339("2016-12-31T22:59:60Z"), std::nullopt);
    EXPECT_EQ(Date::fromRFC3339("2016-12-31T23:59:61Z"), std::nullopt);
}

class RefusedDateTextTest : public testing::TestWithParam<const char*> {};

TEST_P(RefusedDateTextTest, isRefused) {
    EXPECT_EQ(Date::fromRFC3339(GetParam()), std::nullopt);
}

INSTANTIATE_TEST_SUITE_P(
    Texts, RefusedDateTextTest,
    testing::Values("", "1970", "1970-01-01", "1970-01-01T00:00:00", "1970-01-01 00:00:00Z",
                    "1970-00-01T00:00:00Z", "1970-13-01T00:00:00Z", "1970-01-00T00:00:00Z",
                    "1970-01-32T00:00:00Z", "1970-02-29T00:00:00Z", "2100-02-29T00:00:00Z",
                    "1970-01-01T24:00:00Z", "1970-01-01T00:60:00Z", "1970-01-01T00:00:00.Z",
                    "1970-01-01T00:00:00.1234567890Z", "1970-01-01T00:00:00+24:00",
                    "1970-01-01T00:00:00+00:60", "1970-01-01T00:00:00+0000",
                    "1970-01-01T00:00:00Zx", " 1970-01-01T00:00:00Z", "70-01-01T00:00:00Z",
                    "10000-01-01T00:00:00Z", "+999-01-01T00:00:00Z",
                    "+1000000000000-01-01T00:00:00Z", "-292277022657-01-27T08:29:51Z",
                    "+292277026596-12-04T15:30:08Z", "1970-1-01T00:00:00Z"));

TEST(DateTest, everyTruncationOfATextIsRefused) {
    const std::string text = Date{1'769'903'999, 1}.rfc3339();
    for (std::size_t length = 0; length < text.size(); ++length) {
        EXPECT_EQ(Date::fromRFC3339(text.substr(0, length)), std::nullopt) << length;
    }
}

TEST(DateTest, everyDayOfFourCenturiesKeepsItsText) {
    for (std::int64_t day = -150'000; day < 150'000; ++day) {
        const Date date{day * 86'400 + 3'661, 0};
        ASSERT_EQ(Date::fromRFC3339(date.rfc3339()), date);
        const std::chrono::year_month_day expected{std::chrono::sys_days(std::chrono::days(day))};
        ASSERT_EQ(std::stoi(date.rfc3339().substr(5, 2)),
                  static_cast<int>(static_cast<unsigned>(expected.month())));
        ASSERT_EQ(std::stoi(date.rfc3339().substr(8, 2)),
                  static_cast<int>(static_cast<unsigned>(expected.day())));
    }
}

TEST(DateTest, nowLiesBetweenTwoReadingsOfTheClock) {
    const auto secondsNow = [] {
        return std::chrono::floor<std::chrono::seconds>(
                   std::chrono::system_clock::now().time_since_epoch())
            .count();
    };
    const auto before = secondsNow();
    const Date now = Date::now();
    EXPECT_GE(now.seconds, before);
    EXPECT_LE(now.seconds, secondsNow());
    EXPECT_LT(now.nanoseconds, 1'000'000'000U);
}

TEST(DateTest, isOrderedByTime) {
    EXPECT_LT((Date{-1, 500'000'000}), (Date{0, 0}));
    EXPECT_LT((Date{0, 1}), (Date{0, 2}));
    EXPECT_LT((Date{0, 999'999'999}), (Date{1, 0}));
}

}  // namespace
}  // namespace marrowdale
