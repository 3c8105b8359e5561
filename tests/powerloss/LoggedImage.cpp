#include "tests/powerloss/LoggedImage.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <fcntl.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <system_error>
#include <unistd.h>
#include <utility>

#include <gtest/gtest.h>

#include "tests/powerloss/ImageServer.h"

namespace marrowdale::tests {

LoggedImage::LoggedImage(std::string folder, const MemoryFile& contents)
    : folder_(std::move(folder)), contents_(contents.copy()) {
    std::array<int, 2> pipe{};
    if (::pipe2(pipe.data(), O_CLOEXEC) != 0) {
        throw std::system_error(errno, std::generic_category(), "pipe");
    }
    native::UniqueFD reading(pipe[0]);
    native::UniqueFD writing(pipe[1]);
    // A process of its own, so that no thread which waits for the disk can keep the disk from
    // answering, even when this process is killed.
    server_ = ::fork();
    if (server_ < 0) {
        throw std::system_error(errno, std::generic_category(), "fork");
    }
    if (server_ == 0) {
        ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        // Memory for this process is never freed by writing to the disk that it serves.
        ::prctl(PR_SET_IO_FLUSHER, 1, 0, 0, 0);
        reading.reset();
        ::_exit(serveImage(folder_, contents_, log_, writing.get()));
    }
    writing.reset();
    char ready = 0;
    if (::read(reading.get(), &ready, 1) != 1) {
        ::waitpid(server_, nullptr, 0);
        throw std::system_error(ENODEV, std::generic_category(), "mount a FUSE file system");
    }
}

LoggedImage::~LoggedImage() {
    if (::umount2(folder_.c_str(), 0) != 0) {
        ADD_FAILURE() << "the image is still in use";
        ::kill(server_, SIGKILL);
        ::umount2(folder_.c_str(), MNT_DETACH);
    }
    ::waitpid(server_, nullptr, 0);
}

}  // namespace marrowdale::tests
