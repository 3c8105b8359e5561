// A process that is killed at any moment of an action leaves what was there before, or what the
// action makes of it; after the next start nothing else is left.

#include <algorithm>
#include <array>
#include <chrono>
#include <csignal>
#include <fcntl.h>
#include <random>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "tests/actions/ActionsWorld.h"
#include "tests/changes/Replica.h"

namespace marrowdale::tests {
namespace {

namespace fs = std::filesystem;
using std::chrono::microseconds;
using std::chrono::steady_clock;

constexpr int filesInFolder = 60;
constexpr const char* rankName = "user.com.quillory.favorite-rank.number#PS";

// An action, and where it brings what.
struct KilledAction {
    std::string name;
    std::string from;  // below the root, or "" for what comes from outside
    std::string to;    // "" for nowhere
    std::function<void(ActionsWorld&)> act;
};

std::vector<KilledAction> killedActions() {
    const auto on = [](const std::string& item, auto call) {
        return [item, call](ActionsWorld& world) {
            call(world, world.identifierOf(item), world.identifierOf("box"));
        };
    };
    using World = ActionsWorld;
    using ID = std::string;
    return {
        {"importOfAFile", "", "box/file",
         [](World& world) {
             static_cast<void>(world.import(world.outside("file"), world.identifierOf("box")));
         }},
        {"importOfAFolder", "", "box/folder/",
         [](World& world) {
             static_cast<void>(world.import(world.outside("folder"), world.identifierOf("box")));
         }},
        {"create", "", "box/new/",
         [](World& world) { static_cast<void>(world.create("new", world.identifierOf("box"))); }},
        {"rename", "box/file", "box/other",
         on("box/file", [](World& world, const ID& item,
                           const ID&) { static_cast<void>(world.rename(item, "other")); })},
        {"move", "from/folder/", "box/folder/",
         on("from/folder", [](World& world, const ID& item,
                              const ID& box) { static_cast<void>(world.move(item, box)); })},
        {"trash", "box/file", ".Trash/file",
         on("box/file",
            [](World& world, const ID& item, const ID&) { static_cast<void>(world.trash(item)); })},
        {"untrash", ".Trash/file", "box/file",
         on(".Trash/file", [](World& world, const ID& item,
                              const ID& box) { static_cast<void>(world.untrash(item, box)); })},
        {"deleteOfAFile", "box/file", "",
         on("box/file", [](World& world, const ID& item,
                           const ID&) { static_cast<void>(world.remove(item)); })},
        {"deleteOfAFolder", "box/folder/", "",
         on("box/folder", [](World& world, const ID& item,
                             const ID&) { static_cast<void>(world.remove(item)); })},
        {"favorite", "box/file", "box/file",
         on("box/file", [](World& world, const ID& item,
                           const ID&) { static_cast<void>(world.favorite(item, 2)); })},
    };
}

class KillTest : public testing::TestWithParam<std::tuple<TestFileSystem, KilledAction>> {
  protected:
    using Picture = std::map<std::string, std::string>;
    static constexpr int usualKills = 12;

    [[nodiscard]] const KilledAction& action() const { return std::get<1>(GetParam()); }
    [[nodiscard]] static bool isFolder(const std::string& below) { return below.ends_with("/"); }

