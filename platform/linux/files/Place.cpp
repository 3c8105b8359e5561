#include "platform/linux/files/Place.h"

#include <cerrno>
#include <climits>
#include <fcntl.h>

#include "platform/linux/files/DirectoryReader.h"

namespace marrowdale::native {

namespace {

Error withPath(Error error, const URL& url) {
    error.subject = url.path();
    return error;
}

// The kernel says so of a mount.
Error asNotServed(Error error) {
    if (error.code == EXDEV) {
        error.code = ENOENT;
    }
    return error;
}

}  // namespace

Error itemError(Error error, const URL& url) {
    if (error.domain == ErrorDomain::posix && (error.code == ENOENT || error.code == ENOTDIR)) {
        error.domain = ErrorDomain::file;
        error.code = static_cast<int>(FileErrorCode::noSuchFile);
    }
    return withPath(std::move(error), url);
}

Place::Place(URL url, const ServedTrees& trees, std::string name)
    : url_(std::move(url)), trees_(trees), name_(std::move(name)) {}

Expected<Place> Place::of(const URL& url, const ServedTrees& trees) {
    if (!url.isFileURL()) {
        return Unexpected(errorWithPOSIXCode(EINVAL, "look at", url.absoluteString()));
    }
    const auto location = trees.locate(url.standardized().path());
    if (!location) {
        return Unexpected(withPath(location.error(), url));
    }
    return at(url, *location, trees);
}

Expected<Place> Place::at(const URL& url, const std::optional<ServedTrees::Location>& location,
                          const ServedTrees& trees) {
    auto place = location ? inside(url, *location, trees) : outside(url, trees);
    if (!place) {
        return Unexpected(withPath(place.error(), url));
    }
    return place;
}

Expected<Place> Place::outside(const URL& url, const ServedTrees& trees) {
    const std::string& path = url.path();
    if (path.size() < PATH_MAX) {
        return Place(url, trees, path);
    }
    const std::size_t slash = path.rfind('/');
    auto folder = holdFolder(path.substr(0, slash));
    if (!folder) {
        return Unexpected(folder.error());
    }
    Place place(url, trees, path.substr(slash + 1));
    place.directory_ = folder->get();
    place.folder_ = std::move(*folder);
    return place;
}

Expected<Place> Place::inside(const URL& url, const ServedTrees::Location& location,
                              const ServedTrees& trees) {
    const std::string& path = location.relativePath;
    const std::size_t slash = path.rfind('/');
    Place place(url, trees,
                path.empty() ? "." : path.substr(slash == std::string::npos ? 0 : slash + 1));
    place.device_ = location.device;
    place.root_ = location.keptOpen;
    place.directory_ = location.root;
    if (slash != std::string::npos) {
        auto folder = trees.holdFolder(location, path.substr(0, slash));
        if (!folder) {
            return Unexpected(folder.error());
        }
        place.directory_ = folder->get();
        place.folder_ = std::move(*folder);
    }
    return place;
}

std::optional<DeviceID> Place::device() const {
    return isRoot() ? std::nullopt : device_;
}

bool Place::hasParent() const {
    return directory_ != AT_FDCWD && !isRoot();
}

Expected<EntryStatus> Place::look() const {
    return checked(statEntry(directory_, name()));
}

Expected<UniqueFD> Place::open(int flags) const {
    UniqueFD opened(::openat(directory_, name(), flags | O_NOFOLLOW | O_CLOEXEC | O_NOCTTY));
    if (!opened) {
        return Unexpected(errorWithPOSIXCode(errno, "open", url_.path()));
    }
    if (isServed()) {
        if (const auto status = checked(statEntry(opened.get(), "")); !status) {
            return Unexpected(status.error());
        }
    }
    return opened;
}

Mount Place::mount() const {
    if (isServed()) {
        return mountOf(directory_);
    }
    const auto item = open(O_PATH);
    return item ? mountOf(item->get()) : Mount::writable;
}

Expected<Place::OpenedFolder> Place::openFolder() const {
    auto folder =
        directory_ == AT_FDCWD ? native::openFolder(name_) : openFolderBeneath(directory_, name_);
    if (!folder) {
        return Unexpected(withPath(asNotServed(folder.error()), url_));
    }
    const auto status = checked(statEntry(folder->get(), ""));
    if (!status) {
        return Unexpected(status.error());
    }
    return OpenedFolder{std::move(*folder), *status};
}

Expected<EntryStatus> Place::checked(const Expected<EntryStatus>& status) const {
    if (!status) {
        return Unexpected(withPath(status.error(), url_));
    }
    const bool mayLeave = isServed() && !isRoot();
    if (mayLeave && !trees_.includes(*device_, *status)) {
        return Unexpected(errorWithPOSIXCode(ENOENT, "look at", url_.path()));
    }
    return status;
}

}  // namespace marrowdale::native
