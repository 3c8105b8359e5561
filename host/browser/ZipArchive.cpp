#include "host/browser/ZipArchive.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <memory>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>
#include <utility>
#include <zlib.h>

#include "platform/foundation/Error.h"

namespace marrowdale::host {

namespace {

constexpr std::string_view trashName = ".Trash";
constexpr std::string_view problemsName = "NOT IN THIS ARCHIVE.txt";

native::UniqueFD openWithoutLinks(int folder, const std::string& path, std::uint64_t resolve) {
    open_how how{};
    how.flags = O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
    how.resolve = resolve | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS;
    return native::UniqueFD(
        static_cast<int>(::syscall(SYS_openat2, folder, path.c_str(), &how, sizeof how)));
}

// Gone, or nothing that belongs into an archive: a link, a socket, another file system.
bool isLeftOut(int code) {
    return code == ENOENT || code == ENOTDIR || code == ELOOP || code == ENXIO || code == EXDEV ||
           code == ENODEV;
}

// The names in a folder, the first one last.
std::vector<std::string> namesIn(native::UniqueFD folder) {
    std::vector<std::string> names;
    const std::unique_ptr<DIR, int (*)(DIR*)> stream(::fdopendir(folder.get()), &::closedir);
    if (!stream) {
        return names;
    }
    std::ignore = folder.release();
    while (const dirent* const entry = ::readdir(stream.get())) {
        const std::string_view name = entry->d_name;
        if (name != "." && name != ".." && name != trashName) {
            names.emplace_back(name);
        }
    }
    std::ranges::sort(names, std::greater<>());
    return names;
}

// "name 2.ext"
std::string numbered(std::string_view name, int number) {
    const std::size_t dot = name.rfind('.');
    const std::size_t end = dot == std::string_view::npos || dot == 0 ? name.size() : dot;
    return std::string(name.substr(0, end)) + " " + std::to_string(number) +
           std::string(name.substr(end));
}

std::string freeName(std::set<std::string, std::less<>>& taken, std::string_view name) {
    const std::string plain = zipNamePart(name);
    std::string free = plain;
    for (int number = 2; !taken.insert(free).second; ++number) {
        free = numbered(plain, number);
    }
    return free;
}

}  // namespace

ZipArchive::ZipArchive(std::vector<FileProviderItemPtr> items) : items_(std::move(items)) {
    taken_.emplace(problemsName);
}

Expected<std::size_t> ZipArchive::read(std::span<char> buffer) {
    while (true) {
        if (queuedStart_ < queued_.size()) {
            const std::size_t count = std::min(buffer.size(), queued_.size() - queuedStart_);
            std::memcpy(buffer.data(), queued_.data() + queuedStart_, count);
            queuedStart_ += count;
            return count;
        }
        queued_.clear();
        queuedStart_ = 0;
        if (!file_) {
            if (!advance()) {
                return std::size_t{0};
            }
            continue;
        }
        const std::size_t wanted =
            std::min<std::uint64_t>(buffer.size(), entry_->longestSize - entry_->size);
        const ssize_t count = ::read(file_.get(), buffer.data(), wanted);
        if (count < 0 && errno != EINTR) {
            return Unexpected(errorWithPOSIXCode(errno, "read", entry_->name));
        }
        if (count == 0) {
            endFile();
        } else if (count > 0) {
            const auto length = static_cast<std::size_t>(count);
            entry_->checksum = static_cast<std::uint32_t>(::crc32_z(
                entry_->checksum,
                static_cast<const Bytef*>(static_cast<const void*>(buffer.data())), length));
            entry_->size += length;
            offset_ += length;
            return length;
        }
    }
}

bool ZipArchive::advance() {
    if (!levels_.empty()) {
        beginNextIn(levels_.back());
    } else if (nextItem_ < items_.size()) {
        const FileProviderItem& next = *items_[nextItem_];
        ++nextItem_;
        beginItem(next);
    } else if (!isEnded_) {
        endArchive();
    } else {
        return false;
    }
    return true;
}

void ZipArchive::beginItem(const FileProviderItem& item) {
    native::UniqueFD file = openWithoutLinks(AT_FDCWD, item.fileURL.path(), 0);
    if (!file) {
        cannotOpen(errno, item.filename);
        return;
    }
    struct stat status{};
    if (::fstat(file.get(), &status) == 0 &&
        item.fileID == static_cast<std::uint64_t>(status.st_ino)) {
        begin(std::move(file), {}, freeName(taken_, item.filename));
    }
}

void ZipArchive::beginNextIn(Level& level) {
    if (level.waiting.empty()) {
        levels_.pop_back();
        return;
    }
    const std::string name = std::move(level.waiting.back());
    level.waiting.pop_back();
    std::string path = level.path.empty() ? name : level.path + "/" + name;
    native::UniqueFD file = openWithoutLinks(root_.get(), path, RESOLVE_BENEATH | RESOLVE_NO_XDEV);
    std::string shown = level.name + freeName(level.taken, name);
    if (file) {
        begin(std::move(file), std::move(path), std::move(shown));
    } else {
        cannotOpen(errno, shown);
    }
}

void ZipArchive::begin(native::UniqueFD file, std::string path, std::string name) {
    struct stat status{};
    constexpr std::size_t longestName = 0xFFFF;
    if (::fstat(file.get(), &status) != 0 || name.size() >= longestName) {
        cannotOpen(name.size() >= longestName ? ENAMETOOLONG : errno, name);
        return;
    }
    ZipEntry entry;
    entry.name = std::move(name);
    entry.modified = {status.st_mtim.tv_sec, static_cast<std::uint32_t>(status.st_mtim.tv_nsec)};
    entry.mode = status.st_mode;
    if (S_ISDIR(status.st_mode)) {
        beginFolder(std::move(file), std::move(entry), std::move(path));
    } else if (S_ISREG(status.st_mode)) {
        entry.longestSize = static_cast<std::uint64_t>(status.st_size);
        entry.offset = offset_;
        queueHead(entry);
        entry_ = std::move(entry);
        file_ = std::move(file);
    }
}

void ZipArchive::beginFolder(native::UniqueFD folder, ZipEntry entry, std::string path) {
    entry.name += "/";
    entry.offset = offset_;
    queueHead(entry);
    queue(zipTail(entry));
    record(entry);
    Level level{.path = path, .name = entry.name, .waiting = {}, .taken = {}};
    if (path.empty()) {
        root_ = std::move(folder);
        folder = openWithoutLinks(root_.get(), ".", 0);
    }
    level.waiting = namesIn(std::move(folder));
    levels_.push_back(std::move(level));
}

void ZipArchive::endFile() {
    queue(zipTail(*entry_));
    record(*entry_);
    entry_.reset();
    file_.reset();
}

void ZipArchive::endArchive() {
    isEnded_ = true;
    if (!problems_.empty()) {
        queueText(std::string(problemsName), problems_);
    }
    const std::uint64_t directoryOffset = offset_;
    queue(directory_);
    queue(zipEnd(records_, directory_.size(), directoryOffset));
}

void ZipArchive::cannotOpen(int code, std::string_view name) {
    if (!isLeftOut(code)) {
        problems_ += errorWithPOSIXCode(code, {}, zipNamePart(name)).description() + "\r\n";
    }
}

void ZipArchive::queueText(std::string name, std::string_view text) {
    ZipEntry entry;
    entry.name = std::move(name);
    entry.modified = Date::now();
    entry.mode = S_IFREG | S_IRUSR | S_IWUSR | S_IRGRP | S_IROTH;
    entry.longestSize = entry.size = text.size();
    entry.checksum = static_cast<std::uint32_t>(::crc32_z(
        0, static_cast<const Bytef*>(static_cast<const void*>(text.data())), text.size()));
    entry.offset = offset_;
    queueHead(entry);
    queue(text);
    queue(zipTail(entry));
    record(entry);
}

void ZipArchive::queueHead(const ZipEntry& entry) {
    queue(zipHead(entry));
}

void ZipArchive::queue(std::string_view bytes) {
    queued_ += bytes;
    offset_ += bytes.size();
}

void ZipArchive::record(const ZipEntry& entry) {
    directory_ += zipDirectoryRecord(entry);
    ++records_;
}

}  // namespace marrowdale::host
