// What is mounted below the root: not indexed, counted, and what it hides is kept.

#include <sys/mount.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/StoreTestSupport.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

// A mount of another place below the root, or of a file system of its own. Ends with this.
class ScopedMount {
  public:
    static ScopedMount bind(const std::string& from, const std::string& to) {
        return {::mount(from.c_str(), to.c_str(), nullptr, MS_BIND, nullptr) == 0, to};
    }
    static ScopedMount memory(const std::string& to) {
        return {::mount("none", to.c_str(), "tmpfs", 0, nullptr) == 0, to};
    }
    ~ScopedMount() { end(); }
    ScopedMount(const ScopedMount&) = delete;
    ScopedMount& operator=(const ScopedMount&) = delete;
    ScopedMount(ScopedMount&&) = delete;
    ScopedMount& operator=(ScopedMount&&) = delete;

    explicit operator bool() const { return mounted_; }
    void end() {
        if (mounted_) {
            EXPECT_EQ(::umount2(at_.c_str(), MNT_DETACH), 0);
            mounted_ = false;
        }
    }

  private:
    ScopedMount(bool mounted, std::string at) : mounted_(mounted), at_(std::move(at)) {}
    bool mounted_;
    std::string at_;
};

class StoreMountsTest : public StoreTestBase {
  protected:
    void SetUp() override {
        makeFolder(path("probe"));
        if (!ScopedMount::memory(path("probe"))) {
            MARROWDALE_SKIP_FOR_USER("only root may mount");
        }
        remove("probe");
    }
    void expectSkipped(const std::vector<std::string>& paths) {
        const auto report = store().report().reconcile;
        EXPECT_THAT(report.skippedMounts, testing::UnorderedElementsAreArray(paths));
        EXPECT_EQ(report.skippedMountCount, paths.size());
    }
};

TEST_P(StoreMountsTest, AnotherFileSystemIsSkippedAndWhatItHidesIsKept) {
    write("at/hidden");
    open();
    const auto hidden = assign("at").at("hidden");
    ScopedMount mount = ScopedMount::memory(path("at"));
    ASSERT_TRUE(mount);
    write("at/foreign");
    for (int i = 0; i < 2; ++i) {
        ASSERT_TRUE(store().reconcile());
        expectSkipped({"at"});
        EXPECT_EQ(store().report().entries, 3U);
        EXPECT_EQ(store().pathForFileID(device(), status("at/foreign").fileID).error().code,
                  ENOENT);
    }
    EXPECT_EQ(store().resolveDocumentID(hidden, device()).error().code, ENOENT);
    reopen();
    mount.end();
    EXPECT_EQ(pathOf(hidden), "at/hidden");
    ASSERT_TRUE(store().reconcile());
    expectSkipped({});
}

TEST_P(StoreMountsTest, AFolderOfTheSameFileSystemBoundBelowTheRootIsSkipped) {
    write("real/file");
    write("bound/hidden");
    open();
    const auto given = assign("real").at("file");
    const auto hidden = assign("bound").at("hidden");
    const ScopedMount mount = ScopedMount::bind(path("real"), path("bound"));
    ASSERT_TRUE(mount);
    write("real/later");
    ASSERT_TRUE(store().reconcile());
    expectSkipped({"bound"});
    EXPECT_EQ(store().report().entries, 6U);
    EXPECT_EQ(pathOf(given), "real/file");
    EXPECT_EQ(pathOf(status("real").fileID), "real");
    EXPECT_EQ(store().resolveDocumentID(hidden, device()).error().code, ENOENT);
    reopen();
    expectSkipped({"bound"});
    EXPECT_EQ(pathOf(given), "real/file");
}

TEST_P(StoreMountsTest, WhatIsBoundFromOutsideIsNeitherIndexedNorGivenDocuments) {
    const std::string outside = root() + ".outside";
    makeFolder(outside + "/deep");
    writeFile(outside + "/deep/file", "x");
    makeFolder(path("bound"));
    open();
    const auto before = store().report().documentIDsUsed;
    const ScopedMount mount = ScopedMount::bind(outside, path("bound"));
    ASSERT_TRUE(mount);
    ASSERT_TRUE(store().reconcile());
    expectSkipped({"bound"});
    EXPECT_EQ(store().report().entries, 2U);
    for (const char* folder : {"", "bound", "bound/deep"}) {
        auto requests = requestsFor(folder);
        ASSERT_EQ(requests.requests.size(), 1U) << folder;
        EXPECT_EQ(store().assignDocumentIDs(requests.requests).error().code, ENXIO) << folder;
        EXPECT_EQ(store().pathForFileID(device(), requests.requests[0].status.fileID).error().code,
                  ENOENT)
            << folder;
    }
    EXPECT_EQ(store().report().documentIDsUsed, before);
}

TEST_P(StoreMountsTest, ABoundFileIsSkipped) {
    write("real");
    write("bound");
    open();
    const auto given = assign("");
    ScopedMount mount = ScopedMount::bind(path("real"), path("bound"));
    ASSERT_TRUE(mount);
    ASSERT_TRUE(store().reconcile());
    expectSkipped({"bound"});
    EXPECT_EQ(pathOf(given.at("real")), "real");
    EXPECT_EQ(store().resolveDocumentID(given.at("bound"), device()).error().code, ENOENT);
    mount.end();
    EXPECT_EQ(pathOf(given.at("bound")), "bound");
}

// The mount hides the file that the index has at that path; the file behind it is another.
TEST_P(StoreMountsTest, AFileIsNotFoundBehindAMountOfItsOwnFolder) {
    write("a/b/file");
    open();
    const auto file = assign("a/b").at("file");
    ScopedMount mount = ScopedMount::bind(path("a"), path("a"));
    ASSERT_TRUE(mount);
    EXPECT_EQ(store().resolveDocumentID(file, device()).error().code, ENOENT);
    mount.end();
    EXPECT_EQ(pathOf(file), "a/b/file");
}

TEST_P(StoreMountsTest, ARootThatIsAMountIsServed) {
    write("a");
    const ScopedMount mount = ScopedMount::memory(root());
    ASSERT_TRUE(mount);
    write("inside");
    open();
    expectSkipped({});
    EXPECT_EQ(store().report().entries, 2U);
    const auto given = assign("");
    EXPECT_EQ(pathOf(given.at("inside")), "inside");
    auto requests = makeRequests(std::filesystem::path(root()).parent_path());
    std::erase_if(requests.requests, [&](const auto& request) { return request.name != "root"; });
    ASSERT_EQ(requests.requests.size(), 1U);
    EXPECT_TRUE(store().assignDocumentIDs(requests.requests));
    close();
}

TEST_P(StoreMountsTest, AnotherFileSystemMountedAtTheRootsPathIsAnotherRoot) {
    write("a");
    open();
    const auto uuid = store().report().uuid;
    close();
    ScopedMount mount = ScopedMount::memory(root());
    ASSERT_TRUE(mount);
    open();
    EXPECT_NE(store().report().uuid, uuid);
    close();
    mount.end();
    open();
    EXPECT_EQ(store().report().uuid, uuid);
}

INSTANTIATE_TEST_SUITE_P(OnEach, StoreMountsTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

}  // namespace
}  // namespace marrowdale::native
