#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/HostManager.h"

namespace marrowdale::host {
namespace {

TEST(HostManagerTest, eachHandlerIsCalledOnceWithoutAnErrorAndNotOnTheCallersThread) {
    HostManager manager("/home/u/Documents");
    int calls = 0;
    std::thread::id thread;
    for (int i = 0; i < 3; ++i) {
        manager.signalEnumeratorForContainerItemIdentifier("a",
                                                           [&](const std::optional<Error>& error) {
                                                               calls += error ? 100 : 1;
                                                               thread = std::this_thread::get_id();
                                                           });
    }
    manager.finishHandlers();
    EXPECT_EQ(calls, 3);
    EXPECT_NE(thread, std::this_thread::get_id());
}

TEST(HostManagerTest, theStorageRootIsTheOneItWasMadeWith) {
    EXPECT_EQ(HostManager("/home/u/Documents").documentStorageURL(),
              URL::fileURL("/home/u/Documents"));
}

TEST(HostManagerTest, domainsAreTakenOutOfTheIndexBeforeTheAnswerAndNotOnTheCallersThread) {
    HostManager manager("/home/u/Documents");
    std::vector<std::string> removed;
    std::thread::id thread;
    manager.setIndexCleaner([&](const std::vector<std::string>& domains) {
        removed = domains;
        thread = std::this_thread::get_id();
    });
    std::size_t removedBefore = 0;
    bool isRight = false;
    manager.deleteIndexedItemsInDomains({"#a", "#b"}, [&](const std::optional<Error>& error) {
        isRight = !error;
        removedBefore = removed.size();
    });
    manager.finishHandlers();
    EXPECT_TRUE(isRight);
    EXPECT_EQ(removedBefore, 2U);
    EXPECT_NE(thread, std::this_thread::get_id());
}

TEST(HostManagerTest, anIndexThatNobodyCleansIsAnsweredToo) {
    HostManager manager("/home/u/Documents");
    int answers = 0;
    manager.setIndexCleaner([&](const std::vector<std::string>&) { answers += 100; });
    manager.setIndexCleaner(nullptr);
    manager.deleteIndexedItemsInDomains({"#a"}, [&](const auto&) { ++answers; });
    manager.deleteIndexedItemsInDomains({"#a"}, nullptr);
    manager.finishHandlers();
    EXPECT_EQ(answers, 1);
}

}  // namespace
}  // namespace marrowdale::host
