#pragma once

#include <functional>
#include <random>
#include <string>
#include <string_view>
#include <vector>

#include "tests/powerloss/TreeState.h"

namespace marrowdale::tests {

// Somebody who works in a tree: makes, changes, renames, moves and deletes files and folders, at
// random but reproducibly, and syncs some of it at times. One thread.
//
// Files named `save-…` are only ever saved by replacing them, so their documents stay with the
// name; a document of any other file stays with the file, for no other name is taken twice.
class TreeWriter {
  public:
    // `leaving` is called before a file is deleted or replaced.
    TreeWriter(std::string root, std::uint32_t seed, std::function<void(const FileKey&)> leaving);

    // Does one thing.
    void step();
    // Makes so many files at once that the store's log grows long, in place of those that the call
    // before made.
    void makeMany();

    [[nodiscard]] static bool isSaved(std::string_view path);

  private:
    [[nodiscard]] std::uint32_t below(std::size_t limit);
    [[nodiscard]] std::string newName(const char* prefix);
    [[nodiscard]] std::string contents();
    // Absolute paths; the root is a folder among them, saved files are no plain files. Empty when
    // there is none.
    [[nodiscard]] std::string anyFolder();
    [[nodiscard]] std::string anyPlainFile();
    [[nodiscard]] std::string anySubfolder();

    void make();
    void append();
    void overwrite();
    void changeMode();
    void moveFile();
    void deleteFile();
    void makeSubfolder();
    void moveFolder();
    void deleteFolder();
    void save();
    void syncFile();
    void syncAll() const;
    void remove(const std::string& folder);

    std::string root_;
    std::mt19937 random_;
    std::function<void(const FileKey&)> leaving_;
    int names_ = 0;
    std::string many_;  // the folder where they are; empty: none
};

}  // namespace marrowdale::tests
