#include <thread>

#include <gtest/gtest.h>

#include "platform/linux/files/AttributeCache.h"

namespace marrowdale::native {
namespace {

constexpr Date now{1000, 500};

EntryStatus fileNumber(std::uint64_t number) {
    EntryStatus status;
    status.device = DeviceID{8};
    status.fileID = FileID{number};
    status.birth = {10, 1};
    status.changed = {20, 2};
    return status;
}

std::shared_ptr<const AttributeSet> setOf(std::size_t bytes) {
    return std::make_shared<const AttributeSet>(
        std::make_shared<const std::vector<std::string>>(1, "a"),
        std::vector<AttributeSet::Entry>{{0, Data(Bytes(bytes)), 0}});
}

TEST(AttributeCacheTest, answersWhatWasPut) {
    AttributeCache cache;
    const auto set = setOf(10);
    cache.insert(fileNumber(1), 7, {set, true}, now);
    const auto found = cache.find(fileNumber(1), 7);
    ASSERT_TRUE(found);
    EXPECT_EQ(found->set, set);
    EXPECT_TRUE(found->hasAccessList);
    EXPECT_FALSE(cache.find(fileNumber(1), 8));
    EXPECT_FALSE(cache.find(fileNumber(2), 7));
}

TEST(AttributeCacheTest, anotherFileOfTheSameNumberIsNotMet) {
    AttributeCache cache;
    cache.insert(fileNumber(1), 7, {setOf(10), false}, now);
    EntryStatus other = fileNumber(1);
    other.birth.nanoseconds = 2;
    EXPECT_FALSE(cache.find(other, 7));
    other = fileNumber(1);
    other.device = DeviceID{9};
    EXPECT_FALSE(cache.find(other, 7));
}

TEST(AttributeCacheTest, changeTimeTellsWhetherItIsStillGood) {
    AttributeCache cache;
    EntryStatus status = fileNumber(1);
    cache.insert(status, 7, {setOf(10), false}, now);
    const std::size_t before = cache.memoryUse();
    status.changed.nanoseconds = 3;
    EXPECT_FALSE(cache.find(status, 7));
    cache.insert(status, 7, {setOf(10), false}, now);
    EXPECT_TRUE(cache.find(status, 7));
    EXPECT_EQ(cache.memoryUse(), before);
}

TEST(AttributeCacheTest, tooYoungAChangeIsNotRemembered) {
    AttributeCache cache;
    EntryStatus status = fileNumber(1);
    for (const Date& changed : {Date{1000, 500}, Date{1000, 400}, Date{999, 990'000'500},
                                Date{1001, 0}, Date{999, 999'999'999}}) {
        status.changed = changed;
        cache.insert(status, 7, {}, now);
        EXPECT_FALSE(cache.find(status, 7)) << changed.rfc3339();
    }
    status.changed = {999, 990'000'499};
    cache.insert(status, 7, {}, now);
    EXPECT_TRUE(cache.find(status, 7));
}

TEST(AttributeCacheTest, staysWithinItsBytesAndKeepsSome) {
    constexpr std::size_t bound = 1U << 20U;
    AttributeCache cache(bound);
    for (std::uint64_t i = 0; i < 20000; ++i) {
        cache.insert(fileNumber(i), 7, {setOf(200), false}, now);
        ASSERT_LE(cache.memoryUse(), bound);
    }
    int kept = 0;
    for (std::uint64_t i = 0; i < 20000; ++i) {
        kept += cache.find(fileNumber(i), 7) ? 1 : 0;
    }
    EXPECT_GT(kept, 500);
}

TEST(AttributeCacheTest, fileWithoutAttributesCostsLittle) {
    AttributeCache cache;
    for (std::uint64_t i = 0; i < 100000; ++i) {
        cache.insert(fileNumber(i), 7, {}, now);
    }
    for (std::uint64_t i = 0; i < 100000; ++i) {
        ASSERT_TRUE(cache.find(fileNumber(i), 7));
    }
    EXPECT_LT(cache.memoryUse() / 100000, 256U);
}

TEST(AttributeCacheTest, manyThreadsAtOnce) {
    AttributeCache cache(1U << 18U);
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&cache] {
            for (std::uint64_t i = 0; i < 5000; ++i) {
                cache.insert(fileNumber(i), 7, {setOf(50), false}, now);
                const auto found = cache.find(fileNumber(i), 7);
                EXPECT_TRUE(!found || found->set);
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_LE(cache.memoryUse(), 1U << 18U);
}

}  // namespace
}  // namespace marrowdale::native
