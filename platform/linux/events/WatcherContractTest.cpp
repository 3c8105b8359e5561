#include <array>
#include <atomic>
#include <cerrno>
#include <filesystem>
#include <poll.h>
#include <thread>

#include "platform/linux/events/WatcherTestProcess.h"
#include "platform/linux/events/WatcherTestWorld.h"

namespace marrowdale::native {
namespace {

using WatcherContractTest = OnEachWatcher;
INSTANTIATE_TEST_SUITE_P(OnEach, WatcherContractTest, eachWatcher(), watcherParamName);

bool isReadable(int descriptor) {
    pollfd asked{descriptor, POLLIN, 0};
    return ::poll(&asked, 1, 0) == 1;
}

TEST_P(WatcherContractTest, descriptorIsReadableWhileSomethingIsQueued) {
    world_.madeAndWatched("w");
    (void)world_.drain();
    EXPECT_FALSE(isReadable(world_.watcher().descriptor()));
    writeFile(world_.at("w/a"), "x");
    EXPECT_TRUE(isReadable(world_.watcher().descriptor()));
    (void)world_.drain();
    EXPECT_FALSE(isReadable(world_.watcher().descriptor()));
}

TEST_P(WatcherContractTest, anyDescriptorOfTheFolderWillDo) {
    for (const int flags : {O_PATH, O_PATH | O_DIRECTORY, O_RDONLY | O_DIRECTORY}) {
        const std::string name = "w" + std::to_string(flags);
        makeFolder(world_.at(name));
        const FileID number = world_.numberOf(name);
        ASSERT_TRUE(world_.watcher().watchFolder(world_.open(name, flags).get(), number));
        writeFile(world_.at(name + "/a"), "x");
        EXPECT_TRUE(world_.drain().has(number, "a", WatchHint::appeared)) << flags;
    }
}

TEST_P(WatcherContractTest, fileIsNoFolderAndAClosedDescriptorNothing) {
    writeFile(world_.at("file"), "x");
    const UniqueFD file = world_.open("file", O_RDONLY);
    EXPECT_EQ(world_.watcher().watchFolder(file.get(), FileID{1}).error().code, ENOTDIR);
    EXPECT_FALSE(world_.watcher().watchFolder(-1, FileID{1}));
    EXPECT_EQ(world_.watcher().status().marks, 0U);
}

TEST_P(WatcherContractTest, folderThatIsWatchedAlreadyIsWatchedOnce) {
    makeFolder(world_.at("w"));
    const FileID number = world_.watchRoot("w");
    EXPECT_EQ(world_.watch("w"), number);
    EXPECT_EQ(world_.watcher().status().marks, 1U);
    std::filesystem::rename(world_.at("w"), world_.at("v"));
    EXPECT_TRUE(world_.drain().has(number, "", WatchHint::rootMoved));
}

TEST_P(WatcherContractTest, nothingIsToldOnceUnwatchedNotEvenWhatWasQueued) {
    const FileID number = world_.madeAndWatched("w");
    const FileID other = world_.madeAndWatched("other");
    writeFile(world_.at("w/queued"), "x");
    world_.watcher().unwatch(number);
    world_.watcher().unwatch(number);
    world_.watcher().unwatch(FileID{12345});
    writeFile(world_.at("w/later"), "x");
    writeFile(world_.at("other/a"), "x");
    const Told told = world_.drain();
    EXPECT_FALSE(told.names(number));
    EXPECT_TRUE(told.has(other, "a", WatchHint::appeared));
    EXPECT_EQ(world_.watcher().status().marks, 1U);
    world_.watch("w");
    writeFile(world_.at("w/again"), "x");
    EXPECT_TRUE(world_.drain().has(number, "again", WatchHint::appeared));
}

TEST_P(WatcherContractTest, removedFolderIsNotCountedAnyMore) {
    makeFolder(world_.at("w"));
    world_.watchRoot("w");
    world_.madeAndWatched("w/a");
    world_.madeAndWatched("w/b");
    EXPECT_EQ(world_.watcher().status().marks, 3U);
    std::filesystem::remove(world_.at("w/a"));
    (void)world_.drain();
    EXPECT_EQ(world_.watcher().status().marks, 2U);
}

TEST_P(WatcherContractTest, folderUnderTheNumberOfOneThatIsGoneTakesItsPlace) {
    const FileID number = world_.madeAndWatched("old");
    writeFile(world_.at("old/x"), "x");
    std::filesystem::remove_all(world_.at("old"));
    makeFolder(world_.at("new"));
    ASSERT_TRUE(world_.watcher().watchFolder(world_.open("new", O_PATH).get(), number));
    writeFile(world_.at("new/y"), "x");
    const Told told = world_.drain();
    EXPECT_FALSE(told.has(number, "x", WatchHint::appeared));
    EXPECT_TRUE(told.has(number, "y", WatchHint::appeared));
    EXPECT_EQ(world_.watcher().status().marks, 1U);
}

// ext4 gives the number to the next folder, other file systems sooner or later or never.
TEST_P(WatcherContractTest, reusedInodeNumberIsNotTakenForTheOldFolder) {
    constexpr FileID label{4711};
    const FileID old = world_.madeAndWatched("old");
    std::filesystem::remove(world_.at("old"));
    makeFolder(world_.at("new"));
    for (int i = 0; i < 50 && world_.numberOf("new") != old; ++i) {
        std::filesystem::remove(world_.at("new"));
        makeFolder(world_.at("new"));
    }
    RecordProperty("reused", world_.numberOf("new") == old ? "yes" : "no");
    writeFile(world_.at("new/unwatched"), "x");
    ASSERT_TRUE(world_.watcher().watchFolder(world_.open("new", O_PATH).get(), label));
    writeFile(world_.at("new/a"), "x");
    const Told told = world_.drain();
    EXPECT_FALSE(told.has(old, "unwatched", WatchHint::appeared));
    EXPECT_FALSE(told.has(old, "a", WatchHint::appeared));
    EXPECT_TRUE(told.has(label, "a", WatchHint::appeared));
}

TEST_P(WatcherContractTest, movedThingKeepsItsFingerprint) {
    const FileID number = world_.madeAndWatched("w");
    writeFile(world_.at("w/a"), "x");
    const auto fingerprint = handleFingerprint(AT_FDCWD, world_.at("w/a").c_str());
    std::filesystem::rename(world_.at("w/a"), world_.at("w/b"));
    for (const KeptHint& hint : world_.drain().hints) {
        if ((hint.what & WatchHint::movedTo) != 0) {
            EXPECT_EQ(hint.folder, number);
            EXPECT_EQ(hint.fingerprint, kind() == Watcher::Kind::fanotify ? *fingerprint : 0U);
        }
    }
}

TEST_P(WatcherContractTest, overflowIsToldAndTheWatcherGoesOn) {
    const FileID number = world_.madeAndWatched("w");
    writeFile(world_.at("file"), "x");
    const std::uint64_t limit = world_.watcher().status().queueLimit;
    ASSERT_GT(limit, 0U);
    const std::string file = world_.at("file");
    for (std::uint64_t i = 0; i < limit + 10; ++i) {
        const std::string name = world_.at("w/" + std::to_string(i));
        ASSERT_EQ(::link(file.c_str(), name.c_str()), 0);
        ASSERT_EQ(::unlink(name.c_str()), 0);
    }
    const Told told = world_.drain();
    EXPECT_TRUE(told.overflowed);
    EXPECT_GT(told.events, limit);
    EXPECT_EQ(world_.watcher().status().overflows, 1U);
    EXPECT_EQ(world_.drain().events, 0U);
    writeFile(world_.at("w/after"), "x");
    const Told after = world_.drain();
    EXPECT_FALSE(after.overflowed);
    EXPECT_TRUE(after.has(number, "after", WatchHint::appeared));
    EXPECT_EQ(world_.watcher().status().events, told.events + after.events);
}

TEST_P(WatcherContractTest, whatAnotherProcessDidBeforeTheDrainIsToldByIt) {
    const FileID number = world_.madeAndWatched("w");
    constexpr std::size_t files = 3;
    std::array<UniqueFD, files> open;
    for (std::size_t i = 0; i < files; ++i) {
        writeFile(world_.at("w/" + std::to_string(i)), "x");
        open.at(i) = world_.open("w/" + std::to_string(i), O_WRONLY | O_APPEND);
    }
    (void)world_.drain();
    WatcherTestProcess writer(
        [&](std::uint8_t which) { return ::write(open.at(which).get(), "y", 1) == 1; });
    for (std::size_t round = 0; round < 2000; ++round) {
        const auto which = static_cast<std::uint8_t>(round % files);
        ASSERT_TRUE(writer.ask(which));
        ASSERT_TRUE(world_.drain().has(number, std::to_string(which), WatchHint::changed)) << round;
    }
}

TEST_P(WatcherContractTest, foldersAreWatchedAndUnwatchedWhileEventsAreRead) {
    constexpr int threads = 2;
    constexpr int folders = 100;
    const auto nameOf = [](int thread, int folder) {
        return std::to_string(thread) + "-" + std::to_string(folder);
    };
    std::atomic<int> running = threads;
    std::vector<std::thread> watching;
    watching.reserve(threads);
    for (int thread = 0; thread < threads; ++thread) {
        watching.emplace_back([&, thread] {
            for (int folder = 0; folder < folders; ++folder) {
                const FileID number = world_.madeAndWatched(nameOf(thread, folder));
                writeFile(world_.at(nameOf(thread, folder) + "/early"), "x");
                if (folder % 2 == 0) {
                    world_.watcher().unwatch(number);
                }
                (void)world_.watcher().status();
            }
            --running;
        });
    }
    Told all;
    while (running > 0) {
        const Told told = world_.drain();
        all.hints.insert(all.hints.end(), told.hints.begin(), told.hints.end());
    }
    for (std::thread& thread : watching) {
        thread.join();
    }
    const Told last = world_.drain();
    all.hints.insert(all.hints.end(), last.hints.begin(), last.hints.end());
    EXPECT_EQ(world_.watcher().status().marks, threads * folders / 2);
    for (int thread = 0; thread < threads; ++thread) {
        for (int folder = 1; folder < folders; folder += 2) {
            const FileID number = world_.numberOf(nameOf(thread, folder));
            EXPECT_TRUE(all.has(number, "early", WatchHint::appeared)) << nameOf(thread, folder);
        }
    }
}

TEST_P(WatcherContractTest, sinkMayWatchAndUnwatch) {
    const FileID number = world_.madeAndWatched("w");
    makeFolder(world_.at("w/sub"));
    FileID sub{};
    ASSERT_TRUE(world_.watcher().drain([&](const WatchHint& hint) {
        sub = world_.watch("w/" + std::string(hint.name));
        world_.watcher().unwatch(number);
    }));
    writeFile(world_.at("w/sub/a"), "x");
    EXPECT_TRUE(world_.drain().has(sub, "a", WatchHint::appeared));
}

TEST_P(WatcherContractTest, statusTellsKindReasonAndLimits) {
    const Watcher::Status status = world_.watcher().status();
    EXPECT_EQ(status.kind, kind());
    EXPECT_EQ(status.reason, kindName(kind()) + ", because it was asked for");
    EXPECT_GT(status.marksLimit, 0U);
    EXPECT_GT(status.queueLimit, 0U);
    EXPECT_EQ(status.marks, 0U);
}

}  // namespace
}  // namespace marrowdale::native
