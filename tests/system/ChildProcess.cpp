#include "tests/system/ChildProcess.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <fcntl.h>
#include <functional>
#include <poll.h>
#include <span>
#include <sys/wait.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace marrowdale::tests {

namespace {

using native::UniqueFD;

[[noreturn]] void fail(const char* what) {
    throw std::system_error(errno, std::generic_category(), what);
}

std::pair<UniqueFD, UniqueFD> makePipe() {
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        fail("pipe2");
    }
    return {UniqueFD(ends[0]), UniqueFD(ends[1])};
}

std::vector<char*> pointers(std::vector<std::string>& texts) {
    std::vector<char*> result;
    result.reserve(texts.size() + 1);
    for (std::string& text : texts) {
        result.push_back(text.data());
    }
    result.push_back(nullptr);
    return result;
}

// In the child, between fork and exec: nothing here allocates.
[[noreturn]] void becomeProgram(char* const* arguments, char* const* variables, const char* folder,
                                int output, int errors, std::span<const int> closed) {
    std::signal(SIGPIPE, SIG_DFL);
    if (::chdir(folder) == 0 && ::dup2(output, STDOUT_FILENO) >= 0 &&
        ::dup2(errors, STDERR_FILENO) >= 0) {
        for (const int descriptor : closed) {
            ::close(descriptor);
        }
        ::execve(arguments[0], arguments, variables);
    }
    ::_exit(127);
}

// Appends what there is; false at the end.
bool readSome(const UniqueFD& from, std::string& to) {
    std::array<char, 65536> buffer{};
    const ssize_t size = ::read(from.get(), buffer.data(), buffer.size());
    if (size > 0) {
        to.append(buffer.data(), static_cast<std::size_t>(size));
    }
    return size > 0;
}

// Appends until it is enough, the end has come, or the time is over.
void readUntil(const UniqueFD& from, std::string& to, std::chrono::milliseconds time,
               const std::function<bool()>& isEnough) {
    const auto deadline = std::chrono::steady_clock::now() + time;
    while (!isEnough()) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(
            deadline - std::chrono::steady_clock::now());
        pollfd waiting{from.get(), POLLIN, 0};
        if (left.count() < 0 || ::poll(&waiting, 1, static_cast<int>(left.count())) <= 0 ||
            !readSome(from, to)) {
            return;
        }
    }
}

}  // namespace

ChildProcess::ChildProcess(const ChildOptions& options, UniqueFD output) {
    std::vector<std::string> argumentTexts = options.arguments;
    std::vector<std::string> variableTexts;
    for (const auto& [name, value] : options.variables) {
        std::string& text = variableTexts.emplace_back(name);
        text += "=";
        text += value;
    }
    const auto arguments = pointers(argumentTexts);
    const auto variables = pointers(variableTexts);
    auto [outputReader, outputWriter] = makePipe();
    auto [errorReader, errorWriter] = makePipe();
    const int childOutput = output ? output.get() : outputWriter.get();
    const pid_t child = ::fork();
    if (child < 0) {
        fail("fork");
    }
    if (child == 0) {
        becomeProgram(arguments.data(), variables.data(), options.workingFolder.c_str(),
                      childOutput, errorWriter.get(), options.closedDescriptors);
    }
    process_ = child;
    output_ = std::move(outputReader);
    errors_ = std::move(errorReader);
}

ChildProcess::~ChildProcess() {
    if (process_ > 0) {
        kill();
        ::waitpid(process_, nullptr, 0);
    }
}

const std::string& ChildProcess::readOutput(std::size_t size, std::chrono::milliseconds time) {
    readUntil(output_, outputText_, time, [&] { return outputText_.size() >= size; });
    return outputText_;
}

const std::string& ChildProcess::readErrors(std::string_view wanted,
                                            std::chrono::milliseconds time) {
    readUntil(errors_, errorText_, time, [&] { return errorText_.contains(wanted); });
    return errorText_;
}

void ChildProcess::kill() const {
    ::kill(process_, SIGKILL);
}

ChildResult ChildProcess::finish() {
    bool outputIsOpen = static_cast<bool>(output_);
    bool errorsAreOpen = true;
    while (outputIsOpen || errorsAreOpen) {
        std::array<pollfd, 2> waiting{pollfd{outputIsOpen ? output_.get() : -1, POLLIN, 0},
                                      pollfd{errorsAreOpen ? errors_.get() : -1, POLLIN, 0}};
        if (::poll(waiting.data(), waiting.size(), -1) < 0) {
            continue;
        }
        if (waiting[0].revents != 0) {
            outputIsOpen = readSome(output_, outputText_);
        }
        if (waiting[1].revents != 0) {
            errorsAreOpen = readSome(errors_, errorText_);
        }
    }
    int status = 0;
    if (::waitpid(std::exchange(process_, -1), &status, 0) < 0) {
        fail("waitpid");
    }
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1,
            WIFSIGNALED(status) ? WTERMSIG(status) : 0, std::move(outputText_),
            std::move(errorText_)};
}

}  // namespace marrowdale::tests
