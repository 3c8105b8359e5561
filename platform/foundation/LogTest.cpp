#include <limits>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "platform/foundation/Log.h"

namespace marrowdale {
namespace {

class RecordingSink : public LogSink {
  public:
    void write(LogLevel, std::string_view line) override {
        const std::lock_guard lock(mutex_);
        lines_.emplace_back(line);
    }
    [[nodiscard]] std::vector<std::string> lines() const {
        const std::lock_guard lock(mutex_);
        return lines_;
    }

  private:
    mutable std::mutex mutex_;
    std::vector<std::string> lines_;
};

class LogTest : public testing::Test {
  protected:
    std::shared_ptr<RecordingSink> sink_ = std::make_shared<RecordingSink>();
};

TEST_F(LogTest, writesTheLevelInFrontOfTheText) {
    const Log log(sink_, LogLevel::debug);
    log.debug([] { return "one"; });
    log.info([] { return std::string("two"); });
    log.error("three");
    EXPECT_EQ(sink_->lines(),
              (std::vector<std::string>{"[DEBUG] one", "[INFO] two", "[ERROR] three"}));
}

TEST_F(LogTest, textsOfDisabledLevelsAreNotMade) {
    const Log log(sink_, LogLevel::error);
    int made = 0;
    const auto makeText = [&] {
        ++made;
        return "text";
    };
    log.debug(makeText);
    log.info(makeText);
    log.write(LogLevel::info, "text");
    EXPECT_EQ(made, 0);
    EXPECT_TRUE(sink_->lines().empty());
}

TEST_F(LogTest, withoutASinkNothingIsEnabled) {
    Log log(nullptr, LogLevel::debug);
    EXPECT_FALSE(log.isEnabled(LogLevel::error));
    log.error("nowhere");
    const LogSection section(log, "nowhere");
    EXPECT_EQ(section.number(), 0U);
}

TEST_F(LogTest, textsAreTakenAsTheyAre) {
    const Log log(sink_, LogLevel::error);
    log.error("100 %s %@\n\xFF");
    EXPECT_EQ(sink_->lines(), std::vector<std::string>{"[ERROR] 100 %s %@\n\xFF"});
}

TEST_F(LogTest, sectionsAreNumberedFromZeroAndNest) {
    Log log(sink_, LogLevel::debug);
    {
        const LogSection outer(log, "outer");
        const LogSection inner(log, [] { return std::string("inner"); });
    }
    EXPECT_EQ(sink_->lines(), (std::vector<std::string>{"[DEBUG] ┏0 outer", "[DEBUG] ┏1 inner",
                                                        "[DEBUG] ┗1", "[DEBUG] ┗0"}));
}

TEST_F(LogTest, disabledSectionsMakeNoTitle) {
    Log log(sink_, LogLevel::info);
    int made = 0;
    {
        const LogSection section(log, [&] {
            ++made;
            return "title";
        });
    }
    EXPECT_EQ(made, 0);
    EXPECT_TRUE(sink_->lines().empty());
}

TEST_F(LogTest, sectionsOfManyThreadsGetDifferentNumbers) {
    Log log(sink_, LogLevel::info);
    std::mutex mutex;
    std::set<std::uint64_t> numbers;
    {
        std::vector<std::jthread> threads;
        for (int i = 0; i < 4; ++i) {
            threads.emplace_back([&] {
                std::uint64_t last = 0;
                for (int round = 0; round < 1000; ++round) {
                    const std::uint64_t number = log.takeSectionNumber();
                    EXPECT_TRUE(round == 0 || number > last);
                    last = number;
                    const std::lock_guard lock(mutex);
                    numbers.insert(number);
                }
            });
        }
    }
    EXPECT_EQ(numbers.size(), 4000U);
    EXPECT_EQ(*numbers.rbegin(), 3999U);
}

TEST_F(LogTest, twoLogsCountApart) {
    Log first(sink_, LogLevel::debug);
    Log second(sink_, LogLevel::debug);
    EXPECT_EQ(first.takeSectionNumber(), 0U);
    EXPECT_EQ(second.takeSectionNumber(), 0U);
}

TEST(LogDeathTest, theCounterNeverPassesTheLargestNumber) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    constexpr auto largest = std::numeric_limits<std::uint64_t>::max();
    Log log(nullptr, LogLevel::debug, largest - 1);
    EXPECT_EQ(log.takeSectionNumber(), largest - 1);
    EXPECT_DEATH((void)log.takeSectionNumber(), "ran out of numbers");
}

}  // namespace
}  // namespace marrowdale
