#include "platform/linux/operations/FileCopy.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <fcntl.h>
#include <linux/fs.h>
#include <string_view>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <system_error>
#include <unistd.h>
#include <vector>

#include "platform/linux/files/AttributeNames.h"

namespace marrowdale::native {

namespace {

constexpr std::string_view importing = "import";
// Between two looks at whether to go on.
constexpr std::size_t stretch = 16U << 20U;
constexpr std::size_t memoryBlock = 256U << 10U;
constexpr std::uint32_t permissionBits = 0777;

Unexpected failed(int code, const std::string& path) {
    return Unexpected(errorWithPOSIXCode(code, importing, path));
}

class ContentCopy {
  public:
    ContentCopy(int from, int to, const std::string& path, OperationRun& run)
        : from_(from), to_(to), path_(path), run_(run) {}

    // Up to `size`, which is how long the source was.
    Expected<void> copy(off_t size) {
        if (::ioctl(to_, FICLONE, from_) == 0) {
            run_.didBytes(static_cast<std::uint64_t>(size));
            return {};
        }
        for (off_t at = 0; at < size;) {
            const off_t data = nextData(at, size);
            const off_t hole = nextHole(data, size);
            run_.didBytes(static_cast<std::uint64_t>(data - at));
            if (auto copied = copyStretch(data, hole); !copied) {
                return copied;
            }
            at = hole;
        }
        return ::ftruncate(to_, size) == 0 ? Expected<void>() : failed(errno, path_);
    }

  private:
    off_t nextData(off_t from, off_t size) const {
        const off_t found = ::lseek(from_, from, SEEK_DATA);
        if (found < 0) {
            return errno == ENXIO ? size : from;  // else the file system does not tell
        }
        return std::min(found, size);
    }
    off_t nextHole(off_t from, off_t size) const {
        const off_t found = from < size ? ::lseek(from_, from, SEEK_HOLE) : size;
        return found < 0 ? size : std::min(found, size);
    }

    Expected<void> copyStretch(off_t at, off_t end) {
        while (at < end) {
            if (auto checked = run_.checkpoint(importing, path_); !checked) {
                return checked;
            }
            const auto length = std::min(stretch, static_cast<std::size_t>(end - at));
            const auto copied = inKernel_ ? copyInKernel(at, length) : copyInMemory(at, length);
            if (!copied) {
                return Unexpected(copied.error());
            }
            if (*copied == 0 && !inKernel_) {
                return {};  // cut off meanwhile, which the look at the source afterwards tells
            }
            inKernel_ = inKernel_ && *copied > 0;
            at += static_cast<off_t>(*copied);
            run_.didBytes(*copied);
        }
        return {};
    }

    // 0 where the kernel does not copy between these two.
    Expected<std::size_t> copyInKernel(off_t at, std::size_t length) {
        off_t source = at;
        off_t target = at;
        const ssize_t copied = ::copy_file_range(from_, &source, to_, &target, length, 0);
        if (copied >= 0) {
            return static_cast<std::size_t>(copied);
        }
        constexpr std::array notHere{EXDEV, EINVAL, ENOSYS, EOPNOTSUPP, EPERM, ETXTBSY};
        if (std::ranges::find(notHere, errno) != notHere.end()) {
            return std::size_t{0};
        }
        return failed(errno, path_);
    }

    Expected<std::size_t> copyInMemory(off_t at, std::size_t length) {
        memory_.resize(memoryBlock);
        const ssize_t got = ::pread(from_, memory_.data(), std::min(length, memoryBlock), at);
        if (got < 0) {
            return failed(errno, path_);
        }
        for (ssize_t put = 0; put < got;) {
            const ssize_t done =
                ::pwrite(to_, memory_.data() + put, static_cast<std::size_t>(got - put), at + put);
            if (done < 0) {
                return failed(errno, path_);
            }
            put += done;
        }
        return static_cast<std::size_t>(got);
    }

    int from_;
    int to_;
    const std::string& path_;
    OperationRun& run_;
    bool inKernel_ = true;
    std::vector<char> memory_;
};

std::string whyNot(int code) {
    return std::generic_category().message(code);
}

// The names, each with its NUL; empty where the file keeps none, or they can't be read.
std::vector<char> attributeNames(int file, const std::string& path, const OperationRun& run) {
    constexpr std::size_t mostNames = 64U << 10U;
    std::vector<char> names(mostNames);
    const ssize_t size = ::flistxattr(file, names.data(), names.size());
    if (size < 0) {
        if (errno != EOPNOTSUPP) {
            run.warn("can't read the attributes of \"" + path + "\": " + whyNot(errno));
        }
        return {};
    }
    names.resize(static_cast<std::size_t>(size));
    return names;
}

// 0, or why it was not copied.
int copyAttribute(int from, int to, const char* name) {
    constexpr std::size_t mostBytes = 64U << 10U;
    std::vector<char> value(mostBytes);
    const ssize_t size = ::fgetxattr(from, name, value.data(), value.size());
    if (size < 0) {
        return errno == ENODATA ? 0 : errno;
    }
    return ::fsetxattr(to, name, value.data(), static_cast<std::size_t>(size), 0) == 0 ? 0 : errno;
}

struct timespec timeOf(const Date& date) {
    return {date.seconds, static_cast<long>(date.nanoseconds)};
}

}  // namespace

Expected<void> copyContents(int from, int to, const EntryStatus& before, const std::string& path,
                            OperationRun& run) {
    auto copied = ContentCopy(from, to, path, run).copy(static_cast<off_t>(before.size));
    return copied ? checkUnchanged(from, before, path) : copied;
}

void copyAttributes(int from, int to, const EntryStatus& source, const std::string& path,
                    OperationRun& run) {
    const auto names = attributeNames(from, path, run);
    for (std::size_t at = 0; at < names.size();) {
        const std::string_view name(names.data() + at);
        at += name.size() + 1;
        const int code =
            name.starts_with(attributePrefix) ? copyAttribute(from, to, name.data()) : 0;
        if (code != 0) {
            run.warn("the copy of \"" + path + "\" is without the attribute \"" +
                     std::string(name.substr(attributePrefix.size())) + "\": " + whyNot(code));
        }
    }
    if (::fchmod(to, source.mode & permissionBits) != 0) {
        run.warn("the copy of \"" + path + "\" has other permissions: " + whyNot(errno));
    }
    const std::array times{timespec{0, UTIME_OMIT}, timeOf(source.modified)};
    if (::futimens(to, times.data()) != 0) {
        run.warn("the copy of \"" + path + "\" has another date: " + whyNot(errno));
    }
}

Expected<void> checkUnchanged(int file, const EntryStatus& before, const std::string& path) {
    const auto now = statEntry(file, "");
    if (!now) {
        return failed(now.error().code, path);
    }
    if (now->size != before.size || now->modified != before.modified ||
        now->fileID != before.fileID || now->device != before.device) {
        return Unexpected(errorWithPOSIXCode(EBUSY, "import what changes meanwhile,", path));
    }
    return {};
}

}  // namespace marrowdale::native
