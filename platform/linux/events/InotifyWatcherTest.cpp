#include <cerrno>
#include <cstring>
#include <sys/inotify.h>

#include "platform/linux/events/InotifyWatcher.h"
#include "platform/linux/events/WatcherTestWorld.h"
#include "platform/testing/ScopedMount.h"

namespace marrowdale::native {
namespace {

// Gives one real event a read.
class SmallReads : public InotifyCalls {
  public:
    ssize_t read(int group, void* buffer, std::size_t) override {
        constexpr std::size_t oneShortName = sizeof(inotify_event) + 16;
        return InotifyCalls::read(group, buffer, oneShortName);
    }
};

class InotifyWatcherTest : public testing::Test {
  protected:
    [[nodiscard]] UniqueFD open(std::string_view name) const {
        return UniqueFD(::open(folder_.path(name).c_str(), O_PATH | O_CLOEXEC));
    }

    TemporaryDirectory folder_;
    std::unique_ptr<InotifyWatcher> watcher_ =
        std::move(*InotifyWatcher::create("test", std::make_shared<SmallReads>()));
};

TEST_F(InotifyWatcherTest, halvesOfARenameMeetAcrossReads) {
    makeFolder(folder_.path("one"));
    makeFolder(folder_.path("two"));
    writeFile(folder_.path("one/a"), "x");
    ASSERT_TRUE(watcher_->watchFolder(open("one").get(), FileID{1}));
    ASSERT_TRUE(watcher_->watchFolder(open("two").get(), FileID{2}));
    ASSERT_EQ(std::rename(folder_.path("one/a").c_str(), folder_.path("two/b").c_str()), 0);
    const Told told = drainAll(*watcher_);
    ASSERT_EQ(told.hints.size(), 2U);
    EXPECT_EQ(told.hints[1].what, WatchHint::movedTo);
    EXPECT_EQ(told.hints[1].fromFolder, FileID{1});
    EXPECT_EQ(told.hints[1].fromName, "a");
}

TEST_F(InotifyWatcherTest, folderUnderASecondNumberLeavesTheFirst) {
    makeFolder(folder_.path("w"));
    ASSERT_TRUE(watcher_->watchFolder(open("w").get(), FileID{1}));
    ASSERT_TRUE(watcher_->watchFolder(open("w").get(), FileID{2}));
    EXPECT_EQ(watcher_->status().marks, 1U);
    watcher_->unwatch(FileID{1});
    writeFile(folder_.path("w/a"), "x");
    const Told told = drainAll(*watcher_);
    EXPECT_FALSE(told.names(FileID{1}));
    EXPECT_TRUE(told.has(FileID{2}, "a", WatchHint::appeared));
}

TEST_F(InotifyWatcherTest, unmountedRootIsTold) {
    makeFolder(folder_.path("w"));
    {
        const ScopedMount mounted = ScopedMount::memory(folder_.path("w"));
        if (!mounted) {
            MARROWDALE_SKIP_FOR_USER("only root may mount");
        }
        makeFolder(folder_.path("w/sub"));
        ASSERT_TRUE(watcher_->watchRoot(open("w").get(), FileID{1}));
        ASSERT_TRUE(watcher_->watchFolder(open("w/sub").get(), FileID{2}));
    }
    const Told told = drainAll(*watcher_);
    EXPECT_TRUE(told.has(FileID{1}, "", WatchHint::rootMoved));
    EXPECT_FALSE(told.names(FileID{2}));
    EXPECT_EQ(watcher_->status().marks, 0U);
}

TEST_F(InotifyWatcherTest, initThatFailsIsTold) {
    class NoMore : public InotifyCalls {
      public:
        int init(int) override {
            errno = EMFILE;
            return -1;
        }
    };
    const auto made = InotifyWatcher::create("test", std::make_shared<NoMore>());
    EXPECT_EQ(made.error().code, EMFILE);
    EXPECT_EQ(made.error().operation, "inotify_init1");
}

}  // namespace
}  // namespace marrowdale::native
