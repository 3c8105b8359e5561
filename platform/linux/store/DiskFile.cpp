#include "platform/linux/store/DiskFile.h"

#include <algorithm>
#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <system_error>

#include "platform/linux/files/DirectoryReader.h"

namespace marrowdale::native {

namespace {

constexpr mode_t fileMode = 0600;
constexpr mode_t folderMode = 0700;
constexpr std::size_t nameBuffer = 8192;

Unexpected failure(std::string_view operation, const std::string& path) {
    return Unexpected(errorWithPOSIXCode(errno, operation, path));
}

}  // namespace

Expected<DiskFile> DiskFile::open(const std::string& path, int flags) {
    UniqueFD descriptor(::open(path.c_str(), flags | O_CLOEXEC | O_NOFOLLOW, fileMode));
    if (!descriptor) {
        return failure((flags & O_CREAT) != 0 ? "make" : "open", path);
    }
    return DiskFile(std::move(descriptor), path);
}

Expected<std::uint64_t> DiskFile::size() const {
    struct stat found{};
    if (::fstat(descriptor_.get(), &found) != 0) {
        return failure("look at", path_);
    }
    return static_cast<std::uint64_t>(found.st_size);
}

Expected<std::size_t> DiskFile::read(std::span<std::byte> into, std::uint64_t offset) const {
    std::size_t done = 0;
    while (done < into.size()) {
        const ssize_t count = ::pread(descriptor_.get(), into.data() + done, into.size() - done,
                                      static_cast<off_t>(offset + done));
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count < 0) {
            return failure("read", path_);
        }
        if (count == 0) {
            break;
        }
        done += static_cast<std::size_t>(count);
    }
    return done;
}

Expected<std::vector<std::byte>> DiskFile::readWhole(std::size_t limit) const {
    const auto length = size();
    if (!length) {
        return Unexpected(length.error());
    }
    if (*length > limit) {
        return Unexpected(errorWithPOSIXCode(EFBIG, "read", path_));
    }
    std::vector<std::byte> bytes(*length);
    const auto count = read(bytes, 0);
    if (!count) {
        return Unexpected(count.error());
    }
    bytes.resize(*count);
    return bytes;
}

Expected<void> DiskFile::write(std::span<const std::byte> bytes, std::uint64_t offset) const {
    std::size_t done = 0;
    while (done < bytes.size()) {
        const ssize_t count = ::pwrite(descriptor_.get(), bytes.data() + done, bytes.size() - done,
                                       static_cast<off_t>(offset + done));
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count < 0) {
            return failure("write", path_);
        }
        done += static_cast<std::size_t>(count);
    }
    return {};
}

Expected<void> DiskFile::truncate(std::uint64_t length) const {
    if (::ftruncate(descriptor_.get(), static_cast<off_t>(length)) != 0) {
        return failure("cut", path_);
    }
    return {};
}

Expected<void> DiskFile::sync() const {
    if (::fdatasync(descriptor_.get()) != 0) {
        return failure("sync", path_);
    }
    return {};
}

Expected<void> syncFolder(const std::string& path) {
    const UniqueFD folder(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder || ::fsync(folder.get()) != 0) {
        return failure("sync", path);
    }
    return {};
}

Expected<void> renameFile(const std::string& from, const std::string& to) {
    if (::rename(from.c_str(), to.c_str()) != 0) {
        return failure("rename", from);
    }
    return {};
}

Expected<void> removeFile(const std::string& path) {
    if (::unlink(path.c_str()) != 0 && errno != ENOENT) {
        return failure("remove", path);
    }
    return {};
}

Expected<void> removeTree(const std::string& path) {
    std::error_code error;
    std::filesystem::remove_all(path, error);
    if (error) {
        return Unexpected(errorWithPOSIXCode(error.value(), "remove", path));
    }
    return {};
}

Expected<void> makeFolders(const std::string& path) {
    for (std::size_t end = path.find('/', 1);; end = path.find('/', end + 1)) {
        const std::string part = path.substr(0, end);
        if (::mkdir(part.c_str(), folderMode) != 0 && errno != EEXIST) {
            // A folder above may be there and yet refuse the question (EROFS, EACCES).
            struct stat found{};
            const int code = errno;
            if (::stat(part.c_str(), &found) != 0) {
                return Unexpected(errorWithPOSIXCode(code, "make the folder", part));
            }
        }
        if (end == std::string::npos) {
            break;
        }
    }
    struct stat found{};
    if (::stat(path.c_str(), &found) != 0) {
        return failure("look at", path);
    }
    if (!S_ISDIR(found.st_mode)) {
        return Unexpected(errorWithPOSIXCode(ENOTDIR, "make the folder", path));
    }
    return {};
}

Expected<std::vector<std::string>> namesIn(const std::string& path) {
    auto folder = openFolder(path);
    if (!folder) {
        return Unexpected(folder.error());
    }
    std::vector<std::string> names;
    DirectoryReader reader(std::move(*folder), nameBuffer);
    while (true) {
        const auto entry = reader.next();
        if (!entry) {
            return Unexpected(entry.error());
        }
        if (!*entry) {
            break;
        }
        names.emplace_back((*entry)->name);
    }
    std::ranges::sort(names);
    return names;
}

}  // namespace marrowdale::native
