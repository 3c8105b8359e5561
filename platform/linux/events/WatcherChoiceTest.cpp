#include <cerrno>
#include <filesystem>

#include "platform/linux/events/WatcherChoice.h"
#include "platform/linux/events/WatcherTestWorld.h"
#include "platform/testing/ScopedMount.h"

namespace marrowdale::native {
namespace {

class NoFanotify : public FanotifyCalls {
  public:
    explicit NoFanotify(int code) : code_(code) {}
    int init(unsigned, unsigned) override {
        errno = code_;
        return -1;
    }

  private:
    int code_;
};

class NoMarks : public FanotifyCalls {
  public:
    int mark(int, unsigned, std::uint64_t, int, const char*) override {
        errno = ENODEV;
        return -1;
    }
};

class NoInotify : public InotifyCalls {
  public:
    int add(int, const char*, std::uint32_t) override {
        errno = ENOSPC;
        return -1;
    }
};

class WatcherChoiceTest : public testing::TestWithParam<TestFileSystem> {
  protected:
    [[nodiscard]] Expected<std::unique_ptr<Watcher>> choose(
        const WatcherCalls& calls, std::optional<Watcher::Kind> preferred = std::nullopt) const {
        const UniqueFD open(::open(folder_.path().c_str(), O_PATH | O_CLOEXEC));
        return chooseWatcher(open.get(), preferred, calls);
    }

    TemporaryDirectory folder_{GetParam().dir};
};
INSTANTIATE_TEST_SUITE_P(OnEach, WatcherChoiceTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(WatcherChoiceTest, fanotifyWhereItWorks) {
    const auto made = choose({});
    ASSERT_TRUE(made) << made.error().description();
    const auto status = (*made)->status();
    EXPECT_EQ(status.kind, Watcher::Kind::fanotify);
    EXPECT_EQ(status.reason, "fanotify, because this user may set its marks on this file system");
    // The mark that was tried is gone.
    writeFile(folder_.path("a"), "x");
    EXPECT_EQ(status.marks, 0U);
    EXPECT_EQ(drainAll(**made).events, 0U);
}

TEST_P(WatcherChoiceTest, inotifyWhereFanotifyDoesNot) {
    auto made = choose({std::make_shared<NoFanotify>(ENOSYS)});
    ASSERT_TRUE(made);
    EXPECT_EQ((*made)->status().kind, Watcher::Kind::inotify);
    EXPECT_EQ((*made)->status().reason,
              "inotify, because fanotify_init says: Function not implemented");
    EXPECT_EQ((*made)->status().marks, 0U);
    made = choose({std::make_shared<NoMarks>()});
    ASSERT_TRUE(made);
    EXPECT_EQ((*made)->status().reason, "inotify, because fanotify_mark says: No such device");
}

TEST_P(WatcherChoiceTest, askedForIsWhatOneGetsOrNothing) {
    EXPECT_EQ((*choose({}, Watcher::Kind::inotify))->status().kind, Watcher::Kind::inotify);
    EXPECT_EQ((*choose({}, Watcher::Kind::fanotify))->status().kind, Watcher::Kind::fanotify);
    EXPECT_EQ(choose({std::make_shared<NoFanotify>(EMFILE)}, Watcher::Kind::fanotify).error().code,
              EMFILE);
}

TEST_P(WatcherChoiceTest, neitherIsAnErrorThatNamesBothReasons) {
    const auto made = choose({std::make_shared<NoFanotify>(EPERM), std::make_shared<NoInotify>()});
    ASSERT_FALSE(made);
    EXPECT_EQ(made.error().code, ENOSPC);
    EXPECT_EQ(made.error().subject,
              "fanotify_init says: Operation not permitted; inotify_add_watch says: No space left "
              "on device");
}

TEST_P(WatcherChoiceTest, fileIsRefusedByBoth) {
    writeFile(folder_.path("file"), "x");
    const UniqueFD file(::open(folder_.path("file").c_str(), O_RDONLY | O_CLOEXEC));
    EXPECT_EQ(makeWatcher(file.get()).error().code, ENOTDIR);
}

// Its handles only name, and file-system marks are refused there.
TEST_P(WatcherChoiceTest, mergedFoldersAreWatchedOneWayOrTheOther) {
    const TemporaryDirectory layers("/dev/shm");
    for (const char* name : {"upper", "work", "merged"}) {
        makeFolder(layers.path(name));
    }
    writeFile(folder_.path("a"), "x");
    const std::string options = "lowerdir=" + folder_.path() + ",upperdir=" + layers.path("upper") +
                                ",workdir=" + layers.path("work");
    const ScopedMount merged = ScopedMount::overlay(layers.path("merged"), options);
    if (!merged) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    const UniqueFD open(::open(layers.path("merged").c_str(), O_PATH | O_CLOEXEC));
    const auto made = makeWatcher(open.get());
    ASSERT_TRUE(made) << made.error().description();
    RecordProperty("reason", (*made)->status().reason);
    ASSERT_TRUE((*made)->watchRoot(open.get(), FileID{1}));
    writeFile(layers.path("merged/b"), "x");
    std::filesystem::rename(layers.path("merged/a"), layers.path("merged/c"));
    const Told told = drainAll(**made);
    EXPECT_TRUE(told.has(FileID{1}, "b", WatchHint::appeared));
    EXPECT_TRUE(told.has(FileID{1}, "a", WatchHint::movedFrom));
    EXPECT_TRUE(told.has(FileID{1}, "c", WatchHint::movedTo));
}

}  // namespace
}  // namespace marrowdale::native
