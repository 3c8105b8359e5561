#include <atomic>
#include <cstdlib>
#include <fcntl.h>
#include <map>
#include <random>
#include <thread>
#include <unistd.h>

#include "platform/linux/operations/OperationsTestWorld.h"

namespace marrowdale::native {
namespace {

// As many rounds as MARROWDALE_RACE_ROUNDS says, else enough to see the worst.
int rounds() {
    const char* value = std::getenv("MARROWDALE_RACE_ROUNDS");  // NOLINT(concurrency-mt-unsafe)
    constexpr int usual = 200;
    return value == nullptr ? usual : std::atoi(value);  // NOLINT(cert-err34-c)
}

// Two sides race for the one name "target"; afterwards each file's bytes are there exactly once.
struct RaceTest : OperationsTest {
    using Side = std::function<void(int side)>;

    // A fresh file of its own for that side, and what it does with it.
    std::vector<std::pair<std::string, Side>> sides() {
        return {
            {"rename",
             [&](int side) {
                 static_cast<void>(world_.rename("own" + std::to_string(side), "target"));
             }},
            {"move",
             [&](int side) {
                 static_cast<void>(world_.move("folder/own" + std::to_string(side), "", "target"));
             }},
            {"avoid",
             [&](int side) {
                 static_cast<void>(world_.avoid("folder/" + std::to_string(side) + "/target", ""));
             }},
            {"import",
             [&](int side) {
                 static_cast<void>(world_.import(world_.outside(std::to_string(side) + "/target")));
             }},
            {"create", [&](int) { static_cast<void>(world_.create("target")); }},
            {"outside writer", [&](int side) {
                 // What any program does that makes a file.
                 const UniqueFD file(::open(world_.at("target").c_str(),
                                            O_CREAT | O_EXCL | O_WRONLY | O_CLOEXEC, 0644));
                 if (file) {
                     const std::string text = "outside" + std::to_string(side);
                     EXPECT_GT(::write(file.get(), text.data(), text.size()), 0);
                     ++written_;
                 }
             }}};
    }

    void prepare() {
        for (int side = 0; side < 2; ++side) {
            const std::string number = std::to_string(side);
            writeFile(world_.at("own" + number), "own" + number);
            makeFolder(world_.at("folder/" + number));
            writeFile(world_.at("folder/own" + number), "moved" + number);
            writeFile(world_.at("folder/" + number + "/target"), "avoided" + number);
            makeFolder(world_.outside(number));
            writeFile(world_.outside(number + "/target"), "import");
        }
        written_ = 0;
    }

    std::map<std::string, int> contents() {
        std::map<std::string, int> found;
        for (const auto& entry :
             std::filesystem::recursive_directory_iterator(world_.directory.path("tree"))) {
            if (entry.is_regular_file()) {
                ++found[readFile(entry.path().string())];
            }
        }
        return found;
    }

    std::atomic<int> written_ = 0;
};
INSTANTIATE_TEST_SUITE_P(OnEach, RaceTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(RaceTest, everyFileIsThereOnceAfterwards) {
    const auto all = sides();
    for (int round = 0; round < rounds(); ++round) {
        const auto pair = static_cast<std::size_t>(round);
        const auto& [firstName, first] = all[pair % all.size()];
        const auto& [secondName, second] = all[pair / all.size() % all.size()];
        prepare();
        std::thread other([&] { second(1); });
        first(0);
        other.join();
        auto found = contents();
        for (const char* text : {"own0", "own1", "moved0", "moved1", "avoided0", "avoided1"}) {
            ASSERT_EQ(found[text], 1) << text << " in " << firstName << " against " << secondName;
        }
        ASSERT_EQ(found["outside0"] + found["outside1"], written_);
        ASSERT_LE(found["import"], 1);
        for (const std::string& name : world_.names()) {
            ASSERT_FALSE(name.starts_with(".")) << name;
        }
        std::filesystem::remove_all(world_.directory.path("tree/folder"));
        for (const std::string& name : world_.names()) {
            std::filesystem::remove_all(world_.at(name));
        }
    }
}

}  // namespace
}  // namespace marrowdale::native
