#include "tests/powerloss/DiskFormat.h"

#include <cerrno>
#include <fcntl.h>
#include <ostream>
#include <spawn.h>
#include <sys/wait.h>
#include <system_error>
#include <unistd.h>

namespace marrowdale::tests {

namespace {

constexpr std::uint64_t megabyte = 1U << 20U;
constexpr std::size_t sectorSize = 512;
constexpr std::size_t blockSize = 4096;

void runQuietly(const std::vector<std::string>& words) {
    std::vector<std::string> copies = words;
    std::vector<char*> arguments;
    for (std::string& word : copies) {
        arguments.push_back(word.data());
    }
    arguments.push_back(nullptr);
    posix_spawn_file_actions_t files{};
    ::posix_spawn_file_actions_init(&files);
    ::posix_spawn_file_actions_addopen(&files, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
    ::posix_spawn_file_actions_addopen(&files, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
    pid_t process = -1;
    const int code =
        ::posix_spawnp(&process, arguments.front(), &files, nullptr, arguments.data(), environ);
    ::posix_spawn_file_actions_destroy(&files);
    int end = 0;
    if (code == 0) {
        ::waitpid(process, &end, 0);
    }
    if (code != 0 || end != 0) {
        throw std::system_error(code != 0 ? code : EIO, std::generic_category(), words.front());
    }
}

}  // namespace

MemoryFile DiskFormat::make() const {
    MemoryFile disk(size);
    std::vector<std::string> words = command;
    words.push_back(disk.path());
    runQuietly(words);
    disk.dropZeros();
    return disk;
}

void PrintTo(const DiskFormat& format, std::ostream* stream) {
    *stream << format.name;
}

std::vector<DiskFormat> diskFormats() {
    // Births need inodes of 256 bytes. Discards would not be logged, so there are none. btrfs has
    // no other copy to mount from than the 4 KiB that it takes to be written at once.
    return {
        {"ext4",
         {"mkfs.ext4", "-q", "-F", "-I", "256", "-E", "nodiscard,lazy_itable_init=0"},
         64 * megabyte,
         sectorSize,
         "nodiscard"},
        {"xfs", {"mkfs.xfs", "-q", "-f", "-K"}, 304 * megabyte, sectorSize, "nodiscard"},
        {"btrfs",
         {"mkfs.btrfs", "-q", "-f", "-K", "-m", "single", "-d", "single"},
         256 * megabyte,
         blockSize,
         "nodiscard"},
    };
}

}  // namespace marrowdale::tests
