#include "platform/linux/streams/StreamFilter.h"

#include <algorithm>
#include <utility>

namespace marrowdale::native {

namespace {

constexpr std::string_view feedOfMoves = "/.docid";

// Whether `path` is `folder` or lies below it. Neither ends in "/"; the topmost folder is empty.
bool isAtOrBelow(std::string_view path, std::string_view folder) {
    return path.starts_with(folder) &&
           (path.size() == folder.size() || folder.empty() || path[folder.size()] == '/');
}

std::string withoutEndingSlashes(std::string path) {
    while (path.ends_with('/')) {
        path.pop_back();
    }
    return path;
}

}  // namespace

StreamFilter::StreamFilter(const std::vector<std::string>& paths, std::optional<DeviceID> device,
                           std::string rootPath, DeviceID rootDevice)
    : rootPath_(withoutEndingSlashes(std::move(rootPath))) {
    for (const std::string& path : paths) {
        if (!device) {
            addFolder(path);
        } else if (*device == rootDevice) {
            addFeed(path);
        } else {
            recorded_ = false;
        }
    }
}

void StreamFilter::addFolder(std::string path) {
    const bool isAbsolute = path.starts_with('/');
    path = withoutEndingSlashes(std::move(path));
    if (isAbsolute && isAtOrBelow(path, rootPath_)) {
        path.erase(0, rootPath_.size() + (path.size() > rootPath_.size() ? 1 : 0));
        folders_.push_back(std::move(path));
        return;
    }
    recorded_ = false;
    if (isAbsolute && isAtOrBelow(rootPath_, path)) {
        folders_.emplace_back();  // what is recorded below it
    }
}

void StreamFilter::addFeed(std::string_view path) {
    const bool isFeed = withoutEndingSlashes(std::string(path)) == feedOfMoves;
    takesMoves_ = takesMoves_ || isFeed;
    recorded_ = recorded_ && isFeed;
}

bool StreamFilter::isBelowOne(std::string_view path) const {
    return std::ranges::any_of(
        folders_, [path](const std::string& folder) { return isAtOrBelow(path, folder); });
}

std::optional<FileEvent> StreamFilter::take(const StoredEvent& event) const {
    const bool isMove = (event.flags & FileEventFlag::documentMoved) != 0;
    if (isMove ? !takesMoves_ : !isBelowOne(event.path)) {
        return std::nullopt;
    }
    FileEvent out;
    out.id = event.id;
    out.flags = event.flags;
    if (isMove) {
        out.path = std::string(event.path);
    } else if (event.path.empty()) {
        out.path = rootPath_.empty() ? "/" : rootPath_;
    } else {
        out.path = rootPath_ + "/" + std::string(event.path);
    }
    if (event.fileID != FileID{}) {
        out.fileID = event.fileID;
    }
    out.goneDocument = event.goneDocument;
    return out;
}

}  // namespace marrowdale::native
