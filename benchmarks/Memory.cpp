#include <array>
#include <fstream>
#include <iostream>
#include <sstream>
#include <stdexcept>

#include <fmt/format.h>

#include "benchmarks/Peer.h"
#include "benchmarks/Suite.h"
#include "benchmarks/World.h"

namespace marrowdale::benchmarks {
namespace {

// A line of /proc/self/status, in bytes.
std::uint64_t memory(const std::string& key) {
    std::ifstream status("/proc/self/status");
    for (std::string line; std::getline(status, line);) {
        if (line.starts_with(key + ":")) {
            return std::stoull(line.substr(key.size() + 1)) * 1024;
        }
    }
    throw std::runtime_error("no " + key);
}

void forgetPeak() {
    std::ofstream("/proc/self/clear_refs") << 5;  // sets VmHWM to VmRSS
}

struct MemoryUse {
    double before = 0;   // an empty process
    double opened = 0;   // with the index in memory
    double peak = 0;     // most, from then on
    double entries = 0;  // in the index
};

MemoryUse measure(const Tree& tree, bool listing) {
    const auto lines = outputOf({"/proc/self/exe", listing ? "--memory-of-listing" : "--memory",
                                 tree.path, Suite::stateFolder(tree)});
    MemoryUse use;
    std::istringstream(lines.at(0)) >> use.before >> use.opened >> use.peak >> use.entries;
    return use;
}

std::string megabytes(double bytes) {
    return fmt::format("{:.1f} MB", bytes / 1e6);
}

}  // namespace

void printMemory(const std::string& root, const std::string& state, bool listing) {
    const std::uint64_t before = memory("VmRSS");
    World world(root, state);
    const std::uint64_t opened = memory("VmRSS");
    forgetPeak();
    if (listing) {
        listPages(world, containerOf(false));
    }
    std::cout << before << ' ' << opened << ' ' << memory("VmHWM") << ' '
              << world.store().report().entries << '\n';
}

void compareMemory(Suite& suite) {
    const Tree small = suite.nestedTree(false);
    const Tree large = suite.largeTree();
    makeTree(small);
    makeTree(large);
    // Once before, so that every file has its identifier and the stores are what they will be.
    (void)measure(small, true);
    (void)measure(large, true);
    const MemoryUse index = measure(large, false);
    const MemoryUse smallListing = measure(small, true);
    const MemoryUse largeListing = measure(large, true);

    suite.table.heading("Memory, resident");
    suite.table.add(
        {.what = "an indexed entry, against 100 bytes",
         .measured = fmt::format("{:.0f} B", (index.opened - index.before) / index.entries),
         .against = "100 B",
         .ratio = (index.opened - index.before) / index.entries / 100,
         .target = 1.0});
    const double perEntry =
        (largeListing.peak - largeListing.opened) - (smallListing.peak - smallListing.opened);
    suite.table.add({.what = fmt::format("what listing {} files adds, against listing {}",
                                         large.files, small.files),
                     .measured = megabytes(largeListing.peak - largeListing.opened),
                     .against = megabytes(smallListing.peak - smallListing.opened),
                     .ratio = (largeListing.peak - largeListing.opened) /
                              std::max(1.0, smallListing.peak - smallListing.opened),
                     .target = {}});
    suite.table.add({.what = "the difference, an entry more that is listed",
                     .measured = fmt::format(
                         "{:.1f} B", perEntry / static_cast<double>(large.files - small.files)),
                     .against = "100 B",
                     .ratio = perEntry / static_cast<double>(large.files - small.files) / 100,
                     .target = {}});
}

}  // namespace marrowdale::benchmarks