    void make(const std::string& path) const {
        if (!isFolder(path)) {
            writeFile(path, std::string(300'000, 'x'));
            return;
        }
        makeFolder(path + "inner");
        for (int i = 0; i < filesInFolder; ++i) {
            writeFile(path + "inner/" + std::to_string(i), std::string(2'000, 'x'));
        }
    }
    void prepare() {
        for (const char* folder : {"box", "from", ".Trash"}) {
            fs::remove_all(world_.path(folder));
            makeFolder(world_.path(folder));
        }
        if (!action().from.empty()) {
            make(world_.path(action().from));
        }
        if (action().name == "favorite" && keepsUserAttributes(world_.root())) {
            setAttribute(world_.path(action().from), rankName, "another program's");
        }
    }
    // What the action makes of the picture.
    Picture after(const Picture& before) {
        if (action().from.empty()) {
            Picture made = before;
            const std::string name = action().to.substr(action().to.find('/') + 1);
            made.merge(outsidePicture(name));
            return made;
        }
        Picture moved;
        for (const auto& [path, contents] : before) {
            if (!path.starts_with(action().from)) {
                moved.emplace(path, contents);
            } else if (!action().to.empty()) {
                moved.emplace(action().to + path.substr(action().from.size()), contents);
            }
        }
        return moved;
    }
    Picture outsidePicture(const std::string& name) const {
        Picture made{{"box/" + name, ""}};
        if (name == "file") {
            made["box/file"] = std::string(300'000, 'x');
        } else if (name == "folder/") {
            made.emplace("box/folder/inner/", "");
            for (int i = 0; i < filesInFolder; ++i) {
                made.emplace("box/folder/inner/" + std::to_string(i), std::string(2'000, 'x'));
            }
        }
        return made;
    }

    // Runs the action in a process of its own and kills that `delay` after it began; less than no
    // delay: never. Answers how long it took where it came to its end.
    std::optional<microseconds> run(microseconds delay) {
        std::array<int, 2> ends{};
        EXPECT_EQ(::pipe2(ends.data(), O_CLOEXEC), 0);
        const pid_t child = ::fork();
        if (child == 0) {
            world_.open();
            tell(ends[1]);
            action().act(world_);
            tell(ends[1]);
            ::pause();
            ::_exit(0);
        }
        ::close(ends[1]);
        char told = 0;
        EXPECT_EQ(::read(ends[0], &told, 1), 1);
        const auto begin = steady_clock::now();
        std::optional<microseconds> took;
        if (delay < microseconds::zero()) {
            EXPECT_EQ(::read(ends[0], &told, 1), 1);
            took = std::chrono::duration_cast<microseconds>(steady_clock::now() - begin);
        }
        while (steady_clock::now() < begin + delay) {
        }
        ::kill(child, SIGKILL);
        EXPECT_EQ(::waitpid(child, nullptr, 0), child);
        ::close(ends[0]);
        return took;
    }

    static void tell(int pipe) {
        if (::write(pipe, "x", 1) != 1) {
            ::_exit(1);
        }
    }
    static std::string withoutSlash(std::string path) {
        if (path.ends_with("/")) {
            path.pop_back();
        }
        return path;
    }

    void check(const Picture& before, const std::string& document) {
        world_.openAfterKill();
        const Picture now = world_.picture();
        EXPECT_TRUE(now == before || now == after(before)) << listed(now);
        EXPECT_EQ(world_.leftOvers(), std::set<std::string>());
        if (!document.empty() && !action().to.empty()) {
            const auto item = world_.provider().itemForIdentifier(document);
            ASSERT_TRUE(item) << item.error().description();
            const std::string path = (*item)->fileURL.path();
            EXPECT_TRUE(now.contains(path.substr(world_.root().size() + 1)) ||
                        now.contains(path.substr(world_.root().size() + 1) + "/"));
        }
        if (action().name == "favorite" && keepsUserAttributes(world_.root())) {
            EXPECT_TRUE(attribute(world_.path(action().from), rankName));
        }
        // A client from before the kill follows.
        EXPECT_TRUE(client_.catchUp(world_.provider()));
        for (const std::string& difference : client_.differences(world_.provider())) {
            ADD_FAILURE() << difference;
        }
        world_.close();
    }
    static std::string listed(const Picture& picture) {
        std::string text;
        for (const auto& [path, contents] : picture) {
            text += path + " " + std::to_string(contents.size()) + "\n";
        }
        return text;
    }

    ActionsWorld world_{std::get<0>(GetParam()).dir};
    Replica client_;
};

INSTANTIATE_TEST_SUITE_P(OnEach, KillTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::ValuesIn(killedActions())),
                         [](const auto& given) {
                             return std::get<0>(given.param).name + "_" +
                                    std::get<1>(given.param).name;
                         });

TEST_P(KillTest, leavesTheOldStateOrTheNewOne) {
    make(world_.outside("file"));
    make(world_.outside("folder/"));
    std::mt19937 random(std::random_device{}());
    microseconds typical{1};
    for (int kill = 0; kill < usualKills * stress() && !HasFailure(); ++kill) {
        SCOPED_TRACE("kill " + std::to_string(kill) + " of " + action().name);
        prepare();
        world_.open();
        const std::string document =
            action().from.empty() ? "" : world_.identifierOf(withoutSlash(action().from));
        client_.fill(world_.provider());
        world_.close();
        const Picture before = world_.picture();
        // How long it takes is learnt from the first ones, which come to their end.
        constexpr int whole = 2;
        const auto range = static_cast<unsigned>(typical.count() * 5 / 4);
        const auto took = run(kill < whole ? microseconds(-1) : microseconds(random() % range));
        typical = std::max(typical, took.value_or(typical));
        check(before, document);
        if (kill < whole && action().name != "favorite") {
            EXPECT_EQ(world_.picture(), after(before));
        }
    }
}

}  // namespace
}  // namespace marrowdale::tests
