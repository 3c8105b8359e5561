#include <cerrno>
#include <deque>
#include <filesystem>

#include "platform/linux/events/FanotifyTestBytes.h"
#include "platform/linux/events/FanotifyWatcher.h"
#include "platform/linux/events/WatcherTestWorld.h"
#include "platform/linux/files/FileHandle.h"

namespace marrowdale::native {
namespace {

// Marks run out after some; reads give what is scripted, then nothing.
class ScriptedFanotify : public FanotifyCalls {
  public:
    int marksLeft = 1000;
    std::deque<std::string> reads;

    int mark(int group, unsigned flags, std::uint64_t mask, int directory,
             const char* path) override {
        if (marksLeft == 0) {
            errno = ENOSPC;
            return -1;
        }
        const int result = FanotifyCalls::mark(group, flags, mask, directory, path);
        marksLeft -= result == 0 ? 1 : 0;
        return result;
    }
    ssize_t read(int, void* buffer, std::size_t size) override {
        if (reads.empty()) {
            errno = EAGAIN;
            return -1;
        }
        const std::string bytes = reads.front().substr(0, size);
        reads.pop_front();
        std::memcpy(buffer, bytes.data(), bytes.size());
        return static_cast<ssize_t>(bytes.size());
    }
};

class FanotifyWatcherTest : public testing::TestWithParam<TestFileSystem> {
  protected:
    [[nodiscard]] std::unique_ptr<FanotifyWatcher> scripted() const {
        return std::move(*FanotifyWatcher::create("test", FanotifyWatcher::Queue::bounded, calls_));
    }
    [[nodiscard]] UniqueFD made(std::string_view name) const {
        makeFolder(folder_.path(name));
        return UniqueFD(::open(folder_.path(name).c_str(), O_PATH | O_CLOEXEC));
    }
    [[nodiscard]] static std::string handleOf(const UniqueFD& file) {
        return std::string(fileHandle(file.get(), "")->bytes());
    }

    TemporaryDirectory folder_{GetParam().dir};
    std::shared_ptr<ScriptedFanotify> calls_ = std::make_shared<ScriptedFanotify>();
};
INSTANTIATE_TEST_SUITE_P(OnEach, FanotifyWatcherTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

// The marks that the kernel has for the group.
std::size_t kernelMarks(int group) {
    const std::string text = readFile("/proc/self/fdinfo/" + std::to_string(group));
    std::size_t count = 0;
    for (std::size_t at = text.find("fanotify ino:"); at != std::string::npos;
         at = text.find("fanotify ino:", at + 1)) {
        ++count;
    }
    return count;
}

TEST_P(FanotifyWatcherTest, countsTheMarksThatTheKernelCounts) {
    const auto watcher = std::move(*FanotifyWatcher::create("test"));
    const auto expectMarks = [&](std::size_t count) {
        EXPECT_EQ(watcher->status().marks, count);
        EXPECT_EQ(kernelMarks(watcher->descriptor()), count);
    };
    ASSERT_TRUE(watcher->watchRoot(made("w").get(), FileID{1}));
    ASSERT_TRUE(watcher->watchFolder(made("w/sub").get(), FileID{2}));
    ASSERT_TRUE(watcher->watchFolder(made("w/sub").get(), FileID{2}));
    writeFile(folder_.path("w/file"), "x");
    const UniqueFD file(::open(folder_.path("w/file").c_str(), O_RDONLY | O_CLOEXEC));
    ASSERT_TRUE(watcher->watchFile(file.get(), FileID{3}));
    expectMarks(3);
    ASSERT_TRUE(watcher->tryFolder(made("w/tried").get()));
    expectMarks(3);
    std::filesystem::remove(folder_.path("w/sub"));
    (void)drainAll(*watcher);
    expectMarks(2);
}

TEST_P(FanotifyWatcherTest, marksThatRunOutAreNoSpace) {
    const auto watcher = scripted();
    calls_->marksLeft = 1;
    EXPECT_TRUE(watcher->watchFolder(made("a").get(), FileID{1}));
    EXPECT_EQ(watcher->watchFolder(made("b").get(), FileID{2}).error().code, ENOSPC);
    EXPECT_EQ(watcher->status().marks, 1U);
    calls_->marksLeft = 1;
    EXPECT_TRUE(watcher->watchFolder(made("b").get(), FileID{2}));
}

TEST_P(FanotifyWatcherTest, eventsOfUnknownHandlesAreDropped) {
    const auto watcher = scripted();
    const UniqueFD known = made("known");
    ASSERT_TRUE(watcher->watchFolder(known.get(), FileID{1}));
    std::string otherGeneration = handleOf(known);
    otherGeneration.back() = static_cast<char>(otherGeneration.back() + 1);
    FanotifyTestBytes bytes;
    bytes
        .event(FAN_CREATE,
               FanotifyTestBytes::info(FAN_EVENT_INFO_TYPE_DFID_NAME, otherGeneration, "unknown"))
        .event(FAN_CREATE,
               FanotifyTestBytes::info(FAN_EVENT_INFO_TYPE_DFID_NAME, handleOf(known), "known"))
        .event(
            FAN_RENAME,
            FanotifyTestBytes::info(FAN_EVENT_INFO_TYPE_OLD_DFID_NAME, otherGeneration, "from") +
                FanotifyTestBytes::info(FAN_EVENT_INFO_TYPE_NEW_DFID_NAME, handleOf(known), "to"));
    calls_->reads = {bytes.text()};
    const Told told = drainAll(*watcher);
    EXPECT_EQ(told.events, 3U);
    ASSERT_EQ(told.hints.size(), 2U);
    EXPECT_TRUE(told.has(FileID{1}, "known", WatchHint::appeared));
    EXPECT_EQ(told.hints[1].what, WatchHint::movedTo);
    EXPECT_EQ(told.hints[1].fromFolder, FileID{});
    EXPECT_EQ(told.hints[1].fromName, "");
    EXPECT_EQ(told.hints[1].fingerprint, 0U);
}

TEST_P(FanotifyWatcherTest, bytesThatAreNoEventsAreAnOverflow) {
    const auto watcher = scripted();
    const UniqueFD known = made("known");
    ASSERT_TRUE(watcher->watchFolder(known.get(), FileID{1}));
    FanotifyTestBytes bytes;
    bytes.event(FAN_CREATE,
                FanotifyTestBytes::info(FAN_EVENT_INFO_TYPE_DFID_NAME, handleOf(known), "a"));
    calls_->reads = {bytes.text() + "noise", bytes.text()};
    const Told told = drainAll(*watcher);
    EXPECT_TRUE(told.overflowed);
    EXPECT_EQ(told.hints.size(), 2U);
    EXPECT_EQ(watcher->status().overflows, 1U);
}

TEST_P(FanotifyWatcherTest, unlimitedQueueIsForThePrivileged) {
    const auto made = FanotifyWatcher::create("test", FanotifyWatcher::Queue::unlimited);
    if (runsAsRoot()) {
        ASSERT_TRUE(made);
        EXPECT_EQ((*made)->status().queueLimit, 0U);
    } else {
        EXPECT_EQ(made.error().code, EPERM);
        EXPECT_EQ(made.error().operation, "fanotify_init");
    }
}

}  // namespace
}  // namespace marrowdale::native
