#include "benchmarks/Peer.h"

#include <array>
#include <cstddef>
#include <cstdlib>
#include <fcntl.h>
#include <filesystem>
#include <spawn.h>
#include <sstream>
#include <stdexcept>
#include <sys/wait.h>
#include <unistd.h>

namespace marrowdale::benchmarks {
namespace {

// Starts it with standard output at `output`, which is closed here.
pid_t start(const std::vector<std::string>& arguments, int output) {
    std::vector<char*> pointers;
    for (const std::string& argument : arguments) {
        pointers.push_back(const_cast<char*>(argument.c_str()));  // as posix_spawn wants them
    }
    pointers.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
    pid_t process = 0;
    const int error =
        ::posix_spawnp(&process, pointers[0], &actions, nullptr, pointers.data(), environ);
    ::posix_spawn_file_actions_destroy(&actions);
    ::close(output);
    if (error != 0) {
        throw std::runtime_error("can't start " + arguments[0]);
    }
    return process;
}

void waitFor(pid_t process, const std::string& program) {
    int status = 0;
    if (::waitpid(process, &status, 0) != process || !WIFEXITED(status) ||
        WEXITSTATUS(status) != 0) {
        throw std::runtime_error(program + " failed");
    }
}

}  // namespace

Duration runPeer(const std::vector<std::string>& arguments) {
    return timed([&] {
        const pid_t process = start(arguments, ::open("/dev/null", O_WRONLY | O_CLOEXEC));
        waitFor(process, arguments[0]);
    });
}

bool hasPeer(const std::string& program) {
    const char* path = std::getenv("PATH");  // NOLINT(concurrency-mt-unsafe)
    std::istringstream folders(path == nullptr ? "" : path);
    for (std::string folder; std::getline(folders, folder, ':');) {
        if (::access(folder.append("/").append(program).c_str(), X_OK) == 0) {
            return true;
        }
    }
    return false;
}

std::vector<std::string> outputOf(const std::vector<std::string>& arguments) {
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        throw std::runtime_error("pipe");
    }
    const pid_t process = start(arguments, ends[1]);
    std::string text;
    std::array<char, 4096> buffer{};
    for (ssize_t size = 0; (size = ::read(ends[0], buffer.data(), buffer.size())) > 0;) {
        text.append(buffer.data(), static_cast<std::size_t>(size));
    }
    ::close(ends[0]);
    waitFor(process, arguments[0]);
    std::vector<std::string> lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) {
        lines.push_back(line);
    }
    return lines;
}

}  // namespace marrowdale::benchmarks
