#include "tests/powerloss/TreeState.h"

#include <fcntl.h>
#include <filesystem>
#include <system_error>

#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::tests {

Tree treeBelow(const std::string& root) {
    Tree tree;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(root)) {
        const std::string& path = entry.path().native();
        const auto status = native::statEntry(AT_FDCWD, path.c_str());
        if (!status) {
            throw std::system_error(status.error().code, std::generic_category(), path);
        }
        EntryState state{{status->fileID, status->birth}, status->mode, 0, {}, true};
        if (!status->isDirectory()) {
            state.size = status->size;
            state.changed = status->changed;
            state.isFolder = false;
        }
        tree.emplace(path.substr(root.size() + 1), state);
    }
    return tree;
}

std::string describe(const EntryState& state) {
    return (state.isFolder ? "folder " : "file ") + std::to_string(raw(state.key.file)) + " born " +
           state.key.birth.rfc3339() + ", " + std::to_string(state.size) + " bytes, changed " +
           state.changed.rfc3339();
}

}  // namespace marrowdale::tests
