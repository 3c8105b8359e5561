#include "platform/foundation/Date.h"

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdlib>
#include <limits>

namespace marrowdale {

namespace {

constexpr std::int64_t secondsPerDay = 86'400;
constexpr std::size_t fractionDigits = 9;

// The proleptic Gregorian calendar in eras of 400 years (146,097 days), with years that begin in
// March, so that the leap day comes last. std::chrono's calendar ends at the year 32767.
constexpr std::int64_t daysPerEra = 146'097;
constexpr std::int64_t daysFromEraToEpoch = 719'468;  // 0000-03-01 to 1970-01-01

struct CalendarDay {
    std::int64_t year;
    unsigned month;
    unsigned day;
};

constexpr std::int64_t floorDivide(std::int64_t a, std::int64_t b) {
    return a / b - (a % b < 0 ? 1 : 0);
}

constexpr CalendarDay calendarDay(std::int64_t daysSinceEpoch) {
    const std::int64_t days = daysSinceEpoch + daysFromEraToEpoch;
    const std::int64_t era = floorDivide(days, daysPerEra);
    const auto dayOfEra = static_cast<unsigned>(days - era * daysPerEra);
    const unsigned yearOfEra =
        (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;
    const unsigned dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
    const unsigned marchMonth = (5 * dayOfYear + 2) / 153;
    const unsigned month = marchMonth < 10 ? marchMonth + 3 : marchMonth - 9;
    return {yearOfEra + era * 400 + (month <= 2 ? 1 : 0), month,
            dayOfYear - (153 * marchMonth + 2) / 5 + 1};
}

constexpr std::int64_t daysSinceEpoch(const CalendarDay& date) {
    const std::int64_t year = date.year - (date.month <= 2 ? 1 : 0);
    const std::int64_t era = floorDivide(year, 400);
    const auto yearOfEra = static_cast<unsigned>(year - era * 400);
    const unsigned marchMonth = date.month > 2 ? date.month - 3 : date.month + 9;
    const unsigned dayOfYear = (153 * marchMonth + 2) / 5 + date.day - 1;
    const unsigned dayOfEra = yearOfEra * 365 + yearOfEra / 4 - yearOfEra / 100 + dayOfYear;
    return era * daysPerEra + dayOfEra - daysFromEraToEpoch;
}

constexpr bool isLeapYear(std::int64_t year) {
    return year % 4 == 0 && (year % 100 != 0 || year % 400 == 0);
}

constexpr unsigned daysInMonth(std::int64_t year, unsigned month) {
    constexpr std::array<unsigned, 12> lengths = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
    return month == 2 && isLeapYear(year) ? 29 : lengths[month - 1];
}

void appendPadded(std::string& text, std::uint64_t number, std::size_t width) {
    const std::string digits = std::to_string(number);
    text.append(digits.size() < width ? width - digits.size() : 0, '0');
    text += digits;
}

void appendYear(std::string& text, std::int64_t year) {
    if (year < 0 || year > 9999) {
        text += year < 0 ? '-' : '+';
    }
    appendPadded(text, static_cast<std::uint64_t>(std::llabs(year)), 4);
}

constexpr bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

// Takes a text apart from its front; every step fails on anything unexpected.
class Scanner {
  public:
    explicit Scanner(std::string_view text) : rest_(text) {}

    [[nodiscard]] bool atEnd() const { return rest_.empty(); }

    // The next character when it is one of `choices`.
    std::optional<char> oneOf(std::string_view choices) {
        if (rest_.empty() || choices.find(rest_.front()) == std::string_view::npos) {
            return std::nullopt;
        }
        const char c = rest_.front();
        rest_.remove_prefix(1);
        return c;
    }

    // Between `fewest` and `most` digits. `most` is 12 or less, so the number can't overflow.
    std::optional<std::int64_t> digits(std::size_t fewest, std::size_t most) {
        std::size_t count = 0;
        std::int64_t number = 0;
        while (count < most && count < rest_.size() && isDigit(rest_[count])) {
            number = number * 10 + (rest_[count] - '0');
            ++count;
        }
        if (count < fewest) {
            return std::nullopt;
        }
        rest_.remove_prefix(count);
        lastCount_ = count;
        return number;
    }
    [[nodiscard]] std::size_t lastCount() const { return lastCount_; }

    // Two digits from 0 to `greatest`.
    std::optional<unsigned> pair(unsigned greatest) {
        const auto number = digits(2, 2);
        if (!number || *number > greatest) {
            return std::nullopt;
        }
        return static_cast<unsigned>(*number);
    }

  private:
    std::string_view rest_;
    std::size_t lastCount_ = 0;
};

std::optional<std::int64_t> scanYear(Scanner& scanner) {
    const auto sign = scanner.oneOf("+-");
    const auto year = sign ? scanner.digits(4, 12) : scanner.digits(4, 4);
    if (!year) {
        return std::nullopt;
    }
    return sign == '-' ? -*year : *year;
}

std::optional<std::int64_t> scanDays(Scanner& scanner) {
    const auto year = scanYear(scanner);
    if (!year || !scanner.oneOf("-")) {
        return std::nullopt;
    }
    const auto month = scanner.pair(12);
    if (!month || *month == 0 || !scanner.oneOf("-")) {
        return std::nullopt;
    }
    const auto day = scanner.pair(31);
    if (!day || *day == 0 || *day > daysInMonth(*year, *month)) {
        return std::nullopt;
    }
    return daysSinceEpoch({*year, *month, *day});
}

struct TimeOfDay {
    std::int64_t seconds;  // since midnight
    bool isLeapSecond;     // written as second 60
};

std::optional<TimeOfDay> scanTime(Scanner& scanner) {
    const auto hour = scanner.pair(23);
    if (!hour || !scanner.oneOf(":")) {
        return std::nullopt;
    }
    const auto minute = scanner.pair(59);
    if (!minute || !scanner.oneOf(":")) {
        return std::nullopt;
    }
    const auto second = scanner.pair(60);
    if (!second) {
        return std::nullopt;
    }
    return TimeOfDay{std::int64_t{*hour} * 3600 + std::int64_t{*minute} * 60 + *second,
                     *second == 60};
}

std::optional<std::uint32_t> scanFraction(Scanner& scanner) {
    if (!scanner.oneOf(".")) {
        return 0;
    }
    auto fraction = scanner.digits(1, fractionDigits);
    if (!fraction) {
        return std::nullopt;
    }
    for (std::size_t i = scanner.lastCount(); i < fractionDigits; ++i) {
        *fraction *= 10;
    }
    return static_cast<std::uint32_t>(*fraction);
}

// Seconds that local time is ahead of UTC.
std::optional<std::int64_t> scanOffset(Scanner& scanner) {
    if (scanner.oneOf("Zz")) {
        return 0;
    }
    const auto sign = scanner.oneOf("+-");
    if (!sign) {
        return std::nullopt;
    }
    const auto hours = scanner.pair(23);
    if (!hours || !scanner.oneOf(":")) {
        return std::nullopt;
    }
    const auto minutes = scanner.pair(59);
    if (!minutes) {
        return std::nullopt;
    }
    const std::int64_t seconds = std::int64_t{*hours} * 3600 + std::int64_t{*minutes} * 60;
    return *sign == '-' ? -seconds : seconds;
}

// days * 86,400 + rest, where it can be held.
std::optional<std::int64_t> secondsSinceEpoch(std::int64_t days, std::int64_t rest) {
    const std::int64_t carried = days + floorDivide(rest, secondsPerDay);
    const std::int64_t ofDay = rest - floorDivide(rest, secondsPerDay) * secondsPerDay;
    constexpr std::int64_t least = std::numeric_limits<std::int64_t>::min();
    constexpr std::int64_t greatest = std::numeric_limits<std::int64_t>::max();
    if (carried > greatest / secondsPerDay || carried < least / secondsPerDay - 1) {
        return std::nullopt;
    }
    if (carried < 0) {
        // One day up first: the product alone may lie just below what can be held.
        const std::int64_t base = (carried + 1) * secondsPerDay;
        const std::int64_t down = ofDay - secondsPerDay;
        return base < least - down ? std::nullopt : std::optional(base + down);
    }
    const std::int64_t base = carried * secondsPerDay;
    return base > greatest - ofDay ? std::nullopt : std::optional(base + ofDay);
}

}  // namespace

std::string Date::rfc3339() const {
    const std::int64_t days = floorDivide(seconds, secondsPerDay);
    // days * secondsPerDay may not be held for the very first day.
    const auto ofDay = static_cast<std::uint64_t>(seconds % secondsPerDay < 0
                                                      ? seconds % secondsPerDay + secondsPerDay
                                                      : seconds % secondsPerDay);
    const CalendarDay date = calendarDay(days);
    std::string text;
    text.reserve(30);
    appendYear(text, date.year);
    text += '-';
    appendPadded(text, date.month, 2);
    text += '-';
    appendPadded(text, date.day, 2);
    text += 'T';
    appendPadded(text, ofDay / 3600, 2);
    text += ':';
    appendPadded(text, ofDay / 60 % 60, 2);
    text += ':';
    appendPadded(text, ofDay % 60, 2);
    text += '.';
    appendPadded(text, nanoseconds, fractionDigits);
    text += 'Z';
    return text;
}

std::optional<Date> Date::fromRFC3339(std::string_view text) {
    Scanner scanner(text);
    const auto days = scanDays(scanner);
    if (!days || !scanner.oneOf("Tt")) {
        return std::nullopt;
    }
    const auto time = scanTime(scanner);
    if (!time) {
        return std::nullopt;
    }
    const auto fraction = scanFraction(scanner);
    if (!fraction) {
        return std::nullopt;
    }
    const auto offset = scanOffset(scanner);
    if (!offset || !scanner.atEnd()) {
        return std::nullopt;
    }
    const auto seconds = secondsSinceEpoch(*days, time->seconds - *offset);
    if (!seconds || (time->isLeapSecond && *seconds % secondsPerDay != 0)) {
        return std::nullopt;
    }
    return Date{*seconds, *fraction};
}

Date Date::now() {
    const auto sinceEpoch = std::chrono::system_clock::now().time_since_epoch();
    const auto seconds = std::chrono::floor<std::chrono::seconds>(sinceEpoch);
    return {seconds.count(),
            static_cast<std::uint32_t>(std::chrono::nanoseconds(sinceEpoch - seconds).count())};
}

}  // namespace marrowdale
