#include "benchmarks/Floor.h"

#include <array>
#include <cerrno>
#include <climits>
#include <cstddef>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <memory>
#include <span>
#include <string_view>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/xattr.h>
#include <system_error>
#include <unistd.h>

namespace marrowdale::benchmarks {
namespace {

constexpr long getxattratNumber = 464;
constexpr long listxattratNumber = 465;
constexpr int statxFlags = AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT | AT_STATX_DONT_SYNC;
constexpr unsigned statxMask = STATX_BASIC_STATS | STATX_BTIME;

struct AttributeArguments {  // struct xattr_args of linux/xattr.h, Linux 6.13
    std::uint64_t value;
    std::uint32_t size;
    std::uint32_t flags;
};

[[noreturn]] void fail(const char* operation) {
    throw std::system_error(errno, std::generic_category(), operation);
}

class Walk {
  public:
    explicit Walk(FloorCalls calls) : calls_(calls) {}

    void listFolder(int descriptor) {
        if (calls_ == FloorCalls::attributesByCurrentFolder && ::fchdir(descriptor) != 0) {
            fail("fchdir");
        }
        const auto buffer = std::make_unique_for_overwrite<std::byte[]>(bufferSize);
        std::vector<std::string> subfolders;
        for (;;) {
            const long filled = ::syscall(SYS_getdents64, descriptor, buffer.get(), bufferSize);
            if (filled < 0) {
                fail("getdents64");
            }
            if (filled == 0) {
                break;
            }
            lookAtAll({buffer.get(), static_cast<std::size_t>(filled)}, descriptor, subfolders);
        }
        for (const std::string& name : subfolders) {
            const int below =
                ::openat(descriptor, name.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
            if (below < 0) {
                fail("openat");
            }
            listFolder(below);
            ::close(below);
        }
    }

    [[nodiscard]] const FloorCount& count() const { return count_; }

  private:
    static constexpr std::size_t bufferSize = std::size_t{64} << 10U;

    void lookAtAll(std::span<const std::byte> entries, int descriptor,
                   std::vector<std::string>& subfolders) {
        while (!entries.empty()) {
            const auto* entry = reinterpret_cast<const dirent64*>(entries.data());
            const std::string_view name = entry->d_name;
            if (name != "." && name != "..") {
                lookAt(descriptor, entry->d_name);
                if (entry->d_type == DT_DIR) {
                    subfolders.emplace_back(name);
                }
            }
            entries = entries.subspan(entry->d_reclen);
        }
    }

    void lookAt(int descriptor, const char* name) {
        struct statx status{};
        if (::statx(descriptor, name, statxFlags, statxMask, &status) != 0) {
            fail("statx");
        }
        ++count_.entries;
        count_.checksum += status.stx_ino;
        if (calls_ != FloorCalls::statusOnly) {
            readAttributes(descriptor, name);
        }
    }

    void readAttributes(int descriptor, const char* name) {
        const long filled = calls_ == FloorCalls::attributesByFolderHandle
                                ? ::syscall(listxattratNumber, descriptor, name,
                                            AT_SYMLINK_NOFOLLOW, names_.data(), names_.size())
                                : ::llistxattr(name, names_.data(), names_.size());
        if (filled < 0) {
            fail("listxattr");
        }
        const char* end = names_.data() + filled;
        for (const char* attribute = names_.data(); attribute < end;
             attribute += std::strlen(attribute) + 1) {
            readAttribute(descriptor, name, attribute);
        }
    }

    void readAttribute(int descriptor, const char* name, const char* attribute) {
        AttributeArguments arguments{.value = reinterpret_cast<std::uint64_t>(value_.data()),
                                     .size = static_cast<std::uint32_t>(value_.size()),
                                     .flags = 0};
        const long size = calls_ == FloorCalls::attributesByFolderHandle
                              ? ::syscall(getxattratNumber, descriptor, name, AT_SYMLINK_NOFOLLOW,
                                          attribute, &arguments, sizeof arguments)
                              : ::lgetxattr(name, attribute, value_.data(), value_.size());
        if (size < 0) {
            fail("getxattr");
        }
        ++count_.attributes;
        count_.checksum += static_cast<std::uint64_t>(size);
    }

    FloorCalls calls_;
    FloorCount count_;
    std::array<char, 65536> names_{};
    std::array<char, 65536> value_{};
};

}  // namespace

FloorCount floorListing(const std::string& folder, FloorCalls calls) {
    const int before = ::open(".", O_PATH | O_CLOEXEC);
    const int descriptor = ::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (descriptor < 0 || before < 0) {
        fail("open");
    }
    const auto walk = std::make_unique<Walk>(calls);
    walk->listFolder(descriptor);
    ::close(descriptor);
    if (::fchdir(before) != 0) {
        fail("fchdir");
    }
    ::close(before);
    return walk->count();
}

bool kernelHasAttributesByFolderHandle() {
    std::array<char, 1024> names{};
    return ::syscall(listxattratNumber, AT_FDCWD, "/", 0, names.data(), names.size()) >= 0 ||
           errno != ENOSYS;
}

FloorHandles::FloorHandles(const std::string& mountedFolder, const std::vector<std::string>& paths)
    : mount_(::open(mountedFolder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC)) {
    if (mount_ < 0) {
        fail("open");
    }
    handles_.reserve(paths.size());
    for (const std::string& path : paths) {
        std::vector<char> bytes(sizeof(file_handle) + MAX_HANDLE_SZ);
        auto* handle = reinterpret_cast<file_handle*>(bytes.data());
        handle->handle_bytes = MAX_HANDLE_SZ;
        int mountID = 0;
        if (::name_to_handle_at(AT_FDCWD, path.c_str(), handle, &mountID, 0) != 0) {
            fail("name_to_handle_at");
        }
        handles_.push_back(std::move(bytes));
    }
}

FloorHandles::~FloorHandles() {
    ::close(mount_);
}

std::uint64_t FloorHandles::readAllPaths() const {
    std::uint64_t bytes = 0;
    std::array<char, PATH_MAX> path{};
    for (const std::vector<char>& handle : handles_) {
        auto* copy = const_cast<char*>(handle.data());  // the kernel only reads it
        const int descriptor = ::open_by_handle_at(mount_, reinterpret_cast<file_handle*>(copy),
                                                   O_PATH | O_CLOEXEC | O_NOFOLLOW);
        if (descriptor < 0) {
            fail("open_by_handle_at");
        }
        const std::string link = "/proc/self/fd/" + std::to_string(descriptor);
        const ssize_t size = ::readlink(link.c_str(), path.data(), path.size());
        if (size < 0) {
            fail("readlink");
        }
        bytes += static_cast<std::uint64_t>(size);
        ::close(descriptor);
    }
    return bytes;
}

std::uint64_t floorStatus(const std::vector<std::string>& paths) {
    std::uint64_t checksum = 0;
    for (const std::string& path : paths) {
        struct statx status{};
        if (::statx(AT_FDCWD, path.c_str(), statxFlags, statxMask, &status) != 0) {
            fail("statx");
        }
        checksum += status.stx_ino;
    }
    return checksum;
}

}  // namespace marrowdale::benchmarks
