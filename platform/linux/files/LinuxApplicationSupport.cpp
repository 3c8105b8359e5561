#include "platform/linux/files/LinuxApplicationSupport.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

namespace {

constexpr mode_t folderMode = 0700;
constexpr mode_t fileMode = 0600;

Unexpected failed(std::string_view operation, const std::string& path) {
    return Unexpected(errorWithPOSIXCode(errno, operation, path));
}

Expected<UniqueFD> openedForReading(const std::string& path) {
    // Whatever stands there, nothing is waited for.
    UniqueFD file(::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    if (!file && errno == ENOENT) {
        return Unexpected(
            Error{ErrorDomain::file, static_cast<int>(FileErrorCode::noSuchFile), "read", path});
    }
    if (!file) {
        return failed("open", path);
    }
    return file;
}

Expected<std::size_t> sizeToRead(int file, const std::string& path) {
    struct stat status{};
    if (::fstat(file, &status) != 0) {
        return failed("look at", path);
    }
    if (!S_ISREG(status.st_mode)) {
        return Unexpected(errorWithPOSIXCode(EINVAL, "read", path));
    }
    const auto size = static_cast<std::size_t>(status.st_size);
    if (size > LinuxApplicationSupport::largestFile) {
        return Unexpected(errorWithPOSIXCode(EFBIG, "read", path));
    }
    return size;
}

Expected<void> writeAll(int file, std::span<const std::uint8_t> bytes, const std::string& path) {
    while (!bytes.empty()) {
        const ssize_t written = ::write(file, bytes.data(), bytes.size());
        if (written < 0 && errno != EINTR) {
            return failed("write", path);
        }
        bytes = bytes.subspan(written < 0 ? 0 : static_cast<std::size_t>(written));
    }
    return {};
}

Expected<void> writeAside(int folder, const char* name, const Data& contents,
                          const std::string& path) {
    if (::unlinkat(folder, name, 0) != 0 && errno != ENOENT) {
        return failed("remove the old copy of", path);
    }
    const UniqueFD file(
        ::openat(folder, name, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, fileMode));
    if (!file) {
        return failed("create", path);
    }
    if (auto written = writeAll(file.get(), contents.bytes(), path); !written) {
        return written;
    }
    if (::fsync(file.get()) != 0) {
        return failed("sync", path);
    }
    return {};
}

// A folder that is there is success, also where none could be made (on a disk that can't be
// written).
Expected<void> makeFolder(const std::string& path) {
    const int code = ::mkdir(path.c_str(), folderMode) == 0 ? 0 : errno;
    struct stat status{};
    if (code == 0 || (::stat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode))) {
        return {};
    }
    return Unexpected(errorWithPOSIXCode(code == EEXIST ? ENOTDIR : code, "create folder", path));
}

}  // namespace

LinuxApplicationSupport::LinuxApplicationSupport(std::string dataHome)
    : dataHome_(std::move(dataHome)) {}

std::vector<URL> LinuxApplicationSupport::applicationSupportDirectories() {
    return dataHome_.empty() ? std::vector<URL>() : std::vector<URL>{URL::fileURL(dataHome_)};
}

Expected<void> LinuxApplicationSupport::createDirectory(const URL& url) {
    const std::string& path = url.path();
    for (std::size_t end = 0; end != std::string::npos;) {
        end = path.find('/', end + 1);
        if (auto made = makeFolder(path.substr(0, end)); !made) {
            return made;
        }
    }
    return {};
}

Expected<Data> LinuxApplicationSupport::read(const URL& url) {
    const std::string& path = url.path();
    const auto file = openedForReading(path);
    if (!file) {
        return Unexpected(file.error());
    }
    const auto size = sizeToRead(file->get(), path);
    if (!size) {
        return Unexpected(size.error());
    }
    Bytes bytes(*size);
    std::size_t filled = 0;
    while (filled < bytes.size()) {
        const ssize_t got = ::read(file->get(), bytes.data() + filled, bytes.size() - filled);
        if (got < 0 && errno != EINTR) {
            return failed("read", path);
        }
        if (got == 0) {
            break;  // it was cut meanwhile
        }
        filled += got < 0 ? 0 : static_cast<std::size_t>(got);
    }
    bytes.resize(filled);
    return Data(std::move(bytes));
}

Expected<void> LinuxApplicationSupport::replace(const URL& url, const Data& contents) {
    const std::lock_guard lock(writing_);
    const std::string& path = url.path();
    const std::string name(url.lastPathComponent());
    const std::string aside = "." + name + ".new";
    const URL parent = url.deletingLastPathComponent();
    const UniqueFD folder(::open(parent.path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder) {
        return failed("open the folder of", path);
    }
    if (auto written = writeAside(folder.get(), aside.c_str(), contents, path); !written) {
        ::unlinkat(folder.get(), aside.c_str(), 0);
        return written;
    }
    if (::renameat(folder.get(), aside.c_str(), folder.get(), name.c_str()) != 0) {
        auto error = failed("rename into place", path);
        ::unlinkat(folder.get(), aside.c_str(), 0);
        return error;
    }
    if (::fsync(folder.get()) != 0) {
        return failed("sync the folder of", path);
    }
    return {};
}

}  // namespace marrowdale::native
