// Processes killed at any moment, and disks that are full.

#include <array>
#include <csignal>
#include <filesystem>
#include <random>
#include <sys/mount.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/StoreTestSupport.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

struct HandedOut {
    std::uint32_t document;
    std::uint64_t fileID;
};

class StoreCrashTest : public StoreTestBase {
  protected:
    // Makes files, renames some, and tells every identifier that it was given, until it is killed.
    [[noreturn]] void workUntilKilled(int tell, int round) {
        auto opened = tryOpen();
        for (int i = 0; opened; ++i) {
            const std::string name = "f" + std::to_string(round) + "-" + std::to_string(i);
            writeFile(path(name), "x");
            if (i % 3 == 2) {
                rename(name, "folder/" + name);
            }
            for (const std::string& folder : {std::string(), std::string("folder")}) {
                auto requests = requestsFor(folder);
                if (!(*opened)->assignDocumentIDs(requests.requests)) {
                    ::_exit(2);
                }
                for (const auto& request : requests.requests) {
                    const HandedOut out{raw(request.document), raw(request.status.fileID)};
                    (void)!::write(tell, &out, sizeof out);
                }
            }
            if (i % 16 == 15) {
                opened = Expected<std::unique_ptr<Store>>(Unexpected(Error{}));
                opened = tryOpen();
            }
        }
        ::_exit(3);
    }

    // What the child told before it was killed after `life`.
    std::vector<HandedOut> runAndKill(std::chrono::microseconds life, int round) {
        std::array<int, 2> pipe{};
        EXPECT_EQ(::pipe(pipe.data()), 0);
        const pid_t child = ::fork();
        if (child == 0) {
            ::close(pipe[0]);
            workUntilKilled(pipe[1], round);
        }
        ::close(pipe[1]);
        std::thread killer([child, life] {
            const auto end = std::chrono::steady_clock::now() + life;
            (void)waitUntil([end] { return std::chrono::steady_clock::now() >= end; });
            ::kill(child, SIGKILL);
        });
        std::vector<HandedOut> told;
        HandedOut out{};
        while (::read(pipe[0], &out, sizeof out) == static_cast<ssize_t>(sizeof out)) {
            told.push_back(out);
        }
        killer.join();
        int end = 0;
        ::waitpid(child, &end, 0);
        EXPECT_TRUE(WIFSIGNALED(end)) << "the child ended by itself: " << WEXITSTATUS(end);
        ::close(pipe[0]);
        return told;
    }
};

