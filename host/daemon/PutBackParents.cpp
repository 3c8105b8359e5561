#include "host/daemon/PutBackParents.h"

#include <fcntl.h>
#include <span>

#include "platform/linux/store/DiskFile.h"

namespace marrowdale::host {

namespace {

constexpr std::string_view unfinished = ".new";
constexpr std::size_t longestIdentifier = 1024;

// Only identifiers of files and folders are names of files.
bool isNumbered(std::string_view identifier) {
    return (identifier.starts_with("did=") || identifier.starts_with("fid=")) &&
           identifier.find_first_not_of("0123456789", 4) == std::string_view::npos;
}

}  // namespace

Expected<void> PutBackParents::remember(std::string_view item, std::string_view parent) const {
    if (!isNumbered(item)) {
        return {};
    }
    if (auto made = native::makeFolders(folder_); !made) {
        return made;
    }
    const std::string fresh = fileOf(item) + std::string(unfinished);
    const auto file = native::DiskFile::open(fresh, O_WRONLY | O_CREAT | O_TRUNC);
    auto done = file ? file->write(std::as_bytes(std::span(parent)), 0) : Unexpected(file.error());
    if (done) {
        done = file->sync();
    }
    if (done) {
        done = native::renameFile(fresh, fileOf(item));
    }
    return done ? native::syncFolder(folder_) : done;
}

std::optional<std::string> PutBackParents::parentOf(std::string_view item) const {
    if (!isNumbered(item)) {
        return std::nullopt;
    }
    const auto file = native::DiskFile::open(fileOf(item), O_RDONLY);
    const auto bytes = file ? file->readWhole(longestIdentifier) : Unexpected(file.error());
    if (!bytes || bytes->empty()) {
        return std::nullopt;
    }
    std::string parent;
    for (const std::byte byte : *bytes) {
        parent += static_cast<char>(byte);
    }
    return parent;
}

void PutBackParents::forget(std::string_view item) const {
    if (isNumbered(item)) {
        // What stays does no harm: it is asked for trashed items alone.
        static_cast<void>(native::removeFile(fileOf(item)));
    }
}

std::vector<std::string> PutBackParents::items() const {
    auto names = native::namesIn(folder_);
    std::vector<std::string> items = names ? std::move(*names) : std::vector<std::string>();
    std::erase_if(items, [](const std::string& name) { return !isNumbered(name); });
    return items;
}

}  // namespace marrowdale::host
