#include "host/browser/DocumentFile.h"

#include <array>
#include <cerrno>
#include <ctime>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>
#include <utility>

namespace marrowdale::host {

namespace {

class FilePart final : public ContentSource {
  public:
    FilePart(native::UniqueFD file, const ByteRange& range)
        : file_(std::move(file)), next_(range.first), end_(range.first + range.length) {}

    Expected<std::size_t> read(std::span<char> buffer) override {
        const std::uint64_t wanted = std::min<std::uint64_t>(buffer.size(), end_ - next_);
        ssize_t count = -1;
        do {
            count = ::pread(file_.get(), buffer.data(), wanted, static_cast<off_t>(next_));
        } while (count < 0 && errno == EINTR);
        if (count < 0) {
            return Unexpected(errorWithPOSIXCode(errno, "read", "a document"));
        }
        next_ += static_cast<std::uint64_t>(count);
        return static_cast<std::size_t>(count);
    }

  private:
    native::UniqueFD file_;
    std::uint64_t next_;
    std::uint64_t end_;
};

// Without links on the way, and without waiting for the other end of a pipe.
native::UniqueFD openWithoutLinks(const std::string& path) {
    open_how how{};
    how.flags = O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
    how.resolve = RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS;
    return native::UniqueFD(
        static_cast<int>(::syscall(SYS_openat2, AT_FDCWD, path.c_str(), &how, sizeof how)));
}

}  // namespace

Expected<DocumentFile> DocumentFile::open(const FileProviderItem& item) {
    const std::string path = item.fileURL.path();
    DocumentFile document;
    document.file_ = openWithoutLinks(path);
    if (!document.file_) {
        return Unexpected(errorWithPOSIXCode(errno, "open", path));
    }
    struct stat status{};
    if (::fstat(document.file_.get(), &status) != 0) {
        return Unexpected(errorWithPOSIXCode(errno, "look at", path));
    }
    if (!S_ISREG(status.st_mode)) {
        return Unexpected(errorWithPOSIXCode(EINVAL, "read", path));
    }
    if (item.fileID != static_cast<std::uint64_t>(status.st_ino)) {
        return Unexpected(errorWithPOSIXCode(ENOENT, "open", path));
    }
    document.size_ = static_cast<std::uint64_t>(status.st_size);
    document.number_ = static_cast<std::uint64_t>(status.st_ino);
    document.modified_ = {status.st_mtim.tv_sec,
                          static_cast<std::uint32_t>(status.st_mtim.tv_nsec)};
    return document;
}

std::string DocumentFile::tag() const {
    return "\"" + std::to_string(number_) + "-" + std::to_string(size_) + "-" +
           std::to_string(modified_.seconds) + "." + std::to_string(modified_.nanoseconds) + "\"";
}

std::string DocumentFile::lastModified() const {
    const std::time_t time = modified_.seconds;
    std::tm parts{};
    constexpr std::size_t longest = 40;
    std::array<char, longest> text{};
    if (::gmtime_r(&time, &parts) == nullptr) {
        return {};
    }
    // English, whatever the locale is: the program never sets one.
    const std::size_t length =
        std::strftime(text.data(), text.size(), "%a, %d %b %Y %H:%M:%S GMT", &parts);
    return {text.data(), length};
}

std::unique_ptr<ContentSource> DocumentFile::read(const ByteRange& range) && {
    return std::make_unique<FilePart>(std::move(file_), range);
}

}  // namespace marrowdale::host