TEST_P(StoreCrashTest, WhatWasHandedOutBeforeAKillIsRightAfterwards) {
    makeFolder(path("folder"));
    open();
    const UUID uuid = store().report().uuid;
    close();
    std::mt19937 random(17);
    std::uniform_int_distribution<int> lives(500, 60'000);
    std::map<std::uint32_t, std::uint64_t> files;
    std::map<std::uint64_t, std::uint32_t> documents;
    std::uint64_t lastEvent = 0;
    // Where the disk is slow or the machine is busy, short lives hand out little: then there are
    // more of them, and longer ones.
    constexpr int fewestRounds = 25;
    constexpr std::size_t fewestFiles = 10;
    for (int round = 0; round < fewestRounds || files.size() <= fewestFiles; ++round) {
        ASSERT_LT(round, 8 * fewestRounds) << "nothing is handed out";
        const std::chrono::microseconds life(lives(random) * (1 + round / fewestRounds));
        for (const auto& [document, fileID] : runAndKill(life, round)) {
            EXPECT_EQ(files.emplace(document, fileID).first->second, fileID);
            EXPECT_EQ(documents.emplace(fileID, document).first->second, document);
        }
        open();
        ASSERT_EQ(store().report().uuid, uuid) << store().report().rebuildReason;
        for (const auto& [document, fileID] : files) {
            const auto found = store().resolveDocumentID(DocumentID{document}, device());
            ASSERT_TRUE(found) << document << " of " << fileID << " in round " << round;
            EXPECT_EQ(raw(*found), fileID);
        }
        const auto event = store().barrier();
        ASSERT_TRUE(event);
        EXPECT_GE(raw(*event), lastEvent);
        lastEvent = raw(*event);
        close();
    }
}

INSTANTIATE_TEST_SUITE_P(OnEach, StoreCrashTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

class StoreFullDiskTest : public testing::Test {
  protected:
    void SetUp() override {
        if (!runsAsRoot()) {
            MARROWDALE_SKIP_FOR_USER("only root may mount a small file system");
        }
        state_ = directory_.path("state");
        root_ = directory_.path("root");
        makeFolder(state_);
        makeFolder(root_);
        if (::mount("tmpfs", state_.c_str(), "tmpfs", 0, "size=256k") != 0) {
            MARROWDALE_SKIP("no tmpfs can be mounted here");
        }
        mounted_ = true;
    }
    void TearDown() override {
        if (mounted_) {
            ::umount2(state_.c_str(), MNT_DETACH);
        }
    }
    [[nodiscard]] StoreOptions options() const {
        StoreOptions options;
        options.stateFolder = state_;
        options.rootPath = root_;
        return options;
    }
    void fill() {
        std::string block(4096, 'f');
        try {
            for (int i = 0; i < 1000; ++i) {
                writeFile(state_ + "/filler" + std::to_string(i), block);
            }
        } catch (const std::system_error& error) {
            EXPECT_EQ(error.code().value(), ENOSPC) << error.what();
        }
    }
    void makeRoom() {
        for (const auto& entry : std::filesystem::directory_iterator(state_)) {
            if (entry.path().filename().string().starts_with("filler")) {
                std::filesystem::remove(entry.path());
            }
        }
    }
    void writeMany(int first, int last) {
        for (int i = first; i < last; ++i) {
            writeFile(root_ + "/" + std::string(200, 'n') + std::to_string(i), "x");
        }
    }

    TemporaryDirectory directory_;
    std::string state_;
    std::string root_;
    bool mounted_ = false;
};

TEST_F(StoreFullDiskTest, KnownIsAnsweredNewIsRefusedAndRoomHelps) {
    writeMany(0, 10);
    auto opened = Store::open(options());
    ASSERT_TRUE(opened) << opened.error().description();
    Store& store = **opened;
    auto known = makeRequests(root_);
    ASSERT_TRUE(store.assignDocumentIDs(known.requests));
    fill();
    writeMany(10, 60);
    auto more = makeRequests(root_);
    const auto refused = store.assignDocumentIDs(more.requests);
    ASSERT_FALSE(refused);
    EXPECT_EQ(refused.error().code, ENOSPC);
    for (const auto& request : more.requests) {
        EXPECT_EQ(request.document, DocumentID{});
    }
    EXPECT_EQ(store.report().writeError->code, ENOSPC);
    ASSERT_TRUE(store.assignDocumentIDs(known.requests));
    const auto& first = known.requests.front();
    EXPECT_EQ(store.knownDocumentID(first.status), first.document);
    EXPECT_EQ(*store.resolveDocumentID(first.document, first.status.device), first.status.fileID);
    makeRoom();
    ASSERT_TRUE(store.assignDocumentIDs(more.requests));
    EXPECT_FALSE(store.report().writeError);
    const auto uuid = store.report().uuid;
    opened = Expected<std::unique_ptr<Store>>(Unexpected(Error{}));
    opened = Store::open(options());
    ASSERT_TRUE(opened);
    EXPECT_EQ((*opened)->report().uuid, uuid);
    for (const auto& request : more.requests) {
        EXPECT_EQ(*(*opened)->resolveDocumentID(request.document, request.status.device),
                  request.status.fileID);
    }
}

TEST_F(StoreFullDiskTest, OpensOnAFullDisk) {
    writeMany(0, 10);
    auto known = makeRequests(root_);
    UUID uuid;
    {
        auto opened = Store::open(options());
        ASSERT_TRUE(opened);
        ASSERT_TRUE((*opened)->assignDocumentIDs(known.requests));
        uuid = (*opened)->report().uuid;
    }
    fill();
    writeMany(10, 60);
    auto opened = Store::open(options());
    ASSERT_TRUE(opened) << opened.error().description();
    EXPECT_EQ((*opened)->report().uuid, uuid);
    EXPECT_EQ((*opened)->report().writeError->code, ENOSPC);
    const auto& first = known.requests.front();
    EXPECT_EQ(*(*opened)->resolveDocumentID(first.document, first.status.device),
              first.status.fileID);
    EXPECT_EQ((*opened)->barrier().error().code, ENOSPC);
}

TEST_F(StoreFullDiskTest, MakingAStoreOnAFullDiskIsAnErrorThatSaysSo) {
    fill();
    const auto opened = Store::open(options());
    ASSERT_FALSE(opened);
    EXPECT_EQ(opened.error().code, ENOSPC);
    EXPECT_THAT(opened.error().subject, testing::HasSubstr(state_));
}

}  // namespace
}  // namespace marrowdale::native
