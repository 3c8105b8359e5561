// What the recorder promises: own writes are read, a full queue loses nothing, folders and roots
// that move about, numbers of files that come back, batches that end early, marks that run out.

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <future>
#include <sched.h>
#include <set>
#include <sys/stat.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

#include "platform/testing/ScopedMount.h"
#include "tests/history/HistoryTest.h"

namespace marrowdale::tests {
namespace {

class RecorderTest : public HistoryTest {
  protected:
    void SetUp() override { makeFolder(root()); }

    // Paths of the events since the last call, with a "-" before those that say that it is gone.
    std::set<std::string> news() {
        std::set<std::string> paths;
        const auto now = store().barrier();
        EXPECT_TRUE(now) << now.error().description();
        const auto cursor = store().eventsSince(last_);
        EXPECT_TRUE(cursor);
        for (auto event = (*cursor)->next(); event && *event; event = (*cursor)->next()) {
            last_ = (*event)->id;
            const bool isGone = ((*event)->flags & FileEventFlag::gone) != 0;
            paths.insert((isGone ? "-" : "") + std::string((*event)->path));
        }
        return paths;
    }
    void exchange(const std::string& a, const std::string& b) const {
        (void)::renameat2(AT_FDCWD, path(a).c_str(), AT_FDCWD, path(b).c_str(), RENAME_EXCHANGE);
    }

  private:
    EventID last_{};
};

// Does one thing for each byte that it is sent, and answers with one.
class OtherProcess {
  public:
    explicit OtherProcess(const std::function<void(int)>& work) {
        std::array<int, 2> there{};
        std::array<int, 2> back{};
        if (::pipe(there.data()) != 0 || ::pipe(back.data()) != 0) {
            throw std::runtime_error("pipe");
        }
        process_ = ::fork();
        if (process_ == 0) {
            ::close(there[1]);
            char byte = 0;
            for (int i = 0; ::read(there[0], &byte, 1) == 1; ++i) {
                work(i);
                (void)!::write(back[1], &byte, 1);
            }
            ::_exit(0);
        }
        ::close(there[0]);
        ::close(back[1]);
        ask_ = there[1];
        answer_ = back[0];
    }
    OtherProcess(const OtherProcess&) = delete;
    OtherProcess& operator=(const OtherProcess&) = delete;
    ~OtherProcess() {
        ::close(ask_);
        ::close(answer_);
        ::waitpid(process_, nullptr, 0);
    }
    void next() const {
        char byte = 'x';
        ASSERT_EQ(::write(ask_, &byte, 1), 1);
        ASSERT_EQ(::read(answer_, &byte, 1), 1);
    }

