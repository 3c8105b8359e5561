// Two sides race for one name: every action against every other, and against other programs.
// Whoever wins, each file's bytes are there exactly once afterwards.

#include <array>
#include <atomic>
#include <fcntl.h>
#include <thread>
#include <unistd.h>
#include <vector>

#include <gtest/gtest.h>

#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "tests/actions/ActionsWorld.h"
#include "tests/changes/Replica.h"

namespace marrowdale::tests {
namespace {

namespace fs = std::filesystem;

// What was half written would show: larger than what is written in one piece.
std::string contentsOf(const std::string& what) {
    constexpr std::size_t size = 40'000;
    std::string text = what + "\n";
    text.resize(size, what.front());
    return text;
}

// One round's files and what becomes of them. "target" is the name that is raced for.
struct Round {
    std::string target;
    std::string box;                                  // identifier of the folder it is in
    std::string standing;                             // identifier of what has the name, or ""
    std::array<std::string, 2> items;                 // identifiers of the sides' own items
    std::array<std::optional<std::string>, 2> taken;  // contents that another program removed
    std::array<bool, 2> brought{};                    // whether the side's contents came in
};

struct Side {
    std::string name;
    bool needsStanding = false;
    // Makes what the side needs; answers the path, below the root, of the item that it works on.
    std::function<std::string(std::size_t side, const Round& round)> prepare;
    std::function<void(std::size_t side, Round& round)> act;
};

class RacesTest : public testing::TestWithParam<std::tuple<TestFileSystem, std::size_t>> {
  protected:
    static constexpr int usualRounds = 150;

    RacesTest() { world_.open(); }
    ~RacesTest() override { world_.close(); }

    [[nodiscard]] std::string outside(std::size_t side, const std::string& name) const {
        return world_.outside(std::to_string(side) + "/" + name);
    }
    [[nodiscard]] static std::string ownContents(std::size_t side) {
        return contentsOf(std::to_string(side) + " own");
    }

    // The actions come first, the other programs behind them.
    std::vector<Side> sides() {
        std::vector<Side> all = actions();
        all.push_back({"another program makes it", false, nothing(),
                       [this](std::size_t side, Round& round) { writeNew(side, round); }});
        all.push_back({"another program renames to it", false, outsideFile(),
                       [this](std::size_t side, Round& round) { bringIn(side, round); }});
        all.push_back({"another program removes it", true, nothing(),
                       [this](std::size_t side, Round& round) { takeAway(side, round); }});
        all.push_back({"another program puts another there", true, outsideFile(),
                       [this](std::size_t side, Round& round) {
                           takeAway(side, round);
                           bringIn(side, round);
                       }});
        all.push_back({"another program reads it", false, nothing(),
                       [this](std::size_t, Round& round) { readIt(round); }});
        return all;
    }

    void runRound(const Side& first, const Side& second, bool hasStanding, int number) {
        Round round;
        round.target = "target " + std::to_string(number) + ".txt";
        round.box = world_.identifierOf("box");
        if (hasStanding || first.needsStanding || second.needsStanding) {
            writeFile(world_.box(round.target), contentsOf("standing"));
            round.standing = world_.identifierOf("box/" + round.target);
        }
        prepare(first, 0, round);
        prepare(second, 1, round);
        std::atomic<int> ready = 0;
        const auto together = [&](const Side& side, std::size_t place) {
            ++ready;
            while (ready < 2) {
            }
            side.act(place, round);
        };
        std::thread other([&] { together(second, 1); });
        together(first, 0);
        other.join();
        check(first, second, round);
    }

    void clear() {
        for (const std::string& folder :
             {world_.path("box"), world_.path("from"), world_.path(".Trash"), world_.outside("0"),
              world_.outside("1"), world_.outside("taken")}) {
            makeFolder(folder);
            for (const auto& entry : fs::directory_iterator(folder)) {
                fs::remove_all(entry.path());
            }
        }
    }

    ActionsWorld world_{std::get<0>(GetParam()).dir};

  private:
    static std::function<std::string(std::size_t, const Round&)> nothing() {
        return [](std::size_t, const Round&) { return std::string(); };
    }
    std::function<std::string(std::size_t, const Round&)> outsideFile() {
        return [this](std::size_t side, const Round&) {
            writeFile(outside(side, "own"), ownContents(side));
            return std::string();
        };
    }
    // A file of the side's own at a path below the root.
    std::function<std::string(std::size_t, const Round&)> file(const std::string& folder) {
        return [this, folder](std::size_t side, const Round& round) {
            const std::string below = folder + "/" + std::to_string(side);
            makeFolder(world_.path(below));
            writeFile(world_.path(below + "/" + round.target), ownContents(side));
            return below + "/" + round.target;
        };
    }

