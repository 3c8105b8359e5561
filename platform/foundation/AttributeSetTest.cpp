#include <cerrno>
#include <thread>

#include <gtest/gtest.h>

#include "platform/foundation/AttributeSet.h"

namespace marrowdale {
namespace {

AttributeSet::Names names(std::vector<std::string> list) {
    return std::make_shared<const std::vector<std::string>>(std::move(list));
}

AttributeSet exampleSet() {
    std::vector<AttributeSet::Entry> entries;
    entries.push_back({0, Data::fromText("value"), 0});
    entries.push_back({2, Data(), EACCES});
    return AttributeSet(names({"present", "absent", "unreadable"}), std::move(entries));
}

TEST(AttributeSetTest, answersForTheAskedNamesOnly) {
    const AttributeSet set = exampleSet();
    EXPECT_TRUE(set.covers("present"));
    EXPECT_TRUE(set.covers("absent"));
    EXPECT_TRUE(set.covers("unreadable"));
    EXPECT_FALSE(set.covers("other"));
    EXPECT_FALSE(set.empty());
    EXPECT_TRUE(AttributeSet(names({"a"}), {}).empty());
}

TEST(AttributeSetTest, tellsPresentFromAbsentFromUnreadable) {
    const AttributeSet set = exampleSet();
    const auto present = set.value("present");
    ASSERT_TRUE(present && *present);
    EXPECT_EQ((*present)->text(), "value");
    const auto absent = set.value("absent");
    ASSERT_TRUE(absent);
    EXPECT_FALSE(*absent);
    const auto unreadable = set.value("unreadable");
    ASSERT_FALSE(unreadable);
    EXPECT_EQ(unreadable.error(), errorWithPOSIXCode(EACCES));
}

TEST(AttributeSetTest, countsTheBytesOfItsValues) {
    std::vector<AttributeSet::Entry> entries;
    entries.push_back({0, Data(Bytes(10'000)), 0});
    const AttributeSet large(names({"a"}), std::move(entries));
    EXPECT_GE(large.memoryUse(), AttributeSet(names({"a"}), {}).memoryUse() + 10'000);
}

TEST(AttributeSetTest, keepsTheLastDerivedObjectAndReadersKeepTheirs) {
    const AttributeSet set = exampleSet();
    EXPECT_EQ(set.derived(), nullptr);
    set.setDerived(std::make_shared<const int>(1));
    const auto first = set.derived();
    set.setDerived(std::make_shared<const int>(2));
    EXPECT_EQ(*static_cast<const int*>(first.get()), 1);
    EXPECT_EQ(*static_cast<const int*>(set.derived().get()), 2);
}

TEST(AttributeSetTest, derivedObjectsMayBeStoredAndReadByManyThreads) {
    const AttributeSet set = exampleSet();
    std::vector<std::jthread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&set, i] {
            for (int round = 0; round < 1000; ++round) {
                set.setDerived(std::make_shared<const int>(i));
                const auto value = *static_cast<const int*>(set.derived().get());
                EXPECT_TRUE(value >= 0 && value < 4);
            }
        });
    }
}

}  // namespace
}  // namespace marrowdale
