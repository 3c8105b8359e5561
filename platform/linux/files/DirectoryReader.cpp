#include "platform/linux/files/DirectoryReader.h"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstring>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

namespace {

// One record of getdents64, as the kernel writes it.
struct Record {
    std::uint64_t fileID;
    std::int64_t position;
    unsigned short length;
    unsigned char type;
};
constexpr std::size_t nameOffset = 19;

constexpr int folderFlags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;
// The kernel takes no path of PATH_MAX bytes or more in one call.
constexpr std::size_t longestStep = PATH_MAX - 1;

bool isDotOrDotDot(const char* name) {
    return name[0] == '.' && (name[1] == '\0' || (name[1] == '.' && name[2] == '\0'));
}

// Only an owner may ask that reading leaves the access time alone.
template <typename Open>
int openLeavingAccessTime(const Open& open) {
    const int descriptor = open(folderFlags | O_NOATIME);
    return descriptor < 0 && errno == EPERM ? open(folderFlags) : descriptor;
}

int openStepBeneath(int base, const char* path, int flags) {
    struct open_how how{};
    how.flags = static_cast<unsigned>(flags);
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS | RESOLVE_NO_XDEV;
    // EAGAIN: a rename elsewhere made the kernel unsure whether the path stayed below.
    constexpr int tries = 16;
    long descriptor = -1;
    for (int i = 0; i < tries; ++i) {
        descriptor = ::syscall(SYS_openat2, base, path, &how, sizeof how);
        if (descriptor >= 0 || (errno != EAGAIN && errno != EINTR)) {
            break;
        }
    }
    return static_cast<int>(descriptor);
}

// Opens a path of any length: the part that fits in one call, then the rest below that. `step` gets
// the folder to start from and whether this is the last part.
template <typename Step>
Expected<UniqueFD> openInSteps(int base, const std::string& path, const Step& step) {
    UniqueFD held;
    std::size_t begin = 0;
    while (true) {
        const bool last = path.size() - begin <= longestStep;
        std::size_t end = path.size();
        if (!last) {
            end = path.rfind('/', begin + longestStep);
            if (end == std::string::npos || end <= begin) {
                return Unexpected(errorWithPOSIXCode(ENAMETOOLONG, "open the folder", path));
            }
        }
        UniqueFD opened(step(held ? held.get() : base, path.substr(begin, end - begin), last));
        if (!opened) {
            return Unexpected(errorWithPOSIXCode(errno, "open the folder", path));
        }
        if (last) {
            return opened;
        }
        held = std::move(opened);
        begin = path.find_first_not_of('/', end);
        if (begin == std::string::npos) {
            return held;
        }
    }
}

}  // namespace

DirectoryReader::DirectoryReader(UniqueFD folder, std::size_t bufferBytes)
    : DirectoryReader(std::move(folder), bufferBytes, bufferBytes) {}

DirectoryReader::DirectoryReader(UniqueFD folder, std::size_t bufferBytes,
                                 std::size_t largestBufferBytes)
    : folder_(std::move(folder)), capacity_(bufferBytes), largestCapacity_(largestBufferBytes) {}

Expected<std::optional<DirectoryReader::Entry>> DirectoryReader::next() {
    while (true) {
        if (consumed_ == filled_) {
            const Expected<bool> more = fill();
            if (!more) {
                return Unexpected(more.error());
            }
            if (!*more) {
                return std::optional<Entry>();
            }
        }
        Record record{};
        const std::byte* start = buffer_.get() + consumed_;
        std::memcpy(&record, start, nameOffset);
        consumed_ += record.length;
        const char* name = reinterpret_cast<const char*>(start + nameOffset);
        if (!isDotOrDotDot(name)) {
            return std::optional<Entry>(
                Entry{name, FileID{record.fileID}, record.type, record.position});
        }
    }
}

Expected<bool> DirectoryReader::fill() {
    // A buffer with room for another entry was not filled: the end is near, so it is big enough.
    constexpr std::size_t roomForAnEntry = 512;
    const bool wasFull = buffer_ && filled_ + roomForAnEntry > capacity_;
    if (wasFull && capacity_ < largestCapacity_) {
        capacity_ = std::min(capacity_ * 4, largestCapacity_);
        buffer_.reset();
    }
    if (!buffer_) {
        buffer_ = std::make_unique_for_overwrite<std::byte[]>(capacity_);  // NOLINT(*-c-arrays)
    }
    if (tracksChanges_) {
        noteChangeTime();
    }
    const long count = ::syscall(SYS_getdents64, folder_.get(), buffer_.get(), capacity_);
    if (count < 0) {
        return Unexpected(errorWithPOSIXCode(errno, "read a folder", {}));
    }
    consumed_ = 0;
    filled_ = static_cast<std::size_t>(count);
    return count > 0;
}

// A change time that is younger than the file system's clock can tell apart may stay the same
// through another change, so it says nothing.
void DirectoryReader::noteChangeTime() {
    const Date now = Date::now();
    const auto status = statEntry(folder_.get(), "");
    changed_ =
        status && isSettled(status->changed, now) ? std::optional(status->changed) : std::nullopt;
}

bool DirectoryReader::isUnchanged() const {
    const auto status = statEntry(folder_.get(), "");
    return changed_ && status && status->changed == *changed_;
}

Expected<void> DirectoryReader::seek(std::int64_t position) {
    consumed_ = 0;
    filled_ = 0;
    changed_.reset();
    if (::lseek(folder_.get(), position, SEEK_SET) < 0) {
        return Unexpected(errorWithPOSIXCode(errno, "go on in a folder", {}));
    }
    return {};
}

Expected<UniqueFD> openFolderBeneath(int base, const std::string& path) {
    const auto step = [](int from, const std::string& part, bool last) {
        const char* name = part.empty() ? "." : part.c_str();
        return last ? openLeavingAccessTime(
                          [&](int flags) { return openStepBeneath(from, name, flags); })
                    : openStepBeneath(from, name, O_PATH | O_DIRECTORY | O_CLOEXEC);
    };
    return openInSteps(base, path, step);
}

Expected<UniqueFD> holdFolderBeneath(int base, const std::string& path) {
    const auto step = [](int from, const std::string& part, bool) {
        return openStepBeneath(from, part.empty() ? "." : part.c_str(),
                               O_PATH | O_DIRECTORY | O_CLOEXEC);
    };
    return openInSteps(base, path, step);
}

Expected<UniqueFD> holdFolder(const std::string& path) {
    const auto step = [](int from, const std::string& part, bool) {
        return ::openat(from, part.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
    };
    return openInSteps(AT_FDCWD, path, step);
}

Expected<UniqueFD> openFolder(const std::string& path) {
    const auto step = [](int from, const std::string& part, bool last) {
        return last ? openLeavingAccessTime(
                          [&](int flags) { return ::openat(from, part.c_str(), flags); })
                    : ::openat(from, part.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
    };
    return openInSteps(AT_FDCWD, path, step);
}

}  // namespace marrowdale::native
