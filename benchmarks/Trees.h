#pragma once

#include <cstdint>
#include <string>

namespace marrowdale::benchmarks {

// A folder of empty files to list. Made once and used again by later runs.
struct Tree {
    std::string path;
    std::uint64_t folders = 0;  // below `path`; 0: the files lie in it directly
    std::uint64_t files = 0;
    bool hasAttributes = false;  // three a file: last-used date, tags, favourite rank
    bool hasLongNames = false;   // paths of 85 bytes below `path`
    [[nodiscard]] std::uint64_t entries() const { return folders + files; }
};

// The sizes of a run.
struct Sizes {
    std::uint64_t folders;
    std::uint64_t files;
    std::uint64_t manyFolders;
    std::uint64_t manyFiles;
    std::uint64_t lookUps;  // identifiers that are looked up
    int rounds;
    std::uint64_t batches;     // of changes, a round
    std::uint64_t stormFiles;  // each is made, written, renamed and removed
    std::uint64_t delays;      // changes that are waited for
    std::uint64_t manyEvents;  // in a long history
    std::uint64_t fewEvents;   // in a short one
    std::uint64_t replayed;
    std::uint64_t importBytes;
    std::uint64_t smallFiles;  // imported at once
    std::uint64_t actedOn;     // items, one after the other
    static constexpr Sizes full() {
        return {1'000, 100'000,    10'000, 1'000'000, 20'000,      3,      10,   50'000,
                200,   10'000'000, 10'000, 1'000'000, 1ULL << 30U, 10'000, 1'000};
    }
    static constexpr Sizes quick() {
        return {20, 1'000,     50,     5'000,   500,          1,   2, 5'000,
                20, 1'000'000, 10'000, 100'000, 16ULL << 20U, 200, 50};
    }
};

// Makes the tree where it is not there already in full. Throws std::system_error.
void makeTree(const Tree& tree);

// The path of the file with that number, counted from 0.
[[nodiscard]] std::string filePath(const Tree& tree, std::uint64_t number);

}  // namespace marrowdale::benchmarks
