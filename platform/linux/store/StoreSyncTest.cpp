// A disk that refuses to make things lasting (EIO): at each sync of each operation in turn. This
// program's own fdatasync and fsync stand before the C library's.

#include <atomic>
#include <cerrno>
#include <sys/syscall.h>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/StoreTestSupport.h"

namespace {

// Syncs until the one that fails; 0: none does. One test runs at a time, in one process.
std::atomic<int> syncsLeft = 0;  // NOLINT(cppcoreguidelines-avoid-non-const-global-variables)

int syncOrFail(long call, int file) {
    int left = syncsLeft.load();
    while (left > 0 && !syncsLeft.compare_exchange_weak(left, left - 1)) {
    }
    if (left == 1) {
        errno = EIO;
        return -1;
    }
    return static_cast<int>(::syscall(call, file));
}

}  // namespace

extern "C" int fdatasync(int fildes) {
    return syncOrFail(SYS_fdatasync, fildes);
}
extern "C" int fsync(int fd) {
    return syncOrFail(SYS_fsync, fd);
}

namespace marrowdale::native {
namespace {

constexpr int mostSyncs = 50;

class StoreSyncTest : public StoreTestBase {
  protected:
    void TearDown() override { syncsLeft = 0; }
    static void failAt(int sync) { syncsLeft = sync; }
    // Whether a sync failed since; none does from here on.
    static bool hasFailed() { return syncsLeft.exchange(0) == 0; }
};

TEST_P(StoreSyncTest, NothingIsHandedOutThatWasNotSynced) {
    write("known");
    open();
    const auto known = assign("").at("known");
    const auto uuid = store().report().uuid;
    int failures = 0;
    for (int sync = 1; sync < mostSyncs; ++sync) {
        // A clean close gives the ranges of identifiers back, so each run reserves them anew.
        reopen();
        write("new" + std::to_string(sync));
        auto requests = requestsFor("");
        failAt(sync);
        const auto done = store().assignDocumentIDs(requests.requests);
        if (!hasFailed()) {
            EXPECT_TRUE(done);
            break;
        }
        ++failures;
        ASSERT_FALSE(done) << sync;
        EXPECT_EQ(done.error().code, EIO);
        for (const auto& request : requests.requests) {
            EXPECT_EQ(request.document, DocumentID{}) << request.name;
        }
        EXPECT_EQ(store().report().writeError->code, EIO);
        EXPECT_EQ(pathOf(known), "known");
        EXPECT_EQ(store().knownDocumentID(status("known")), known);
        reopen();
        EXPECT_EQ(store().report().uuid, uuid);
        EXPECT_EQ(store().report().rebuildReason, "");
        EXPECT_FALSE(store().report().writeError);
        EXPECT_EQ(pathOf(known), "known");
        EXPECT_EQ(assign("").at("known"), known);
    }
    EXPECT_GE(failures, 1);
}

TEST_P(StoreSyncTest, AFailedSyncOfTheLogEndsWritingUntilTheNextOpen) {
    write("known");
    open();
    const auto known = assign("").at("known");
    write("first");
    ASSERT_NE(assign("").at("first"), DocumentID{});  // the ranges are reserved from here on
    write("second");
    auto requests = requestsFor("");
    failAt(1);
    EXPECT_EQ(store().assignDocumentIDs(requests.requests).error().code, EIO);
    ASSERT_TRUE(hasFailed());
    // The disk is well again, but what the failed sync left on it nobody knows.
    EXPECT_EQ(store().assignDocumentIDs(requests.requests).error().code, EIO);
    EXPECT_EQ(store().reconcile().error().code, EIO);
    EXPECT_EQ(pathOf(known), "known");
    reopen();
    const auto given = assign("");
    EXPECT_EQ(given.at("known"), known);
    EXPECT_NE(given.at("second"), DocumentID{});
}

TEST_P(StoreSyncTest, IdentifiersNeverComeTwiceAfterAFailedSync) {
    open();
    std::vector<DocumentID> seen;
    for (int i = 0; i < 10; ++i) {
        const std::string name = "f" + std::to_string(i);
        write(name);
        auto requests = requestsFor("");
        failAt(1 + i % 3);
        (void)store().assignDocumentIDs(requests.requests);
        (void)hasFailed();
        reopen();
        const auto document = assign("").at(name);
        EXPECT_THAT(seen, testing::Not(testing::Contains(document)));
        seen.push_back(document);
    }
    for (std::size_t i = 0; i < seen.size(); ++i) {
        EXPECT_EQ(pathOf(seen[i]), "f" + std::to_string(i));
    }
}

TEST_P(StoreSyncTest, AStoreThatCouldNotBeMadeIsMadeAtTheNextOpen) {
    write("a");
    int failures = 0;
    for (int sync = 1; sync < mostSyncs; ++sync) {
        failAt(sync);
        const auto opened = tryOpen();
        if (!hasFailed()) {
            EXPECT_TRUE(opened);
            break;
        }
        ++failures;
        EXPECT_TRUE(opened ? opened->get()->report().writeError.has_value()
                           : opened.error().code == EIO)
            << sync;
    }
    EXPECT_GE(failures, 3);
    open();
    EXPECT_EQ(store().report().rebuildReason, "");
    EXPECT_EQ(pathOf(assign("").at("a")), "a");
}

TEST_P(StoreSyncTest, AMoveOfTheRootThatCouldNotBeNotedCostsNothing) {
    write("a");
    open();
    const auto a = assign("").at("a");
    const auto uuid = store().report().uuid;
    int failures = 0;
    for (int sync = 1; sync < mostSyncs; ++sync) {
        close();
        const std::string moved = root() + "x";
        std::filesystem::rename(root(), moved);
        setRoot(moved);
        failAt(sync);
        (void)tryOpen();
        const bool failed = hasFailed();
        open();
        EXPECT_EQ(store().report().uuid, uuid);
        EXPECT_EQ(store().report().stores.front().rootPath, moved);
        EXPECT_EQ(pathOf(a), "a");
        if (!failed) {
            break;
        }
        ++failures;
    }
    EXPECT_GE(failures, 2);
}

INSTANTIATE_TEST_SUITE_P(OnEach, StoreSyncTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

}  // namespace
}  // namespace marrowdale::native
