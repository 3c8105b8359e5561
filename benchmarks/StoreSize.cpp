#include <fmt/format.h>

#include "benchmarks/History.h"
#include "benchmarks/Suite.h"
#include "benchmarks/World.h"

namespace marrowdale::benchmarks {
namespace {

constexpr double bytesAllowed = 150;

void addSize(Suite& suite, const std::string& what, double bytes) {
    suite.table.add({.what = what,
                     .measured = fmt::format("{:.0f} B", bytes),
                     .against = fmt::format("{:.0f} B", bytesAllowed),
                     .ratio = bytes / bytesAllowed,
                     .target = 1.0});
}

// What random changes add to the segments, the new state of each file that they touch included.
double bytesOfOneEvent(const Tree& tree, native::Store& store, std::uint64_t batches) {
    constexpr std::uint64_t filesOfOneBatch = 1000;
    const native::StoreReport before = store.report();
    for (std::uint64_t batch = 0; batch < batches; ++batch) {
        for (const std::string& path : randomFiles(tree, filesOfOneBatch, batch)) {
            touch(path);
        }
        (void)recorded(store);
    }
    const native::StoreReport after = store.report();
    return static_cast<double>(after.historyBytes - before.historyBytes) /
           static_cast<double>(raw(after.lastEventID) - raw(before.lastEventID));
}

}  // namespace

void compareStoreSize(Suite& suite) {
    const Tree tree = suite.longNamedTree();
    const std::string state = Suite::stateFolder(tree);
    makeTree(tree);
    forgetState(state);
    // A snapshot is written when the store is opened or closed with a long log.
    openLiveStore(tree.path, state).reset();
    const auto store = openLiveStore(tree.path, state);
    const native::StoreReport report = store->report();
    const std::uint64_t entryBytes =
        report.snapshotBytes != 0 ? report.snapshotBytes : report.logBytes;
    suite.table.heading("The store on disk, paths of 85 bytes, against 150 bytes");
    addSize(suite, "an entry",
            static_cast<double>(entryBytes) / static_cast<double>(report.entries));
    addSize(suite, "an event, batches of 1000 random files",
            bytesOfOneEvent(tree, *store, suite.sizes.batches));
}

}  // namespace marrowdale::benchmarks
