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

}  // namespace
}  // namespace marrowdale::host
