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

struct Options {
    bool isQuick = false;
    std::optional<std::string> only;
    std::optional<std::string> copyingFolder;
};

// What follows the folder.
std::optional<Options> readOptions(const std::vector<std::string>& arguments) {
    if (arguments.empty()) {
        return std::nullopt;
    }
    Options options;
    for (std::size_t i = 1; i < arguments.size(); ++i) {
        const bool hasValue = i + 1 < arguments.size();
        if (arguments[i] == "--quick") {
            options.isQuick = true;
        } else if (arguments[i] == "--only" && hasValue) {
            options.only = arguments[++i];
        } else if (arguments[i] == "--copying-folder" && hasValue) {
            options.copyingFolder = arguments[++i];
        } else {
            return std::nullopt;
        }
    }
    return options;
}

int run(const std::vector<std::string>& arguments) {
    if (const auto what = arguments.empty() ? std::nullopt : memoryArgument(arguments[0]);
        what && arguments.size() == 3) {
        printMemory(arguments[1], arguments[2], *what);
        return 0;
    }
    const auto options = readOptions(arguments);
    if (!options) {
        std::cerr << "usage: marrowdale_benchmarks FOLDER [--quick] [--only PART] "
                     "[--copying-folder FOLDER]\n";
        return 2;
    }
    Suite suite{.folder = arguments[0],
                .sizes = options->isQuick ? Sizes::quick() : Sizes::full(),
                .table = Table(options->isQuick ? Table::Targets::leftOut : Table::Targets::shown),
                .copyingFolder = options->copyingFolder};
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
        {"imports", compareImports},
        {"actions", compareItemActions},
        {"changes", compareChanges},
        {"watchman", compareWatchman}};
    for (const auto& [name, compare] : parts) {
        if (options->only && *options->only != name) {
            continue;
        }
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
