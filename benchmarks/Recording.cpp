#include <algorithm>
#include <atomic>
#include <cctype>
#include <cerrno>
#include <ctime>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <poll.h>
#include <stdexcept>
#include <string>
#include <sys/eventfd.h>
#include <system_error>
#include <thread>
#include <unistd.h>
#include <vector>

#include <fmt/format.h>

#include "benchmarks/EventFloor.h"
#include "benchmarks/History.h"
#include "benchmarks/Suite.h"

namespace marrowdale::benchmarks {
namespace {

namespace fs = std::filesystem;

// What the recorder waits for more before it works.
constexpr std::chrono::milliseconds coalescingPause{3};
constexpr std::uint64_t filesOfOneBatch = 1000;

[[noreturn]] void fail(const std::string& operation) {
    throw std::system_error(errno, std::generic_category(), operation);
}

Duration clockOf(clockid_t clock) {
    timespec now{};
    ::clock_gettime(clock, &now);
    return std::chrono::seconds(now.tv_sec) + std::chrono::nanoseconds(now.tv_nsec);
}
Duration processorTime() {
    return clockOf(CLOCK_PROCESS_CPUTIME_ID);
}
Duration processorTimeOfThread() {
    return clockOf(CLOCK_THREAD_CPUTIME_ID);
}

// Processor time, because the recorder works while others make the changes: all that the process
// used but for the making. Both look at the same batches, the floor when the store has come to
// rest.
class RecordingCost {
  public:
    explicit RecordingCost(const Suite& suite)
        : tree_(suite.largeTree()),
          batches_(suite.sizes.batches),
          store_(openLiveStore(tree_.path, Suite::stateFolder(tree_))),
          floor_(tree_.path) {}

    void runRound() {
        ours_ = floorTook_ = {};
        events_ = floorEvents_ = 0;
        for (std::uint64_t batch = 0; batch < batches_; ++batch) {
            runBatch();
        }
    }
    [[nodiscard]] Duration ours() const { return ours_ / static_cast<double>(events_); }
    [[nodiscard]] Duration floorTook() const {
        return floorTook_ / static_cast<double>(floorEvents_);
    }

  private:
    void runBatch() {
        const auto paths = randomFiles(tree_, filesOfOneBatch, ++round_);
        const EventID before = recorded(*store_);
        (void)floor_.drain();
        const Duration start = processorTime();
        const Duration making = processorTimeOfThread();
        for (const std::string& path : paths) {
            touch(path);
        }
        const Duration made = processorTimeOfThread();
        const EventID after = recorded(*store_);
        ours_ += processorTime() - start - (made - making);
        events_ += raw(after) - raw(before);

        const Duration reading = processorTimeOfThread();
        floorEvents_ += floor_.record().events;
        floorTook_ += processorTimeOfThread() - reading;
        if (raw(after) - raw(before) < paths.size()) {
            throw std::runtime_error("changes were not recorded");
        }
    }

    Tree tree_;
    std::uint64_t batches_;
    std::unique_ptr<native::Store> store_;
    EventFloor floor_;
    std::uint64_t round_ = 0;
    std::uint64_t events_ = 0;
    std::uint64_t floorEvents_ = 0;
    Duration ours_{};
    Duration floorTook_{};
};

void compareCost(Suite& suite) {
    RecordingCost cost(suite);
    cost.runRound();  // what is read for the first time
    Contest contest;
    contest.add("ours", [&] {
        cost.runRound();
        return cost.ours();
    });
    contest.add("floor", [&] { return cost.floorTook(); });
    contest.run(suite.sizes.rounds);
    suite.table.add(
        {.what = fmt::format("an event, processor time, batches of {} random files among {}, "
                             "against drain, parse, one statx a name, bare log with fdatasync",
                             filesOfOneBatch, suite.largeTree().files),
         .measured = each(contest.median("ours").count(), 1),
         .against = each(contest.median("floor").count(), 1),
         .ratio = contest.ratio("ours", "floor"),
         .target = 1.5});
}

// Reads a group on a thread of its own until it goes.
class FloorReader {
  public:
    using Take = std::function<void(EventFloor&)>;
    // `pause`: before each reading, for more to come together.
    FloorReader(const std::string& folder, std::chrono::milliseconds pause, Take take)
        : floor_(folder), pause_(pause), take_(std::move(take)), stop_(::eventfd(0, EFD_CLOEXEC)) {
        if (!stop_) {
            fail("eventfd");
        }
        thread_ = std::thread([this] { serve(); });
    }
    ~FloorReader() {
        ::eventfd_write(stop_.get(), 1);
        thread_.join();
    }
    FloorReader(const FloorReader&) = delete;
    FloorReader& operator=(const FloorReader&) = delete;

  private:
    void serve() {
        std::array<pollfd, 2> waits{{{floor_.descriptor(), POLLIN, 0}, {stop_.get(), POLLIN, 0}}};
        while (::poll(waits.data(), waits.size(), -1) >= 0 && waits[1].revents == 0) {
            if (pause_.count() > 0) {
                ::poll(&waits[1], 1, static_cast<int>(pause_.count()));
            }
            take_(floor_);
        }
        take_(floor_);
    }

