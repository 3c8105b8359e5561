#pragma once

#include <array>
#include <cstdint>
#include <functional>
#include <stdexcept>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

// A process that does what it is asked, one thing at a time, for tests. It is made by fork, so what
// it does is limited to system calls and memory that was there before. Gone with the object.
class WatcherTestProcess {
  public:
    // `work` gets the number of the request and answers whether it went well.
    explicit WatcherTestProcess(const std::function<bool(std::uint8_t)>& work) {
        std::array<int, 2> ends{};
        if (::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends.data()) != 0) {
            throw std::runtime_error("socketpair");
        }
        socket_.reset(ends[0]);
        const UniqueFD theirs(ends[1]);
        process_ = ::fork();
        if (process_ < 0) {
            throw std::runtime_error("fork");
        }
        if (process_ == 0) {
            socket_.reset();
            serve(theirs.get(), work);
        }
    }
    WatcherTestProcess(const WatcherTestProcess&) = delete;
    WatcherTestProcess& operator=(const WatcherTestProcess&) = delete;
    ~WatcherTestProcess() {
        socket_.reset();
        ::waitpid(process_, nullptr, 0);
    }

    // True once it was done and went well.
    [[nodiscard]] bool ask(std::uint8_t request) const {
        std::uint8_t answer = 0;
        return ::write(socket_.get(), &request, 1) == 1 && ::read(socket_.get(), &answer, 1) == 1 &&
               answer == 1;
    }

  private:
    [[noreturn]] static void serve(int socket, const std::function<bool(std::uint8_t)>& work) {
        std::uint8_t request = 0;
        while (::read(socket, &request, 1) == 1) {
            const std::uint8_t answer = work(request) ? 1 : 0;
            if (::write(socket, &answer, 1) != 1) {
                break;
            }
        }
        ::_exit(0);
    }

    UniqueFD socket_;
    pid_t process_ = -1;
};

}  // namespace marrowdale::native
