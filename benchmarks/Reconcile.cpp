#include <memory>
#include <stdexcept>
#include <utility>
#include <vector>

#include "benchmarks/Floor.h"
#include "benchmarks/History.h"
#include "benchmarks/Measurement.h"
#include "benchmarks/Suite.h"
#include "benchmarks/World.h"

namespace marrowdale::benchmarks {

void compareReconcile(Suite& suite) {
    const Tree tree = suite.largeTree();
    const std::string state = Suite::stateFolder(tree);
    makeTree(tree);
    OpenedStore opened = openStore(tree.path, state);

    Contest contest;
    contest.add("floor", [&] {
        return timed([&] { (void)floorListing(tree.path, FloorCalls::statusOnly); });
    });
    contest.add("reconcile", [&] {
        return timed([&] {
            if (const auto done = opened.store->reconcile(); !done) {
                throw std::runtime_error(done.error().description());
            }
        });
    });
    contest.add("live start", [&] {
        opened.store.reset();
        std::unique_ptr<native::Store> live;
        return timed([&] { live = openLiveStore(tree.path, state); });
    });
    contest.add("load", [&] {
        opened.store.reset();
        opened = openStore(tree.path, state);
        return opened.loading;
    });
    contest.add("build", [&] {
        opened.store.reset();
        forgetState(state);
        Duration duration = timed([&] { opened = openStore(tree.path, state); });
        // The snapshot that a later start reads is written when the store is closed.
        opened.store.reset();
        opened = openStore(tree.path, state);
        return duration;
    });
    contest.run(suite.sizes.rounds);

    const auto addRow = [&](const std::string& what, const std::string& ours,
                            std::optional<double> target) {
        suite.table.add({.what = what,
                         .measured = inWords(contest.median(ours).count()),
                         .against = inWords(contest.median("floor").count()),
                         .ratio = contest.ratio(ours, "floor"),
                         .target = target});
    };
    suite.table.heading(std::to_string(tree.files) + " files in " + std::to_string(tree.folders) +
                        " folders, against getdents64 + statx");
    addRow("reconcile, nothing changed", "reconcile", 0.8);
    addRow("start of a store that records, whole: loaded, folders watched, nothing changed",
           "live start", 0.8);
    suite.table.note(
        "start, names and inode numbers alone (target 0.5): left out, because one walk lists and "
        "looks and its parts can't be told apart");
    addRow("start: snapshot and log's tail into memory", "load", 0.2);
    addRow("first start ever: index made, committed and synced", "build", {});
}

}  // namespace marrowdale::benchmarks
