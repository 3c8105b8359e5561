#include <cerrno>
#include <csignal>
#include <fcntl.h>
#include <random>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "platform/linux/operations/OperationsTestWorld.h"
#include "platform/linux/operations/Temporaries.h"

namespace marrowdale::native {
namespace {

struct TemporariesTest : OperationsTest {
    // As a start does.
    void sweep() {
        auto temporaries = Temporaries::open(world_.directory.path("state"), &world_.log);
        ASSERT_TRUE(temporaries);
        (*temporaries)->sweep([&](FileID folder) {
            asked_.push_back(folder);
            return found_;
        });
    }
    // What a process leaves that is killed in the middle of `body`.
    template <typename Body>
    static void inChildThatIsKilled(const Body& body) {
        const pid_t child = ::fork();
        if (child == 0) {
            body();
            ::kill(::getpid(), SIGKILL);
        }
        int status = 0;
        ASSERT_EQ(::waitpid(child, &status, 0), child);
        ASSERT_TRUE(WIFSIGNALED(status));
    }
    void leaveOne(const std::string& folder) {
        inChildThatIsKilled([&] {
            const UniqueFD opened(::open(folder.c_str(), O_RDONLY | O_DIRECTORY));
            const auto made = world_.temporaries->make(opened.get(), folder);
            const UniqueFD file(
                ::openat(made->descriptor(), "file", O_CREAT | O_WRONLY | O_CLOEXEC, 0600));
            ::kill(::getpid(), SIGKILL);
        });
    }

