#include "platform/linux/operations/OpenFolders.h"

#include <cerrno>
#include <fcntl.h>
#include <utility>

namespace marrowdale::native {

Expected<void> OpenFolders::begin(UniqueFD top) {
    return push(std::move(top), {});
}

Expected<void> OpenFolders::enter(const std::string& name) {
    auto folder = openFolderBeneath(current(), name);
    return folder ? push(std::move(*folder), name) : Unexpected(folder.error());
}

Expected<OpenFolders::Level> OpenFolders::leave() {
    Entry left = std::move(levels_.back());
    levels_.pop_back();
    if (!levels_.back().reader) {
        if (const auto opened = reopenLast(left.reader->descriptor()); !opened) {
            return Unexpected(opened.error());
        }
    }
    return Level{std::move(left.name), left.status, std::move(*left.reader)};
}

std::string OpenFolders::path() const {
    std::string path;
    for (const Entry& level : levels_) {
        if (!path.empty()) {
            path += '/';
        }
        path += level.name;
    }
    return path;
}

Expected<void> OpenFolders::push(UniqueFD folder, std::string name) {
    const auto status = statEntry(folder.get(), "");
    if (!status) {
        return Unexpected(status.error());
    }
    levels_.push_back({std::move(name), *status, 0, readerOf(std::move(folder))});
    if (levels_.size() > openLevels) {
        levels_[levels_.size() - openLevels - 1].reader.reset();
    }
    return {};
}

// ".." of a folder that was moved meanwhile is another one.
Expected<void> OpenFolders::reopenLast(int folderIn) {
    Entry& level = levels_.back();
    UniqueFD folder(
        ::openat(folderIn, "..", O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    if (!folder) {
        return Unexpected(errorWithPOSIXCode(errno, "go back to the folder", level.name));
    }
    const auto status = statEntry(folder.get(), "");
    if (!status || status->fileID != level.status.fileID || status->device != level.status.device) {
        return Unexpected(errorWithPOSIXCode(ESTALE, "go back to the folder", level.name));
    }
    level.reader.emplace(readerOf(std::move(folder)));
    return level.reader->seek(level.position);
}

DirectoryReader OpenFolders::readerOf(UniqueFD folder) const {
    return {std::move(folder), bufferBytes_, largestBufferBytes_};
}

}  // namespace marrowdale::native
