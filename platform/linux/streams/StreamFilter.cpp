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
                           std::vector<EventRoot> roots, DeviceID rootDevice)
    : roots_(std::move(roots)) {
    for (EventRoot& root : roots_) {
        root.path = withoutEndingSlashes(std::move(root.path));
    }
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
    bool isInOne = false;
    for (const EventRoot& root : roots_) {
        if (isAbsolute && isAtOrBelow(path, root.path)) {
            const std::string_view rest = std::string_view(path).substr(root.path.size());
            folders_.push_back(root.prefix + std::string(root.prefix.empty() && !rest.empty()
                                                             ? rest.substr(1)
                                                             : rest));
            recorded_ = recorded_ && root.isRecorded;
            isInOne = true;
        } else if (isAbsolute && isAtOrBelow(root.path, path)) {
            folders_.push_back(root.prefix);  // what is recorded below it
        }
    }
    recorded_ = recorded_ && isInOne;
}

void StreamFilter::addFeed(std::string_view path) {
    const bool isFeed = withoutEndingSlashes(std::string(path)) == feedOfMoves;
    takesMoves_ = takesMoves_ || isFeed;
    recorded_ = recorded_ && isFeed;
}

// The root's own prefix is empty, and libraries do not lie below it.
bool StreamFilter::isBelowOne(std::string_view path) const {
    return std::ranges::any_of(folders_, [path](const std::string& folder) {
        return isAtOrBelow(path, folder) && (!folder.empty() || !path.starts_with('/'));
    });
}

const EventRoot* StreamFilter::rootOf(std::string_view path) const {
    const std::size_t end = std::min(path.find('/', 1), path.size());
    const std::string_view prefix =
        path.starts_with('/') ? path.substr(0, end) : std::string_view();
    const auto found = std::ranges::find(roots_, prefix, &EventRoot::prefix);
    return found == roots_.end() ? nullptr : &*found;
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
    } else {
        const EventRoot* root = rootOf(event.path);
        if (root == nullptr) {
            return std::nullopt;
        }
        const std::string_view rest = event.path.substr(root->prefix.size());
        const bool needsSlash = !rest.empty() && !rest.starts_with('/');
        out.path = root->path + (needsSlash ? "/" : "") + std::string(rest);
        if (out.path->empty()) {
            out.path = "/";
        }
    }
    if (event.fileID != FileID{}) {
        out.fileID = event.fileID;
    }
    out.goneDocument = event.goneDocument;
    return out;
}

}  // namespace marrowdale::native
