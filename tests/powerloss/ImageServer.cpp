#include "tests/powerloss/ImageServer.h"

#define FUSE_USE_VERSION 31
#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <fuse.h>
#include <sched.h>
#include <span>
#include <string_view>
#include <sys/mount.h>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>

namespace marrowdale::tests {

namespace {

constexpr std::string_view imagePath = "/image";
constexpr double forEver = 1e6;  // seconds: the kernel need not ask again

struct Served {
    MemoryFile& contents;
    WriteLog& log;
};

Served& served() {
    return *static_cast<Served*>(::fuse_get_context()->private_data);
}

// No exception may cross the library.
template <typename Work>
int answering(const Work& work) {
    try {
        return work();
    } catch (const std::system_error& error) {
        return -error.code().value();
    }
}

void* begin(fuse_conn_info* /*connection*/, fuse_config* config) {
    config->kernel_cache = 1;
    config->entry_timeout = forEver;
    config->attr_timeout = forEver;
    return ::fuse_get_context()->private_data;
}

int lookAt(const char* path, struct stat* status, fuse_file_info* /*file*/) {
    *status = {};
    if (std::string_view(path) == "/") {
        status->st_mode = S_IFDIR | 0700;
        status->st_nlink = 2;
        return 0;
    }
    if (path != imagePath) {
        return -ENOENT;
    }
    status->st_mode = S_IFREG | 0600;
    status->st_nlink = 1;
    status->st_size = static_cast<off_t>(served().contents.size());
    return 0;
}

int open(const char* path, fuse_file_info* /*file*/) {
    return path == imagePath ? 0 : -ENOENT;
}

int read(const char* /*path*/, char* into, std::size_t size, off_t offset,
         fuse_file_info* /*file*/) {
    return answering([&] {
        const auto at = static_cast<std::uint64_t>(offset);
        const std::uint64_t end = served().contents.size();
        const std::size_t there = at < end ? std::min<std::uint64_t>(size, end - at) : 0;
        served().contents.read(std::as_writable_bytes(std::span(into, there)), at);
        return static_cast<int>(there);
    });
}

int write(const char* /*path*/, const char* from, std::size_t size, off_t offset,
          fuse_file_info* /*file*/) {
    return answering([&] {
        const auto bytes = std::as_bytes(std::span(from, size));
        if (static_cast<std::uint64_t>(offset) + size > served().contents.size()) {
            return -ENOSPC;
        }
        served().contents.write(bytes, static_cast<std::uint64_t>(offset));
        served().log.addWrite(bytes, static_cast<std::uint64_t>(offset));
        return static_cast<int>(size);
    });
}

int sync(const char* /*path*/, int /*dataOnly*/, fuse_file_info* /*file*/) {
    return answering([] {
        served().log.addFlush();
        return 0;
    });
}

fuse_operations operations() {
    fuse_operations made{};
    made.init = begin;
    made.getattr = lookAt;
    made.open = open;
    made.read = read;
    made.write = write;
    made.fsync = sync;
    return made;
}

}  // namespace

int serveImage(const std::string& folder, MemoryFile& contents, WriteLog& log, int ready) {
    Served here{contents, log};
    std::string name = "image";
    std::array<char*, 2> arguments{name.data(), nullptr};
    fuse_args options = FUSE_ARGS_INIT(1, arguments.data());
    const fuse_operations calls = operations();
    fuse* const system = ::fuse_new(&options, &calls, sizeof calls, &here);
    if (system == nullptr || ::fuse_mount(system, folder.c_str()) != 0) {
        return 1;
    }
    // The mount is the caller's alone: when all is killed, its namespace goes while this process
    // still answers, and not with this process, which would then wait for itself.
    if (::unshare(CLONE_NEWNS) != 0 || ::umount2(folder.c_str(), MNT_DETACH) != 0) {
        return 1;
    }
    int result = 1;
    if (::write(ready, "r", 1) == 1) {
        result = ::fuse_loop(system) == 0 ? 0 : 1;
    }
    ::fuse_unmount(system);
    ::fuse_destroy(system);
    return result;
}

}  // namespace marrowdale::tests
