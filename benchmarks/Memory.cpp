#include <array>
#include <fstream>
#include <iostream>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <string_view>

#include <fmt/format.h>

#include "benchmarks/History.h"
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

constexpr std::array<const char*, 3> arguments{"--memory-of-index", "--memory-of-listing",
                                               "--memory-of-recording"};

MemoryUse measure(const Tree& tree, MemoryOf what) {
    const auto lines = outputOf({"/proc/self/exe", arguments.at(static_cast<std::size_t>(what)),
                                 tree.path, Suite::stateFolder(tree)});
    MemoryUse use;
    std::istringstream(lines.at(0)) >> use.before >> use.opened >> use.peak >> use.entries;
    return use;
}

std::string megabytes(double bytes) {
    return fmt::format("{:.1f} MB", bytes / 1e6);
}

}  // namespace

std::optional<MemoryOf> memoryArgument(std::string_view argument) {
    for (const MemoryOf what : {MemoryOf::index, MemoryOf::listing, MemoryOf::recording}) {
        if (argument == arguments.at(static_cast<std::size_t>(what))) {
            return what;
        }
    }
    return std::nullopt;
}

namespace {

void printMemoryOfRecording(const std::string& root, const std::string& state) {
    const std::uint64_t before = memory("VmRSS");
    const auto store = openLiveStore(root, state);
    native::LinuxFileEvents events(*store);
    CountingStream stream(events, root, recorded(*store));
    stream.waitForHistory();
    std::cout << before << ' ' << memory("VmRSS") << ' ' << memory("VmHWM") << ' '
              << store->report().entries << '\n';
}

}  // namespace

void printMemory(const std::string& root, const std::string& state, MemoryOf what) {
    if (what == MemoryOf::recording) {
        printMemoryOfRecording(root, state);
        return;
    }
    const std::uint64_t before = memory("VmRSS");
    World world(root, state);
    const std::uint64_t opened = memory("VmRSS");
    forgetPeak();
    if (what == MemoryOf::listing) {
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
    (void)measure(small, MemoryOf::listing);
    (void)measure(large, MemoryOf::listing);
    const MemoryUse index = measure(large, MemoryOf::index);
    const MemoryUse smallListing = measure(small, MemoryOf::listing);
    const MemoryUse largeListing = measure(large, MemoryOf::listing);

    suite.table.heading("Memory, resident");
    suite.table.add(
        {.what = "an indexed entry, against 100 bytes",
         .measured = fmt::format("{:.0f} B", (index.opened - index.before) / index.entries),
         .against = "100 B",
         .ratio = (index.opened - index.before) / index.entries / 100,
         .target = 1.0});
    const MemoryUse recording = measure(large, MemoryOf::recording);
    const Tree empty{suite.folder + "/empty", 0, 0, false};
    makeTree(empty);
    const MemoryUse nothing = measure(empty, MemoryOf::recording);
    const double recordedEntry = (recording.opened - nothing.opened) / recording.entries;
    suite.table.add({.what = "an entry of a store that records, its folders watched",
                     .measured = fmt::format("{:.0f} B", recordedEntry),
                     .against = "100 B",
                     .ratio = recordedEntry / 100,
                     .target = 1.0});
    constexpr double allowed = 32 * 1024 * 1024;
    suite.table.add({.what = "the rest: a store that records an empty folder, whole process",
                     .measured = megabytes(nothing.opened),
                     .against = megabytes(allowed),
                     .ratio = nothing.opened / allowed,
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