    EventFloor floor_;
    const std::chrono::milliseconds pause_;
    const Take take_;
    native::UniqueFD stop_;
    std::thread thread_;
};

void writeTo(const std::string& path, int flags) {
    const native::UniqueFD file(::open(path.c_str(), O_WRONLY | O_CLOEXEC | flags, 0644));
    if (!file || ::write(file.get(), "x", 1) != 1) {
        fail(path);
    }
}

// Files come, are written anew, are renamed and go, as fast as one thread can.
void storm(const std::string& folder, std::uint64_t files) {
    const auto path = [&](std::uint64_t file, const char* suffix) {
        return fmt::format("{}/{}/storm {:06}{}", folder, file % 16, file, suffix);
    };
    for (std::uint64_t file = 0; file < files; ++file) {
        writeTo(path(file, ""), O_CREAT);
    }
    for (std::uint64_t file = 0; file < files; ++file) {
        writeTo(path(file, ""), O_TRUNC);
    }
    for (std::uint64_t file = 0; file < files; ++file) {
        fs::rename(path(file, ""), path(file, " renamed"));
    }
    for (std::uint64_t file = 0; file < files; ++file) {
        fs::remove(path(file, " renamed"));
    }
}

void compareStorms(Suite& suite) {
    const std::string folder = suite.folder + "/storms";
    for (int number = 0; number < 16; ++number) {
        fs::create_directories(fmt::format("{}/{}", folder, number));
    }
    std::uint64_t ours = 0;
    std::uint64_t floor = 0;
    for (int round = 0; round < suite.sizes.rounds; ++round) {
        {
            const auto store = openLiveStore(folder, folder + ".state");
            storm(folder, suite.sizes.stormFiles);
            (void)recorded(*store);
            ours += store->report().recorder.watcher->overflows;
        }
        const FloorReader reader(folder, std::chrono::milliseconds(0),
                                 [&](EventFloor& group) { floor += group.drain().overflows; });
        storm(folder, suite.sizes.stormFiles);
    }
    const double ratio = ours == floor ? 1.0
                                       : static_cast<double>(ours) /
                                             static_cast<double>(std::max<std::uint64_t>(1, floor));
    suite.table.add(
        {.what = fmt::format("queue overflows in {} storms of {} creates, rewrites, renames and "
                             "deletes each, against a reader that only drains",
                             suite.sizes.rounds, suite.sizes.stormFiles),
         .measured = fmt::format("{}", ours),
         .against = fmt::format("{}", floor),
         .ratio = ratio,
         .target = 1.0});
}

// How often the other threads of this process went to sleep: once for each time that they woke.
std::uint64_t switchesOfOthers() {
    const std::string own = std::to_string(::gettid());
    std::uint64_t sum = 0;
    for (const auto& task : fs::directory_iterator("/proc/self/task")) {
        if (task.path().filename() == own) {
            continue;
        }
        std::ifstream status(task.path() / "status");
        constexpr std::string_view key = "voluntary_ctxt_switches:";
        for (std::string line; std::getline(status, line);) {
            if (line.starts_with(key)) {
                sum += std::stoull(line.substr(key.size()));
            }
        }
    }
    return sum;
}

void compareIdle(Suite& suite) {
    constexpr std::chrono::seconds quiet{5};
    const Tree tree = suite.nestedTree(false);
    const auto store = openLiveStore(tree.path, Suite::stateFolder(tree));
    native::LinuxFileEvents events(*store);
    CountingStream stream(events, tree.path, recorded(*store));
    stream.waitForHistory();
    touch(filePath(tree, 0));
    stream.waitForEvents(1);
    // What the change started comes to its end.
    std::this_thread::sleep_for(std::chrono::milliseconds(500));
    const std::uint64_t before = switchesOfOthers();
    std::this_thread::sleep_for(quiet);
    const auto woken = static_cast<double>(switchesOfOthers() - before);
    suite.table.add({.what = fmt::format("wake-ups in {} s in which nothing happens, a store that "
                                         "records and a stream",
                                         quiet.count()),
                     .measured = fmt::format("{:.0f}", woken),
                     .against = "none",
                     .ratio = woken,
                     .target = 0.0});
}

void compareDelay(Suite& suite) {
    const Tree tree = suite.nestedTree(false);
    Contest contest;
    contest.add("ours", [&] {
        const auto store = openLiveStore(tree.path, Suite::stateFolder(tree));
        native::LinuxFileEvents events(*store);
        CountingStream stream(events, tree.path, recorded(*store));
        stream.waitForHistory();
        std::uint64_t count = 0;
        return medianDelay(tree, suite.sizes.delays,
                           [&](const std::string& /*path*/) { stream.waitForEvents(++count); });
    });
    contest.add("floor", [&] {
        std::atomic<std::uint64_t> seen = 0;
        const FloorReader reader(tree.path, coalescingPause, [&](EventFloor& group) {
            seen += group.drain().events;
            seen.notify_all();
        });
        std::uint64_t count = 0;
        return medianDelay(tree, suite.sizes.delays, [&](const std::string& /*path*/) {
            ++count;
            for (std::uint64_t now = seen; now < count; now = seen) {
                seen.wait(now);
            }
        });
    });
    contest.run(suite.sizes.rounds);
    suite.table.add(
        {.what = fmt::format("from a change to the stream's callback, latency 0, median of {}, "
                             "against a bare reader that pauses as long ({} ms)",
                             suite.sizes.delays, coalescingPause.count()),
         .measured = inWords(contest.median("ours").count()),
         .against = inWords(contest.median("floor").count()),
         .ratio = contest.ratio("ours", "floor"),
         .target = 3.0});
}

}  // namespace

void compareRecording(Suite& suite) {
    makeTree(suite.largeTree());
    makeTree(suite.nestedTree(false));
    suite.table.heading("Recording what happens");
    compareCost(suite);
    compareStorms(suite);
    compareDelay(suite);
    compareIdle(suite);
}

}  // namespace marrowdale::benchmarks
