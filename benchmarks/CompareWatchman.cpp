#include <algorithm>
#include <exception>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <string>

#include <fmt/format.h>

#include "benchmarks/History.h"
#include "benchmarks/Peer.h"
#include "benchmarks/Suite.h"
#include "benchmarks/Watchman.h"
#include "benchmarks/World.h"

namespace marrowdale::benchmarks {
namespace {

// So that no queue of the kernel overflows before its reader comes.
constexpr std::uint64_t changesAtOnce = 5000;

// What one program took, in one turn.
struct Turn {
    Duration crawl{};
    Duration sinceFew{};
    Duration sinceMany{};
    Duration delay{};
};

void change(const Tree& tree, std::uint64_t count, std::uint64_t choice,
            const std::function<void()>& settle) {
    std::uint64_t made = 0;
    for (const std::string& path : randomFiles(tree, count, choice)) {
        touch(path);
        if (++made % changesAtOnce == 0) {
            settle();
        }
    }
    settle();
}

class Rivals {
  public:
    explicit Rivals(const Suite& suite)
        : tree_(suite.nestedTree(false)),
          few_(std::min<std::uint64_t>(1'000, tree_.files)),
          many_(std::min<std::uint64_t>(10'000, tree_.files)),
          delays_(suite.sizes.delays / 4) {}

    [[nodiscard]] std::uint64_t few() const { return few_; }
    [[nodiscard]] std::uint64_t many() const { return many_; }

    [[nodiscard]] Turn ours() {
        const std::string state = Suite::stateFolder(tree_);
        forgetState(state);
        Turn turn;
        std::unique_ptr<native::Store> store;
        turn.crawl = timed([&] { store = openLiveStore(tree_.path, state); });
        native::LinuxFileEvents events(*store);
        const auto since = [&](std::uint64_t count) {
            const EventID before = recorded(*store);
            change(tree_, count, ++choice_, [&] { (void)recorded(*store); });
            return timed([&] {
                CountingStream stream(events, tree_.path, before);
                stream.waitForHistory();
                if (stream.events() < count) {
                    throw std::runtime_error("changes were not recorded");
                }
            });
        };
        turn.sinceFew = since(few_);
        turn.sinceMany = since(many_);
        CountingStream stream(events, tree_.path, recorded(*store));
        stream.waitForHistory();
        std::uint64_t count = 0;
        turn.delay = medianDelay(
            tree_, delays_, [&](const std::string& /*path*/) { stream.waitForEvents(++count); });
        return turn;
    }

    [[nodiscard]] Turn theirs() {
        Watchman watchman;
        const double before = watchman.memory();
        Turn turn;
        turn.crawl = timed([&] { watchman.watch(tree_.path); });
        memory_ = (watchman.memory() - before) / static_cast<double>(tree_.entries());
        const auto since = [&](std::uint64_t count) {
            const std::string clock = watchman.clock(tree_.path);
            change(tree_, count, ++choice_, [&] { (void)watchman.clock(tree_.path); });
            return timed([&] { (void)watchman.since(tree_.path, clock); });
        };
        turn.sinceFew = since(few_);
        turn.sinceMany = since(many_);
        watchman.subscribe(tree_.path);
        turn.delay = medianDelay(tree_, delays_, [&](const std::string& path) {
            watchman.waitForChange(std::filesystem::path(path).filename());
        });
        watchman.unsubscribe(tree_.path);
        watchman.forget(tree_.path);
        return turn;
    }

    // Of watchman, an entry, in the last turn.
    [[nodiscard]] double memory() const { return memory_; }

  private:
    Tree tree_;
    std::uint64_t few_;
    std::uint64_t many_;
    std::uint64_t delays_;
    std::uint64_t choice_ = 1000;
    double memory_ = 0;
};

// All of a fresh process that records.
double ourMemory(const Tree& tree) {
    const auto lines =
        outputOf({"/proc/self/exe", "--memory-of-recording", tree.path, Suite::stateFolder(tree)});
    double before = 0;
    double opened = 0;
    std::istringstream(lines.at(0)) >> before >> opened;
    return (opened - before) / static_cast<double>(tree.entries());
}

void compareTurns(Suite& suite) {
    Rivals rivals(suite);
    Turn ours;
    Turn theirs;
    Contest contest;
    contest.add("crawl", [&] {
        ours = rivals.ours();
        return ours.crawl;
    });
    contest.add("watchman crawl", [&] {
        theirs = rivals.theirs();
        return theirs.crawl;
    });
    contest.add("few", [&] { return ours.sinceFew; });
    contest.add("watchman few", [&] { return theirs.sinceFew; });
    contest.add("many", [&] { return ours.sinceMany; });
    contest.add("watchman many", [&] { return theirs.sinceMany; });
    contest.add("delay", [&] { return ours.delay; });
    contest.add("watchman delay", [&] { return theirs.delay; });
    contest.run(suite.sizes.rounds);

    const auto addRow = [&](const std::string& what, const std::string& name) {
        suite.table.add({.what = what,
                         .measured = inWords(contest.median(name).count()),
                         .against = inWords(contest.median("watchman " + name).count()),
                         .ratio = contest.ratio(name, "watchman " + name),
                         .target = {}});
    };
    const Tree tree = suite.nestedTree(false);
    suite.table.heading(fmt::format("Against watchman, {} files", tree.files));
    addRow("crawl: a first start, identifiers and index synced to disk", "crawl");
    addRow(fmt::format("what changed since, {} changes", rivals.few()), "few");
    addRow(fmt::format("what changed since, {} changes", rivals.many()), "many");
    addRow("from a change to the subscriber, each as it comes, median", "delay");
    const double memory = ourMemory(tree);
    suite.table.add({.what = "resident memory, an entry",
                     .measured = fmt::format("{:.0f} B", memory),
                     .against = fmt::format("{:.0f} B", rivals.memory()),
                     .ratio = memory / rivals.memory(),
                     .target = {}});
}

// A change of each of that many files against the replay of as many events.
void compareReplay(Suite& suite, const Tree& tree, std::uint64_t count) {
    const std::string root = suite.folder + "/history-long";
    const auto store = openLiveStore(root, root + ".state");
    native::LinuxFileEvents events(*store);
    const EventID last = recorded(*store);

    Watchman watchman;
    watchman.watch(tree.path);
    const std::string clock = watchman.clock(tree.path);
    change(tree, count, 1, [&] { (void)watchman.clock(tree.path); });
    Contest contest;
    contest.add("ours", [&] {
        return timed([&] {
            CountingStream stream(events, root, EventID{raw(last) - count});
            stream.waitForHistory();
        });
    });
    contest.add("watchman", [&] { return timed([&] { (void)watchman.since(tree.path, clock); }); });
    contest.run(suite.sizes.rounds);
    suite.table.add({.what = fmt::format("replay of {} events, against `since` for as many "
                                         "changed files",
                                         count),
                     .measured = inWords(contest.median("ours").count()),
                     .against = inWords(contest.median("watchman").count()),
                     .ratio = contest.ratio("ours", "watchman"),
                     .target = 0.1});
}

}  // namespace

void compareWatchman(Suite& suite) {
    if (!hasPeer("watchman")) {
        suite.table.note("against watchman: left out, because it is not installed");
        return;
    }
    makeTree(suite.nestedTree(false));
    makeTree(suite.largeTree());
    makeHistory(suite.folder + "/history-long", suite.folder + "/history-long.state",
                suite.sizes.manyEvents);
    try {
        compareTurns(suite);
        compareReplay(suite, suite.largeTree(),
                      std::min(suite.sizes.fewEvents, suite.largeTree().files));
        compareReplay(suite, suite.largeTree(),
                      std::min(suite.sizes.replayed, suite.largeTree().files));
    } catch (const std::exception& error) {
        suite.table.note(fmt::format("against watchman: the rest is left out: {}", error.what()));
    }
}

}  // namespace marrowdale::benchmarks
