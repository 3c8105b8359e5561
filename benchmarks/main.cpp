// Measures this program against the bare system calls and against other programs, and prints the
// table. To be started through benchmarks/run.

#include <exception>
#include <iostream>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "benchmarks/Suite.h"

namespace {

using namespace marrowdale::benchmarks;  // NOLINT(google-build-using-namespace)

int run(const std::vector<std::string>& arguments) {
    if (const auto what = arguments.empty() ? std::nullopt : memoryArgument(arguments[0]);
        what && arguments.size() == 3) {
        printMemory(arguments[1], arguments[2], *what);
        return 0;
    }
    const bool quick = arguments.size() == 2 && arguments[1] == "--quick";
    if (arguments.empty() || (arguments.size() > 1 && !quick)) {
        std::cerr << "usage: marrowdale_benchmarks FOLDER [--quick]\n";
        return 2;
    }
    Suite suite{.folder = arguments[0],
                .sizes = quick ? Sizes::quick() : Sizes::full(),
                .table = Table(quick ? Table::Targets::leftOut : Table::Targets::shown)};
    const std::vector<std::pair<const char*, void (*)(Suite&)>> parts{
        {"listings", compareListings},
        {"paging", comparePaging},
        {"look-ups", compareLookUps},
        {"reconcile", compareReconcile},
        {"memory", compareMemory},
        {"recording", compareRecording},
        {"replays", compareReplays},
        {"the store's size", compareStoreSize},
        {"applications", compareApplications},
        {"watchman", compareWatchman}};
    for (const auto& [name, compare] : parts) {
        std::cerr << "measuring " << name << '\n';
        compare(suite);
    }
    suite.table.print(std::cout);
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    try {
        const std::span all(argv, static_cast<std::size_t>(argc));
        return run({all.begin() + 1, all.end()});
    } catch (const std::exception& error) {
        std::cerr << error.what() << '\n';
        return 1;
    }
}