    Expected<std::string> found_ = Unexpected(errorWithPOSIXCode(ENOENT));
    std::vector<FileID> asked_;
};
INSTANTIATE_TEST_SUITE_P(OnEach, TemporariesTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(TemporariesTest, whatIsMadeGoesWithItsNote) {
    const std::string tree = world_.directory.path("tree");
    const UniqueFD folder(::open(tree.c_str(), O_RDONLY | O_DIRECTORY));
    {
        const auto made = world_.temporaries->make(folder.get(), tree);
        ASSERT_TRUE(made);
        ASSERT_EQ(world_.names().size(), 1U);
        EXPECT_TRUE(world_.names().begin()->starts_with(".marrowdale-"));
        EXPECT_EQ(world_.notes().size(), 1U);
        struct stat status{};
        ASSERT_EQ(::fstat(made->descriptor(), &status), 0);
        EXPECT_EQ(status.st_mode & 0777U, 0700U);
        ASSERT_EQ(::mkdirat(made->descriptor(), "inner", 0755), 0);
    }
    EXPECT_TRUE(world_.names().empty());
    EXPECT_TRUE(world_.notes().empty());
}

TEST_P(TemporariesTest, whatAKilledProcessLeftIsSwept) {
    leaveOne(world_.directory.path("tree"));
    ASSERT_EQ(world_.names().size(), 1U);
    ASSERT_EQ(world_.notes().size(), 1U);
    // Never by how a name looks.
    makeFolder(world_.at(".marrowdale-C0FFEE00-0000-4000-8000-000000000001"));
    sweep();
    EXPECT_EQ(world_.names(),
              (std::set<std::string>{".marrowdale-C0FFEE00-0000-4000-8000-000000000001"}));
    EXPECT_TRUE(world_.notes().empty());
    EXPECT_TRUE(asked_.empty());
}

TEST_P(TemporariesTest, aFolderThatWasMovedSinceIsFoundByItsNumber) {
    makeFolder(world_.at("folder"));
    leaveOne(world_.at("folder"));
    std::filesystem::rename(world_.at("folder"), world_.at("moved"));
    makeFolder(world_.at("folder"));
    found_ = world_.at("moved");
    sweep();
    EXPECT_EQ(asked_.size(), 1U);
    EXPECT_TRUE(std::filesystem::is_empty(world_.at("moved")));
    EXPECT_TRUE(world_.notes().empty());
}

TEST_P(TemporariesTest, aLinkInPlaceOfTheFolderLeadsNowhere) {
    makeFolder(world_.at("folder"));
    leaveOne(world_.at("folder"));
    std::filesystem::rename(world_.at("folder"), world_.outside("folder"));
    std::filesystem::create_directory_symlink(world_.outside("folder"), world_.at("folder"));
    sweep();
    EXPECT_FALSE(std::filesystem::is_empty(world_.outside("folder")));
}

TEST_P(TemporariesTest, aFolderThatIsGoneTakesItsNoteAlong) {
    makeFolder(world_.at("folder"));
    leaveOne(world_.at("folder"));
    std::filesystem::remove_all(world_.at("folder"));
    sweep();
    EXPECT_TRUE(world_.notes().empty());
    EXPECT_EQ(world_.sink->countOfLevel(LogLevel::error), 0U);
}

TEST_P(TemporariesTest, whatCanNotBeRemovedStaysNoted) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    makeFolder(world_.at("folder"));
    leaveOne(world_.at("folder"));
    ASSERT_EQ(::chmod(world_.at("folder").c_str(), 0555), 0);
    sweep();
    EXPECT_EQ(world_.notes().size(), 1U);
    EXPECT_EQ(world_.sink->countContaining("can't tidy up after an operation on files; "), 1U);
    ASSERT_EQ(::chmod(world_.at("folder").c_str(), 0755), 0);
    sweep();
    EXPECT_TRUE(world_.notes().empty());
}

TEST_P(TemporariesTest, damagedNotesAreLeftAndSaid) {
    leaveOne(world_.directory.path("tree"));
    const std::string note = world_.directory.path("state/temporaries/" + *world_.notes().begin());
    const std::string whole = readFile(note);
    for (std::size_t length = 0; length < whole.size(); ++length) {
        writeFile(note, whole.substr(0, length));
        sweep();
        ASSERT_EQ(world_.names().size(), 1U) << length;
        ASSERT_EQ(world_.notes().size(), 1U) << length;
    }
    for (std::size_t at = 0; at < whole.size(); ++at) {
        std::string flipped = whole;
        flipped[at] = static_cast<char>(flipped[at] ^ 0x10);
        writeFile(note, flipped);
        sweep();
        ASSERT_EQ(world_.names().size(), 1U) << at;
    }
    EXPECT_EQ(world_.sink->countContaining("can't tidy up"), 2 * whole.size());
    writeFile(note, whole);
    sweep();
    EXPECT_TRUE(world_.names().empty());
}

TEST_P(TemporariesTest, anUnfinishedNoteIsOfNothing) {
    writeFile(world_.directory.path("state/temporaries/") + UUID::random().text() + ".new", "x");
    writeFile(world_.directory.path("state/temporaries/stranger"), "x");
    sweep();
    EXPECT_EQ(world_.notes(), (std::set<std::string>{"stranger"}));
}

// Kill at any moment: the old state or the new one, and nothing else after the sweep.
struct KillTest : TemporariesTest {
    template <typename Body>
    void killInTheMiddleOf(const Body& body) {
        const pid_t child = ::fork();
        if (child == 0) {
            body();
            ::_exit(0);
        }
        const auto delay = std::chrono::microseconds(random_() % 12'000);
        const auto until = std::chrono::steady_clock::now() + delay;
        while (std::chrono::steady_clock::now() < until) {
        }
        ::kill(child, SIGKILL);
        int status = 0;
        ASSERT_EQ(::waitpid(child, &status, 0), child);
        kills_ += WIFSIGNALED(status) ? 1 : 0;
        sweep();
        ASSERT_TRUE(world_.notes().empty());
    }
    // The work itself, without the pool, whose threads a child must not share.
    template <typename Body>
    void work(const Body& body) {
        const FileWork files({world_.trees, world_.packages, *world_.temporaries});
        const std::atomic<bool> stopping = false;
        OperationRun run(OperationProgress::Kind::importing, nullptr, stopping, nullptr);
        body(files, run);
    }
    static constexpr int kills = 40;
    std::mt19937 random_{static_cast<unsigned>(GetParam().name.size())};
    int kills_ = 0;
};
INSTANTIATE_TEST_SUITE_P(OnEach, KillTest, testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(KillTest, importsAreWholeOrNotThere) {
    makeFolder(world_.outside("folder"));
    for (int i = 0; i < 100; ++i) {
        writeFile(world_.outside("folder/" + std::to_string(i)), std::string(1000, 'x'));
    }
    writeFile(world_.outside("file"), std::string(2 << 20, 'x'));
    for (int round = 0; round < kills; ++round) {
        const std::string name = round % 2 == 0 ? "folder" : "file";
        killInTheMiddleOf([&] {
            work([&](const FileWork& files, OperationRun& run) {
                static_cast<void>(
                    files.import(URL::fileURL(world_.outside(name)), world_.url(), run));
            });
        });
        const auto names = world_.names();
        ASSERT_LE(names.size(), 1U);
        if (names.empty()) {
            continue;
        }
        ASSERT_EQ(*names.begin(), name);
        if (name == "file") {
            ASSERT_EQ(std::filesystem::file_size(world_.at(name)), 2U << 20U);
        } else {
            ASSERT_EQ(OperationsWorld::namesIn(world_.at(name)).size(), 100U);
        }
        std::filesystem::remove_all(world_.at(name));
    }
    EXPECT_GT(kills_, 0);
}

TEST_P(KillTest, deletionsAreWholeOrNotBegun) {
    for (int round = 0; round < kills; ++round) {
        makeFolder(world_.at("folder/inner"));
        for (int i = 0; i < 100; ++i) {
            writeFile(world_.at("folder/inner/" + std::to_string(i)), "");
        }
        killInTheMiddleOf([&] {
            work([&](const FileWork& files, OperationRun& run) {
                static_cast<void>(files.remove(world_.url("folder"), run));
            });
        });
        const auto names = world_.names();
        ASSERT_LE(names.size(), 1U);
        if (!names.empty()) {
            ASSERT_EQ(*names.begin(), "folder");
            ASSERT_EQ(OperationsWorld::namesIn(world_.at("folder/inner")).size(), 100U);
        }
    }
    EXPECT_GT(kills_, 0);
}

TEST_P(KillTest, movesAreDoneOrNot) {
    makeFolder(world_.at("trash"));
    writeFile(world_.at("a"), "a");
    for (int round = 0; round < kills; ++round) {
        killInTheMiddleOf([&] {
            work([&](const FileWork& files, OperationRun&) {
                for (int i = 0; i < 1000; ++i) {
                    static_cast<void>(files.rename(world_.url("a"), "b"));
                    static_cast<void>(
                        files.moveAvoidingCollision(world_.url("b"), world_.url("trash")));
                    static_cast<void>(files.move(world_.url("trash/b"), world_.url(), "a"));
                }
            });
        });
        auto names = world_.names();
        names.erase("trash");
        names.merge(OperationsWorld::namesIn(world_.at("trash")));
        ASSERT_EQ(names.size(), 1U);
        static_cast<void>(world_.move("trash/b", "", "a"));
        static_cast<void>(world_.rename("b", "a"));
        ASSERT_EQ(readFile(world_.at("a")), "a");
    }
}

}  // namespace
}  // namespace marrowdale::native