  private:
    pid_t process_ = -1;
    int ask_ = -1;
    int answer_ = -1;
};

std::string nameOf(int i) {
    return "file" + std::to_string(i);
}

TEST_P(RecorderTest, AnotherProcessesWritesAreReadAtOnce) {
    const OtherProcess other([&](int i) { writeFile(path(nameOf(i)), "x"); });
    open();
    const int rounds = 1'000 * stress();
    for (int i = 0; i < rounds; ++i) {
        other.next();
        ASSERT_TRUE(news().contains(nameOf(i))) << i;
    }
}

std::string chainOf(int i) {
    return "chain" + std::to_string(i) + "/1/2/3/4/5/6/7";
}

TEST_P(RecorderTest, AFileInADeepChainThatWasJustMadeIsReadAtOnce) {
    const OtherProcess other([&](int i) {
        makeFolder(path(chainOf(i)));
        writeFile(path(chainOf(i) + "/file"), "x");
    });
    open();
    const int rounds = 200 * stress();
    for (int i = 0; i < rounds; ++i) {
        other.next();
        ASSERT_TRUE(news().contains(chainOf(i) + "/file")) << i;
    }
}

// A listener that does not return keeps the recorder from reading the kernel's queue.
TEST_P(RecorderTest, AFullQueueLosesNothing) {
    begin();
    std::atomic<bool> isHeld = false;
    std::promise<void> release;
    const auto released = release.get_future().share();
    const auto listener = store().addListener([&isHeld, released](native::EventHistory::News) {
        if (!isHeld.exchange(true)) {
            released.wait();  // one that is broken ends the wait too
        }
    });
    writeFile(path("first"), "x");
    ASSERT_TRUE(waitUntil([&] { return isHeld.load(); }));
    makeFolder(path("storm"));
    // More different names than either kind's queue takes.
    const int files = following() == Following::fanotify ? 17'500 : 8'000;
    for (int i = 0; i < files; ++i) {
        const std::string file = path(nameOf(i));
        const int made = ::open(file.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0644);
        ASSERT_GE(made, 0);
        ::close(made);
        if (i % 10 != 0) {
            ASSERT_EQ(::unlink(file.c_str()), 0);
        } else if (i % 20 == 0) {
            ASSERT_EQ(::rename(file.c_str(), path("storm/" + nameOf(i)).c_str()), 0);
        }
    }
    release.set_value();
    ASSERT_TRUE(store().barrier());
    store().removeListener(listener);
    EXPECT_TRUE(store().report().recorder.lastOverflow);
    catchUp();
    expectWhole();
}

class StormTest : public RecorderTest {};

TEST_P(StormTest, FoldersThatAreRenamedWhileTheirContentsChange) {
    begin();
    makeFolder(path("A/deep"));
    makeFolder(path("other"));
    const int rounds = 200 * stress();
    for (int round = 0; round < 4 && !HasFailure(); ++round) {
        std::atomic<bool> isOver = false;
        std::thread renaming([&] {
            for (int i = 0; i < rounds / 4; ++i) {
                (void)::rename(path("A").c_str(), path("B").c_str());
                (void)::rename(path("B").c_str(), path("other/C").c_str());
                (void)::rename(path("other/C").c_str(), path("A").c_str());
            }
            isOver = true;
        });
        for (int i = 0; !isOver; ++i) {
            for (const char* folder : {"A/deep/", "B/deep/", "other/C/deep/"}) {
                std::ofstream(path(folder + nameOf(i % 50))) << i;
                (void)::unlink(path(folder + nameOf((i + 25) % 50)).c_str());
            }
        }
        renaming.join();
        ASSERT_TRUE(store().barrier());
        catchUp();
        expectWhole();
    }
}

TEST_P(StormTest, ExchangesLoseNoFolder) {
    begin();
    for (const char* folder : {"A", "B", "A/in", "B/in"}) {
        makeFolder(path(folder));
        writeFile(path(std::string(folder) + "/file"), folder);
    }
    ASSERT_TRUE(store().barrier());
    for (int round = 0; round < 4 && !HasFailure(); ++round) {
        std::thread first([&] {
            for (int i = 0; i < 500 * stress(); ++i) {
                exchange("A", "B");
                exchange("A/file", "B/file");
            }
        });
        for (int i = 0; i < 500 * stress(); ++i) {
            exchange("A/in", "B/in");
            exchange("A/in/file", "B/file");
        }
        first.join();
        ASSERT_TRUE(store().barrier());
        catchUp();
        expectWhole();
    }
}

TEST_P(RecorderTest, ARootThatIsAwayForAWhile) {
    begin();
    writeFile(path("before"), "x");
    ASSERT_TRUE(store().barrier());
    const std::string away = directory().path("away");
    std::filesystem::rename(root(), away);
    writeFile(away + "/meanwhile", "x");
    std::filesystem::remove(away + "/before");
    EXPECT_FALSE(store().barrier());
    std::filesystem::rename(away, root());
    ASSERT_TRUE(waitUntil([&] { return store().barrier().has_value(); }));
    catchUp();
    EXPECT_EQ(picture().differences(), std::vector<std::string>());
}

TEST_P(RecorderTest, ARootThatWasMadeAgainIsNotTakenForAnEmptiedTree) {
    writeFile(path("file"), "x");
    open();
    (void)news();
    const auto last = store().lastEventID();
    std::filesystem::rename(root(), directory().path("away"));
    makeFolder(root());
    writeFile(path("other"), "x");
    const auto barrier = store().barrier();
    ASSERT_FALSE(barrier);
    EXPECT_EQ(barrier.error().code, ESTALE);
    EXPECT_EQ(store().lastEventID(), last);
}

TEST_P(RecorderTest, ARootWhoseFileSystemIsUnmounted) {
    {
        const auto mounted = ScopedMount::memory(root());
        if (!mounted) {
            MARROWDALE_SKIP_FOR_USER("only root may mount");
        }
        writeFile(path("file"), "x");
        open();
        (void)news();
    }
    const auto last = store().lastEventID();
    EXPECT_FALSE(store().barrier());
    EXPECT_EQ(store().lastEventID(), last);
}

// Each document is told of once with its file, and its going is told before its number is another
// document's.
TEST_P(RecorderTest, NumbersOfFilesThatAreGivenAgain) {
    begin();
    startReader();
    std::map<std::uint64_t, std::string> documents;
    const int rounds = 5'000 * stress();
    for (int i = 0; i < rounds; ++i) {
        const std::string file = path(nameOf(i % 7));
        writeFile(file, std::to_string(i));
        if (i % 50 == 0) {
            const auto item = LocalItem::initWithURL(world().platform, URL::fileURL(file));
            ASSERT_TRUE(item && item->docID);
            const bool isNew = documents.emplace(*item->docID, file).second;
            ASSERT_TRUE(isNew) << *item->docID << " was " << documents[*item->docID];
        }
        ASSERT_EQ(::unlink(file.c_str()), 0);
    }
    for (const auto& [document, file] : documents) {
        const auto found = store().resolveDocumentID(
            DocumentID{static_cast<std::uint32_t>(document)}, store().device());
        EXPECT_FALSE(found) << document << " was " << file;
    }
    waitForReader();
    stopReader();
    expectWhole();
}

TEST_P(RecorderTest, BatchesThatEndEarlyLoseNothing) {
    makeFolder(path("folder"));
    const int files = 1'000;
    for (int i = 0; i < files; ++i) {
        writeFile(path("folder/" + nameOf(i)), "x");
    }
    begin();
    for (int i = 0; i < files; ++i) {
        const std::string file = path("folder/" + nameOf(i));
        if (i % 2 == 0) {
            ASSERT_EQ(::unlink(file.c_str()), 0);
        } else {
            writeFile(file + ".tmp", "second");
            ASSERT_EQ(::rename((file + ".tmp").c_str(), file.c_str()), 0);
        }
    }
    ASSERT_TRUE(store().barrier());
    // The reader is stopped within every seventh call.
    std::atomic<int> calls = 0;
    std::atomic<bool> isStopped = false;
    while (picture().historiesDone() == 0) {
        calls = 0;
        isStopped = false;
        picture().setWithin([&] {
            if (++calls == 7) {
                reader().stop();
                isStopped = true;
            }
        });
        startReader();
        ASSERT_TRUE(waitUntil([&] { return isStopped || picture().historiesDone() > 0; }));
        const EventID before = since();
        stopReader();
        ASSERT_TRUE(since() > before || picture().historiesDone() > 0);
    }
    picture().setWithin({});
    expectWhole();
}

// What runs out of marks lowers the limit in a user namespace of its own, in a process of its own.
TEST_P(RecorderTest, WithoutMarksFoldersAreListedAgain) {
    MARROWDALE_SKIP_UNDER_SANITIZER(
        "its background thread makes unshare(CLONE_NEWUSER), which takes a process of one thread, "
        "fail with EINVAL");
    const pid_t child = ::fork();
    if (child == 0) {
        const char* name =
            following() == Following::fanotify ? "max_fanotify_marks" : "max_inotify_watches";
        if (::unshare(CLONE_NEWUSER) != 0) {
            ::_exit(77);
        }
        {
            std::ofstream limit(std::string("/proc/sys/user/") + name);
            limit << 3 << std::flush;
            if (!limit.good()) {
                ::_exit(77);
            }
        }
        for (int i = 0; i < 8; ++i) {
            makeFolder(path("folder" + std::to_string(i) + "/below"));
        }
        begin();
        const bool isTold = store().report().recorder.unwatchedFolders > 0;
        for (int i = 0; i < 20 && !HasFailure(); ++i) {
            const std::string folder = "folder" + std::to_string(i % 8);
            writeFile(path(folder + "/below/" + nameOf(i)), "x");
            if (i % 5 == 4) {
                std::filesystem::rename(path(folder), path("folder" + std::to_string((i + 4) % 8) +
                                                           "/in" + std::to_string(i)));
                makeFolder(path(folder + "/below"));
            }
            if (!store().barrier()) {
                ::_exit(2);
            }
            catchUp();
            expectWhole();
        }
        ::_exit(!isTold ? 3 : HasFailure() ? 4 : 0);
    }
    int end = 0;
    ::waitpid(child, &end, 0);
    if (WIFEXITED(end) && WEXITSTATUS(end) == 77) {
        MARROWDALE_SKIP("a user namespace with limits of its own");
    }
    EXPECT_TRUE(WIFEXITED(end)) << WTERMSIG(end);
    EXPECT_EQ(WEXITSTATUS(end), 0);
}

INSTANTIATE_TEST_SUITE_P(OnEach, RecorderTest, followedBy(byListening), historyParameterName);
INSTANTIATE_TEST_SUITE_P(OnEach, StormTest, followedBy(byListening), historyParameterName);

}  // namespace
}  // namespace marrowdale::tests
