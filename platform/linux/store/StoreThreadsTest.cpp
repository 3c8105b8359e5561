// Requests, reconciles and changes of the tree at the same time.

#include <atomic>
#include <thread>

#include <gtest/gtest.h>

#include "platform/linux/store/StoreTestSupport.h"

namespace marrowdale::native {
namespace {

class StoreThreadsTest : public StoreTestBase {};

TEST_P(StoreThreadsTest, RequestsReconcilesAndChangesGoOnAtTheSameTime) {
    for (int i = 0; i < 20; ++i) {
        write("left/folder" + std::to_string(i) + "/file");
    }
    makeFolder(path("right"));
    open();
    const DocumentID document = assign("left/folder7").at("file");
    const FileID file = status("left/folder7/file").fileID;
    std::atomic<bool> done = false;
    std::vector<std::thread> threads;
    threads.emplace_back([&] {
        for (int i = 0; i < 40; ++i) {
            EXPECT_TRUE(store().reconcile());
        }
        done = true;
    });
    threads.emplace_back([&] {
        while (!done) {
            const auto found = store().resolveDocumentID(document, device());
            EXPECT_TRUE(found) << found.error().description();
            EXPECT_EQ(*found, file);
        }
    });
    threads.emplace_back([&] {
        for (int i = 0; !done; ++i) {
            write("left/new" + std::to_string(i));
            (void)assign("left");
            remove("left/new" + std::to_string(i));
            (void)store().report();
        }
    });
    for (auto& thread : threads) {
        thread.join();
    }
    // Moves are between runs here: without a watcher a file on the move can be at neither place
    // when an answer is checked.
    for (int i = 0; i < 20; ++i) {
        const bool there = i % 2 == 0;
        rename(there ? "left/folder7" : "right/moved", there ? "right/moved" : "left/folder7");
        EXPECT_EQ(pathOf(document), there ? "right/moved/file" : "left/folder7/file");
    }
}

INSTANTIATE_TEST_SUITE_P(OnEach, StoreThreadsTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

}  // namespace
}  // namespace marrowdale::native
