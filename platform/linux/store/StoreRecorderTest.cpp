// The recorder's own thread: nobody asks.

#include <atomic>
#include <thread>

#include "platform/linux/store/StoreEventsTestSupport.h"

namespace marrowdale::native {
namespace {

class StoreRecorderTest : public StoreEventsTest {
  protected:
    [[nodiscard]] StoreOptions options() const override {
        StoreOptions options = StoreEventsTest::options();
        options.recording = StoreOptions::Recording::live;
        return options;
    }
};

TEST_P(StoreRecorderTest, WhatHappensIsCommittedByItself) {
    open();
    std::atomic<int> commits = 0;
    const auto listener = store().addListener(
        [&](EventHistory::News news) { commits += news == EventHistory::News::committed ? 1 : 0; });
    const EventID before = store().lastEventID();
    write("made");
    EXPECT_TRUE(waitUntil([&] { return commits > 0; }));
    EXPECT_GT(store().lastEventID(), before);
    store().removeListener(listener);
}

TEST_P(StoreRecorderTest, ManyAskWhileManyWrite) {
    open();
    std::vector<std::thread> threads;
    for (int thread = 0; thread < 4; ++thread) {
        threads.emplace_back([this, thread] {
            for (int i = 0; i < 50; ++i) {
                const std::string name = std::to_string(thread) + "-" + std::to_string(i);
                if (thread % 2 == 0) {
                    writeFile(path(name), "x");
                } else {
                    EXPECT_TRUE(store().barrier());
                }
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    ASSERT_TRUE(store().barrier());
    EXPECT_EQ(store().report().entries, 101U);
}

TEST_P(StoreRecorderTest, ListenersAreToldThatItCloses) {
    open();
    std::vector<EventHistory::News> news;
    (void)store().addListener([&](EventHistory::News told) { news.push_back(told); });
    close();
    ASSERT_FALSE(news.empty());
    EXPECT_EQ(news.back(), EventHistory::News::closing);
}

TEST_P(StoreRecorderTest, ARootThatIsMovedAwayIsToldAndComesBackWhole) {
    write("a");
    settle();
    open();
    std::atomic<bool> isBroken = false;
    (void)store().addListener([&](EventHistory::News told) {
        if (told == EventHistory::News::broken) {
            isBroken = true;
        }
    });
    const auto before = *store().barrier();
    const std::string away = root() + "-away";
    std::filesystem::rename(root(), away);
    writeFile(away + "/b", "x");
    EXPECT_TRUE(waitUntil([&] { return isBroken.load(); }));
    EXPECT_EQ(store().barrier().error().code, ENOENT);
    EXPECT_TRUE(store().report().recorder.rootProblem);
    makeFolder(root());
    EXPECT_EQ(store().barrier().error().code, ESTALE);
    std::filesystem::remove(root());
    std::filesystem::rename(away, root());
    const auto after = store().barrier();
    ASSERT_TRUE(after) << after.error().description();
    auto cursor = store().eventsSince(before);
    ASSERT_TRUE(cursor);
    std::vector<std::string> texts;
    while (const auto event = *(*cursor)->next()) {
        texts.push_back(describe(*event));
    }
    EXPECT_THAT(texts, testing::Contains("appeared b"));
    EXPECT_THAT(texts, testing::Not(testing::Contains(testing::HasSubstr("gone"))));
    EXPECT_FALSE(store().report().recorder.rootProblem);
}

INSTANTIATE_TEST_SUITE_P(OnEach, StoreRecorderTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Following::fanotify, Following::inotify)),
                         nameOf);

}  // namespace
}  // namespace marrowdale::native
