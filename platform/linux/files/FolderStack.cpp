#include "platform/linux/files/FolderStack.h"

#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <utility>

namespace marrowdale::native {

namespace {

constexpr std::size_t firstBuffer = std::size_t{8} << 10U;
constexpr std::size_t largestBuffer = std::size_t{64} << 10U;

// Errors that say that the folder is not there any more: removed, moved, or something else now,
// another mount among them.
bool meansGone(int code) {
    return code == ENOENT || code == ENOTDIR || code == ELOOP || code == EXDEV || code == ESTALE;
}

}  // namespace

FolderStack::FolderStack(const URL& rootURL, UniqueFD root, const EntryStatus& rootStatus,
                         const ServedTrees& trees, ErrorHandler handler)
    : device_(rootStatus.device), trees_(trees), handler_(std::move(handler)) {
    Level& level = levels_.emplace_back();
    level.folder = rootStatus.fileID;
    level.url = rootURL;
    level.mount = mountOf(root.get());
    level.reader.emplace(std::move(root), firstBuffer, largestBuffer);
    level.reader->trackChanges();
}

Expected<void> FolderStack::restore(const DirectoryPosition& position) {
    if (position.atEnd) {
        levels_.clear();
        return {};
    }
    if (position.levels.empty()) {
        return {};
    }
    Level& root = levels_.front();
    if (position.levels.front().folder != root.folder) {
        return Unexpected(errorWithPOSIXCode(ESTALE, "go on in", root.url->path()));
    }
    root.offset = position.levels.front().offset;
    if (const auto sought = root.reader->seek(root.offset); !sought) {
        return sought;
    }
    for (std::size_t i = 1; i < position.levels.size(); ++i) {
        const DirectoryPosition::Level& saved = position.levels[i];
        push(saved.name, saved.folder, std::nullopt);
        levels_.back().offset = saved.offset;
    }
    return {};
}

bool FolderStack::takeUp(const EntryStatus& atRootPath, ErrorHandler handler) {
    if (levels_.empty()) {
        return false;
    }
    handler_ = std::move(handler);
    return atRootPath.fileID == levels_.front().folder && atRootPath.device == device_ &&
           std::ranges::all_of(levels_, [](const Level& level) {
               return !level.reader || level.reader->isUnchanged();
           });
}

DirectoryPosition FolderStack::position() const {
    DirectoryPosition position;
    position.atEnd = levels_.empty();
    position.levels.reserve(levels_.size());
    for (const Level& level : levels_) {
        position.levels.push_back({level.name, level.folder, level.offset});
    }
    return position;
}

Expected<void> FolderStack::openTop() {
    while (!levels_.back().reader) {
        const std::size_t top = levels_.size() - 1;
        const std::size_t ancestor = nearestOpenAbove(top);
        // Coming back from far below, a run of folders is opened, for the next ones up are needed
        // soon.
        const std::size_t next = top - ancestor > openLevels ? top - openLevels + 1 : ancestor + 1;
        const auto opened = open(ancestor, next);
        if (opened && *opened == Opened::yes) {
            if (next > openLevels) {
                levels_[next - openLevels].reader.reset();
            }
            continue;
        }
        if (!opened && handler_ && !handler_(urlOf(next), opened.error())) {
            return Unexpected(opened.error());
        }
        levels_.erase(levels_.begin() + static_cast<std::ptrdiff_t>(next), levels_.end());
    }
    return {};
}

const URL& FolderStack::topURL() {
    return urlOf(levels_.size() - 1);
}

void FolderStack::push(std::string_view name, FileID folder, std::optional<URL> url) {
    Level& level = levels_.emplace_back();
    level.name = name;
    level.folder = folder;
    level.url = std::move(url);
}

std::size_t FolderStack::nearestOpenAbove(std::size_t index) const {
    while (index > 0 && !levels_[index].reader) {
        --index;
    }
    return index;
}

std::string FolderStack::pathBetween(std::size_t ancestor, std::size_t index) const {
    std::string path;
    for (std::size_t i = ancestor + 1; i <= index; ++i) {
        path += i == ancestor + 1 ? "" : "/";
        path += levels_[i].name;
    }
    return path;
}

Expected<FolderStack::Opened> FolderStack::open(std::size_t ancestor, std::size_t index) {
    Level& level = levels_[index];
    auto folder =
        openFolderBeneath(levels_[ancestor].reader->descriptor(), pathBetween(ancestor, index));
    const auto status = folder ? statEntry(folder->get(), "") : Unexpected(folder.error());
    if (!status) {
        if (meansGone(status.error().code)) {
            return Opened::gone;
        }
        return Unexpected(status.error());
    }
    const bool same = level.folder == FileID{} || level.folder == status->fileID;
    if (!same || !trees_.includes(device_, *status)) {
        return Opened::gone;
    }
    level.folder = status->fileID;
    level.mount = mountOf(folder->get());
    level.reader.emplace(std::move(*folder), firstBuffer, largestBuffer);
    level.reader->trackChanges();
    if (level.offset != 0) {
        if (const auto sought = level.reader->seek(level.offset); !sought) {
            return Unexpected(sought.error());
        }
    }
    return Opened::yes;
}

// From the nearest folder that has one, down; a walk may be thousands of folders deep.
const URL& FolderStack::urlOf(std::size_t index) {
    std::size_t known = index;
    while (!levels_[known].url) {
        --known;
    }
    for (std::size_t i = known + 1; i <= index; ++i) {
        PrefetchedValues values;
        if (levels_[i].folder != FileID{}) {
            values.known = {ResourceKey::name, ResourceKey::fileID, ResourceKey::isDirectory};
            values.fileID = levels_[i].folder;
            values.isDirectory = true;
        }
        levels_[i].url = URL::listedChild(*levels_[i - 1].url, levels_[i].name, values);
    }
    return *levels_[index].url;
}

}  // namespace marrowdale::native
