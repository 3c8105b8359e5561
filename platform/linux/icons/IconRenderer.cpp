#include "platform/linux/icons/IconRenderer.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>

#include "platform/linux/files/UniqueFD.h"
#include "platform/linux/icons/CachedBitmap.h"
#include "platform/linux/icons/RenderProtocol.h"

namespace marrowdale::native {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t readBytes = std::size_t{64} << 10U;
constexpr std::size_t largestAnswer =
    std::size_t{4} * largestBitmapSide * largestBitmapSide + std::size_t{64};

Unexpected failed(int code, const std::string& path) {
    return Unexpected(errorWithPOSIXCode(code, "draw", path));
}

Expected<UniqueFD> openedPicture(const std::string& path) {
    UniqueFD file(::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    struct stat status{};
    if (!file || ::fstat(file.get(), &status) != 0) {
        return failed(errno, path);
    }
    if (!S_ISREG(status.st_mode)) {
        return failed(EINVAL, path);
    }
    if (static_cast<std::size_t>(status.st_size) > IconRenderer::largestFile) {
        return failed(EFBIG, path);
    }
    return file;
}

// A child that was started; ended, by force if need be, when this goes.
class Child {
  public:
    explicit Child(pid_t process) : process_(process) {}
    Child(const Child&) = delete;
    Child& operator=(const Child&) = delete;
    ~Child() {
        if (process_ > 0) {
            ::kill(process_, SIGKILL);
            (void)wait();
        }
    }
    // Its exit code; -1 when a signal ended it.
    int wait() {
        int status = 0;
        while (::waitpid(process_, &status, 0) < 0 && errno == EINTR) {
        }
        process_ = -1;
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

  private:
    pid_t process_;
};

struct FileActions {
    FileActions() { ::posix_spawn_file_actions_init(&actions); }
    ~FileActions() { ::posix_spawn_file_actions_destroy(&actions); }
    FileActions(const FileActions&) = delete;
    FileActions& operator=(const FileActions&) = delete;
    posix_spawn_file_actions_t actions{};
};

// The answer's pipe, and who writes into it. No environment: pictures need none.
struct Started {
    pid_t process = -1;
    UniqueFD answer;
};
Expected<Started> start(const std::string& program, int picture, unsigned pixels,
                        IconRenderer::Enlarging enlarging) {
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        return failed(errno, program);
    }
    Started started{-1, UniqueFD(ends[0])};
    const UniqueFD writing(ends[1]);
    FileActions files;
    ::posix_spawn_file_actions_adddup2(&files.actions, picture, STDIN_FILENO);
    ::posix_spawn_file_actions_adddup2(&files.actions, writing.get(), STDOUT_FILENO);
    ::posix_spawn_file_actions_addopen(&files.actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
    std::string name = "marrowdale-render-icon";
    std::string size = std::to_string(pixels);
    std::string mode(enlarging == IconRenderer::Enlarging::yes ? renderEnlarging : renderExact);
    std::array<char*, 4> arguments{name.data(), size.data(), mode.data(), nullptr};
    std::array<char*, 1> environment{nullptr};
    const int code = ::posix_spawn(&started.process, program.c_str(), &files.actions, nullptr,
                                   arguments.data(), environment.data());
    if (code != 0) {
        return failed(code, program);
    }
    return started;
}

// Everything up to the end of the pipe.
Expected<Bytes> readAnswer(int answer, Clock::time_point deadline, const std::string& path) {
    Bytes bytes;
    for (;;) {
        const auto left =
            std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now());
        pollfd wait{answer, POLLIN, 0};
        const int ready = left.count() > 0 ? ::poll(&wait, 1, static_cast<int>(left.count())) : 0;
        if (ready < 0 && errno == EINTR) {
            continue;
        }
        if (ready <= 0) {
            return failed(ready == 0 ? ETIMEDOUT : errno, path);
        }
        const std::size_t filled = bytes.size();
        bytes.resize(filled + readBytes);
        const ssize_t got = ::read(answer, bytes.data() + filled, readBytes);
        bytes.resize(filled + (got > 0 ? static_cast<std::size_t>(got) : 0));
        if (got == 0) {
            return bytes;
        }
        if ((got < 0 && errno != EINTR) || bytes.size() > largestAnswer) {
            return failed(got < 0 ? errno : EFBIG, path);
        }
    }
}

}  // namespace

IconRenderer::IconRenderer(std::string program, std::chrono::milliseconds deadline)
    : program_(std::move(program)), deadline_(deadline) {}

Expected<Data> IconRenderer::render(const std::string& path, unsigned pixels,
                                    Enlarging enlarging) const {
    const auto deadline = Clock::now() + deadline_;
    const auto picture = openedPicture(path);
    if (!picture) {
        return Unexpected(picture.error());
    }
    const auto started = start(program_, picture->get(), pixels, enlarging);
    if (!started) {
        return Unexpected(started.error());
    }
    Child child(started->process);
    auto bytes = readAnswer(started->answer.get(), deadline, path);
    if (!bytes) {
        return Unexpected(bytes.error());
    }
    const int code = child.wait();
    if (code == renderTooSmall) {
        return failed(ERANGE, path);
    }
    Data data(*std::move(bytes));
    const auto image = code == 0 ? imageWithCachedBitmap(data) : failed(EINVAL, path);
    if (!image || image->width != pixels || image->height != pixels) {
        return failed(EINVAL, path);
    }
    return data;
}

}  // namespace marrowdale::native
