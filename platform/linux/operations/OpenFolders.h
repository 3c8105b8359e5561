#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

// The folders from the top of a tree down to where work is being done, for trees of any depth: only
// the innermost few are open. One that was closed is opened again from the folder in it, and must
// be the folder that it was. Links are never followed, mounts never crossed. One thread.
class OpenFolders {
  public:
    struct Level {
        std::string name;    // in the folder above; empty for the top
        EntryStatus status;  // when it was entered
        DirectoryReader reader;
    };
    // How many folders are open at most.
    static constexpr std::size_t openLevels = 64;

    // Both sizes as DirectoryReader has them; the second 0 where nothing is read.
    OpenFolders(std::size_t bufferBytes, std::size_t largestBufferBytes)
        : bufferBytes_(bufferBytes), largestBufferBytes_(largestBufferBytes) {}

    // Errors here and below: POSIX; the subject is the name.
    [[nodiscard]] Expected<void> begin(UniqueFD top);
    // Goes down into a folder of the innermost one. ENOTDIR and ELOOP for what is none, EXDEV for a
    // mount.
    [[nodiscard]] Expected<void> enter(const std::string& name);
    // Goes up, and hands over the folder that was left. ESTALE when the folder above is another one
    // by now. Not to be called at the top.
    [[nodiscard]] Expected<Level> leave();

    [[nodiscard]] bool isAtTop() const { return levels_.size() == 1; }
    [[nodiscard]] DirectoryReader& reader() { return *levels_.back().reader; }
    [[nodiscard]] int current() const { return levels_.back().reader->descriptor(); }
    [[nodiscard]] const EntryStatus& status() const { return levels_.back().status; }
    // Remembers how far the innermost folder was read, for when it is opened again.
    void note(std::int64_t position) { levels_.back().position = position; }
    // The names from the top down, with "/" between them.
    [[nodiscard]] std::string path() const;

  private:
    struct Entry {
        std::string name;
        EntryStatus status;
        std::int64_t position = 0;
        std::optional<DirectoryReader> reader;  // none: closed
    };

    [[nodiscard]] Expected<void> push(UniqueFD folder, std::string name);
    [[nodiscard]] Expected<void> reopenLast(int folderIn);
    [[nodiscard]] DirectoryReader readerOf(UniqueFD folder) const;

    std::size_t bufferBytes_;
    std::size_t largestBufferBytes_;
    std::vector<Entry> levels_;
};

}  // namespace marrowdale::native
