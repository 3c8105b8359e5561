#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "benchmarks/Table.h"
#include "benchmarks/Trees.h"

namespace marrowdale::benchmarks {

// What every part of a run shares.
struct Suite {
    std::string folder;  // trees and state folders lie below it, on one file system
    Sizes sizes;
    Table table;
    // On a file system whose files can share blocks; none where there is none.
    std::optional<std::string> copyingFolder = std::nullopt;

    [[nodiscard]] Tree nestedTree(bool hasAttributes) const {
        return {folder + (hasAttributes ? "/nested-attributes" : "/nested"), sizes.folders,
                sizes.files, hasAttributes};
    }
    [[nodiscard]] Tree flatTree(bool hasAttributes) const {
        return {folder + (hasAttributes ? "/flat-attributes" : "/flat"), 0, sizes.files,
                hasAttributes};
    }
    [[nodiscard]] Tree largeTree() const {
        return {folder + "/large", sizes.manyFolders, sizes.manyFiles, false};
    }
    [[nodiscard]] Tree longNamedTree() const {
        Tree tree{folder + "/long-names", sizes.folders, sizes.files, false};
        tree.hasLongNames = true;
        return tree;
    }
    // Where the store of a tree's world lies; beside it, so that both are on one disk.
    [[nodiscard]] static std::string stateFolder(const Tree& tree) { return tree.path + ".state"; }
};

// The parts. Each makes the trees it needs, measures and adds its rows.
void compareListings(Suite& suite);
void comparePaging(Suite& suite);
void compareLookUps(Suite& suite);
void compareReconcile(Suite& suite);
void compareMemory(Suite& suite);
void compareRecording(Suite& suite);
void compareReplays(Suite& suite);
void compareStoreSize(Suite& suite);
void compareApplications(Suite& suite);
void compareWatchman(Suite& suite);
void compareImports(Suite& suite);
void compareChanges(Suite& suite);
void compareItemActions(Suite& suite);

enum class MemoryOf { index, listing, recording };
[[nodiscard]] std::optional<MemoryOf> memoryArgument(std::string_view argument);
// For compareMemory, which measures in fresh processes: runs as one of them, and prints one line
// "before after peak entries".
void printMemory(const std::string& root, const std::string& state, MemoryOf what);

}  // namespace marrowdale::benchmarks
