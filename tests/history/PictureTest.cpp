// A client who goes by events alone knows what is there: live, over restarts, and over kills.

#include <array>
#include <csignal>
#include <filesystem>
#include <functional>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <utility>

#include "tests/history/HistoryTest.h"

namespace marrowdale::tests {
namespace {

class PictureTest : public HistoryTest {};

TEST_P(PictureTest, FollowsARandomWriter) {
    const std::uint32_t seed = newSeed();
    RandomWriter writer(root(), seed);
    makeFolder(root());
    writer.steps(300);
    begin();
    constexpr int rounds = 3;
    for (int round = 0; round < rounds && !HasFailure(); ++round) {
        if (isLive()) {
            startReader();
            writer.steps(1000 * stress());
            waitForReader();
            stopReader();
        } else {
            close();
            writer.steps(200 * stress());
            open();
            catchUp();
        }
        expectWhole();
    }
}

// Nothing is recorded but when somebody asks, so that a test says what a reader finds on disk.
class SteppedPictureTest : public HistoryTest {
  protected:
    [[nodiscard]] native::StoreOptions options() const override {
        native::StoreOptions options = HistoryTest::options();
        options.recording = native::StoreOptions::Recording::whenAsked;
        return options;
    }
    // After the first event that is read.
    void catchUpWith(const std::function<void()>& meanwhile) {
        picture().setWithin([&, isFirst = true]() mutable {
            if (std::exchange(isFirst, false)) {
                meanwhile();
            }
        });
        catchUp();
        picture().setWithin({});
    }
};

TEST_P(SteppedPictureTest, AFolderThatIsAwayWhileEventsOfItsFilesAreRead) {
    makeFolder(path("folder"));
    writeFile(path("folder/a"), "x");
    writeFile(path("folder/b"), "x");
    begin();
    writeFile(path("folder/a"), "longer");
    writeFile(path("folder/b"), "longer");
    ASSERT_TRUE(store().barrier());
    catchUpWith([&] { std::filesystem::rename(path("folder"), path("elsewhere")); });
    std::filesystem::rename(path("elsewhere"), path("folder"));
    catchUp();
    expectWhole();
}

// A link of two names is no less in sight when one of them goes out of it than a file is.
TEST_P(SteppedPictureTest, AFileAndALinkWhoseOtherNameIsHidden) {
    makeFolder(root());
    writeFile(path("target"), "x");
    begin();
    writeFile(path("file"), "x");
    std::filesystem::create_symlink("target", path("link"));
    for (const char* name : {"file", "link"}) {
        ASSERT_EQ(::link(path(name).c_str(), path(name + std::string("2")).c_str()), 0);
    }
    catchUp();
    expectWhole();
    for (const char* name : {"file", "link"}) {
        std::filesystem::rename(path(name + std::string("2")), path("." + std::string(name)));
    }
    catchUp();
    expectWhole();
}

INSTANTIATE_TEST_SUITE_P(OnEach, SteppedPictureTest, followedBy(byListening), historyParameterName);

// The writer goes on while the store is closed and opened, at moments that no seed repeats.
class RestartedPictureTest : public HistoryTest {};

TEST_P(RestartedPictureTest, HoldsOverRestartsAtRandomMoments) {
    const std::uint32_t seed = newSeed();
    makeFolder(root());
    begin();
    std::mt19937 random(seed);
    const int rounds = 4 * stress();
    for (int round = 0; round < rounds && !HasFailure(); ++round) {
        // The writer goes on while the store is closed and opened again.
        std::thread writing([&, writerSeed = random()] {
            RandomWriter(root(), static_cast<std::uint32_t>(writerSeed)).steps(400);
        });
        for (int restart = 0; restart < 3; ++restart) {
            startReader();
            const auto until =
                std::chrono::steady_clock::now() + std::chrono::microseconds(random() % 20'000);
            (void)waitUntil([&] { return std::chrono::steady_clock::now() >= until; });
            close();
            open();
        }
        writing.join();
        ASSERT_TRUE(store().reconcile() && store().barrier());
        catchUp();
        expectWhole();
    }
}

INSTANTIATE_TEST_SUITE_P(OnEach, PictureTest, followedBy(everyWay), historyParameterName);
INSTANTIATE_TEST_SUITE_P(OnEach, RestartedPictureTest, followedBy(everyWay), historyParameterName);

// A process that records a tree until it is killed.
class KilledRecorderTest : public HistoryTest {
  protected:
    // Tells by a byte that it records.
    [[noreturn]] void recordUntilKilled(int tell) {
        open();
        (void)!::write(tell, "r", 1);
        picture().fill();  // gives out documents
        while (store().barrier()) {
        }
        ::_exit(3);
    }
    void startRecorder() {
        std::array<int, 2> pipe{};
        ASSERT_EQ(::pipe(pipe.data()), 0);
        recorder_ = ::fork();
        if (recorder_ == 0) {
            ::close(pipe[0]);
            recordUntilKilled(pipe[1]);
        }
        ::close(pipe[1]);
        tell_ = pipe[0];
    }
    void waitForRecorder() const {
        char told = 0;
        ASSERT_EQ(::read(tell_, &told, 1), 1);
    }
    void killRecorder() const {
        ::kill(recorder_, SIGKILL);
        int end = 0;
        ::waitpid(recorder_, &end, 0);
        EXPECT_TRUE(WIFSIGNALED(end)) << "it ended by itself: " << WEXITSTATUS(end);
        ::close(tell_);
    }

  private:
    pid_t recorder_ = -1;
    int tell_ = -1;
};

class KilledAtRandomTest : public KilledRecorderTest {};

TEST_P(KilledAtRandomTest, TheNextStartHasEverything) {
    const std::uint32_t seed = newSeed();
    makeFolder(root());
    begin();
    close();
    std::mt19937 random(seed);
    RandomWriter writer(root(), static_cast<std::uint32_t>(random()));
    const int rounds = 10 * stress();
    for (int round = 0; round < rounds && !HasFailure(); ++round) {
        startRecorder();
        if (round % 4 != 0) {
            waitForRecorder();
        }
        writer.steps(static_cast<int>(random() % 200));
        killRecorder();
        writer.steps(static_cast<int>(random() % 20));
        open();
        catchUp();
        expectWhole();
        close();
    }
}

// The last write comes within a clock tick of the recorder's look, and nothing tells of it but the
// file itself.
TEST_P(KilledRecorderTest, AWriteInTheTickOfTheLastLookIsNotLost) {
    makeFolder(root());
    begin();
    close();
    for (int round = 0; round < 10 * stress() && !HasFailure(); ++round) {
        startRecorder();
        waitForRecorder();
        const std::string file = path("file" + std::to_string(round % 3));
        for (int i = 0; i < 50; ++i) {
            // Of one size, so that only the times can tell.
            writeFile(file, std::to_string(1000 + (round * 50 + i) % 9000));
        }
        killRecorder();
        writeFile(file, std::to_string(1000 + round));
        open();
        catchUp();
        expectWhole();
        close();
    }
}

INSTANTIATE_TEST_SUITE_P(OnEach, KilledRecorderTest, followedBy(byListening), historyParameterName);
INSTANTIATE_TEST_SUITE_P(OnEach, KilledAtRandomTest, followedBy(byListening), historyParameterName);

}  // namespace
}  // namespace marrowdale::tests