    std::vector<Side> actions() {
        return {
            {"import", false,
             [this](std::size_t side, const Round& round) {
                 writeFile(outside(side, round.target), ownContents(side));
                 return std::string();
             },
             [this](std::size_t side, Round& round) {
                 round.brought.at(side) =
                     world_.import(outside(side, round.target), round.box).has_value();
             }},
            {"create", false, nothing(),
             [this](std::size_t, Round& round) {
                 static_cast<void>(world_.create(round.target, round.box));
             }},
            {"rename", false,
             [this](std::size_t side, const Round&) {
                 const std::string below = "box/own " + std::to_string(side);
                 writeFile(world_.path(below), ownContents(side));
                 return below;
             },
             [this](std::size_t side, Round& round) {
                 static_cast<void>(world_.rename(round.items.at(side), round.target));
             }},
            {"move", false, file("from"),
             [this](std::size_t side, Round& round) {
                 static_cast<void>(world_.move(round.items.at(side), round.box));
             }},
            {"trash", true, nothing(),
             [this](std::size_t, Round& round) {
                 static_cast<void>(world_.trash(round.standing));
             }},
            {"untrash", false, file(".Trash"),
             [this](std::size_t side, Round& round) {
                 static_cast<void>(world_.untrash(round.items.at(side), round.box));
             }},
            {"delete", true, nothing(),
             [this](std::size_t, Round& round) {
                 static_cast<void>(world_.remove(round.standing));
             }},
        };
    }

    void prepare(const Side& side, std::size_t place, Round& round) {
        const std::string below = side.prepare(place, round);
        round.items.at(place) = below.empty() ? "" : world_.identifierOf(below);
        // What has to be there all through; imports and other programs say what they brought.
        round.brought.at(place) = !below.empty();
    }
    void writeNew(std::size_t side, Round& round) {
        const native::UniqueFD made(::open(world_.box(round.target).c_str(),
                                           O_CREAT | O_EXCL | O_WRONLY | O_CLOEXEC, 0644));
        const std::string text = ownContents(side);
        round.brought.at(side) = static_cast<bool>(made);
        EXPECT_TRUE(!made || ::write(made.get(), text.data(), text.size()) > 0);
    }
    void bringIn(std::size_t side, Round& round) {
        const int done = ::renameat2(AT_FDCWD, outside(side, "own").c_str(), AT_FDCWD,
                                     world_.box(round.target).c_str(), RENAME_NOREPLACE);
        round.brought.at(side) = done == 0;
    }
    // Moves it away first, to know what it is that goes.
    void takeAway(std::size_t side, Round& round) {
        const std::string away = world_.outside("taken/" + std::to_string(side));
        if (::renameat2(AT_FDCWD, world_.box(round.target).c_str(), AT_FDCWD, away.c_str(),
                        RENAME_NOREPLACE) == 0) {
            round.taken.at(side) = fs::is_directory(away) ? "" : readFile(away);
            fs::remove(away);
        }
    }
    // Whatever has the name is whole.
    void readIt(const Round& round) {
        for (int i = 0; i < 20; ++i) {
            const native::UniqueFD opened(
                ::open(world_.box(round.target).c_str(), O_RDONLY | O_CLOEXEC));
            std::string text(ownContents(0).size() + 1, '\0');
            const ssize_t size = opened ? ::read(opened.get(), text.data(), text.size()) : -1;
            if (size < 0) {
                continue;
            }
            text.resize(static_cast<std::size_t>(size));
            EXPECT_TRUE(text == ownContents(0) || text == ownContents(1) ||
                        text == contentsOf("standing"))
                << "half a file of " << size << " bytes";
        }
    }

    void check(const Side& first, const Side& second, const Round& round) {
        SCOPED_TRACE(first.name + " against " + second.name + " for " + round.target);
        std::map<std::string, int> found;
        for (const auto& [path, contents] : world_.picture()) {
            found[path.ends_with("/") ? "" : contents.substr(0, contents.find('\n'))] +=
                path.ends_with("/") || contents.size() == ownContents(0).size() ? 1 : 1'000;
        }
        const auto expected = [&](const std::string& what) {
            return what == round.taken[0].value_or("").substr(0, what.size()) ||
                           what == round.taken[1].value_or("").substr(0, what.size())
                       ? 0
                       : 1;
        };
        for (std::size_t side = 0; side < 2; ++side) {
            const std::string what = std::to_string(side) + " own";
            EXPECT_EQ(found[what], round.brought.at(side) ? expected(what) : 0) << what;
        }
        if (!round.standing.empty()) {
            const bool mayGo = first.name == "delete" || second.name == "delete";
            EXPECT_LE(found["standing"], expected("standing"));
            EXPECT_GE(found["standing"], mayGo ? 0 : expected("standing"));
        }
        EXPECT_EQ(world_.leftOvers(), std::set<std::string>());
    }
};

std::string nameOfRaces(const testing::TestParamInfo<RacesTest::ParamType>& given) {
    static constexpr std::array names{"import", "create",  "rename", "move",
                                      "trash",  "untrash", "delete"};
    return std::get<0>(given.param).name + "_" + names.at(std::get<1>(given.param));
}
INSTANTIATE_TEST_SUITE_P(OnEach, RacesTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Range(std::size_t{0}, std::size_t{7})),
                         nameOfRaces);

TEST_P(RacesTest, everyFileIsThereOnceAfterwards) {
    const auto all = sides();
    const Side& first = all.at(std::get<1>(GetParam()));
    clear();
    Replica client;
    client.fill(world_.provider());
    const int rounds = usualRounds * stress();
    for (int number = 0; number < rounds && !HasFailure(); ++number) {
        const auto turn = static_cast<std::size_t>(number);
        runRound(first, all[turn % all.size()], turn / all.size() % 2 == 0, number);
        if (!HasFailure()) {
            clear();
        }
    }
    // A client that slept through all of it knows what is there.
    ASSERT_TRUE(client.catchUp(world_.provider()));
    for (const std::string& difference : client.differences(world_.provider())) {
        ADD_FAILURE() << difference;
    }
}

}  // namespace
}  // namespace marrowdale::tests
