#include <cerrno>
#include <fstream>
#include <sched.h>

#include "platform/linux/events/WatcherTestProcess.h"
#include "platform/linux/events/WatcherTestWorld.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

constexpr int allowed = 3;

// Lowers a limit of this user namespace.
bool lowerLimit(const std::string& name) {
    std::ofstream file("/proc/sys/user/" + name);
    file << allowed << std::flush;
    return file.good();
}

class WatcherLimitsTest : public testing::TestWithParam<Watcher::Kind> {};
INSTANTIATE_TEST_SUITE_P(OfEachKind, WatcherLimitsTest,
                         testing::Values(Watcher::Kind::fanotify, Watcher::Kind::inotify),
                         [](const auto& kind) { return kindName(kind.param); });

// What the process that lowered its limit does with a watcher.
bool runsOutOfMarksAndGoesOn(const std::string& folder, Watcher::Kind kind) {
    WatcherWorld world(folder, kind);
    const auto watchNext = [&](int i) {
        makeFolder(world.at(std::to_string(i)));
        const UniqueFD next = world.open(std::to_string(i), O_PATH);
        return world.watcher().watchFolder(next.get(), world.numberOf(std::to_string(i)));
    };
    for (int i = 0; i < allowed; ++i) {
        if (!watchNext(i)) {
            return false;
        }
    }
    const auto refused = watchNext(allowed);
    writeFile(world.at("0/a"), "x");
    return !refused && refused.error().code == ENOSPC &&
           world.watcher().status().marks == allowed &&
           world.drain().has(world.numberOf("0"), "a", WatchHint::appeared);
}

TEST_P(WatcherLimitsTest, noMoreMarksIsNoSpace) {
    MARROWDALE_SKIP_UNDER_SANITIZER(
        "its background thread makes unshare(CLONE_NEWUSER), which takes a process of one thread, "
        "fail with EINVAL");
    const TemporaryDirectory folder;
    const WatcherTestProcess child([&](std::uint8_t request) {
        if (request == 0) {
            return ::unshare(CLONE_NEWUSER) == 0 &&
                   lowerLimit(GetParam() == Watcher::Kind::fanotify ? "max_fanotify_marks"
                                                                    : "max_inotify_watches");
        }
        return runsOutOfMarksAndGoesOn(folder.path(), GetParam());
    });
    if (!child.ask(0)) {
        MARROWDALE_SKIP("a user namespace with limits of its own");
    }
    EXPECT_TRUE(child.ask(1));
}

}  // namespace
}  // namespace marrowdale::native
