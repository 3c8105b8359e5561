#pragma once

#include <chrono>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <sys/types.h>
#include <vector>

#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::tests {

// How a program is started. The environment is exactly `variables`.
struct ChildOptions {
    std::vector<std::string> arguments;  // the program's path first
    std::map<std::string, std::string> variables;
    std::string workingFolder = "/";
    std::vector<int> closedDescriptors;  // that it is started without
};

// What a program left behind.
struct ChildResult {
    int exitCode = -1;  // -1 when a signal ended it
    int signal = 0;
    std::string output;
    std::string errors;
};

// A program that runs, its standard output and error in pipes. One that is still running when the
// object goes is killed. Where the system refuses, std::system_error fails the test.
class ChildProcess {
  public:
    // `output`: where standard output goes, instead of a pipe.
    explicit ChildProcess(const ChildOptions& options, native::UniqueFD output = {});
    ~ChildProcess();
    ChildProcess(const ChildProcess&) = delete;
    ChildProcess& operator=(const ChildProcess&) = delete;

    // Reads standard output until `size` bytes have come in all, it ends, or the time is over;
    // answers all that has come so far.
    const std::string& readOutput(std::size_t size, std::chrono::milliseconds time);
    // Closes the reading end of standard output.
    void closeOutput() { output_.reset(); }
    // The same for standard error, until `wanted` has come.
    const std::string& readErrors(std::string_view wanted, std::chrono::milliseconds time);
    [[nodiscard]] pid_t number() const { return process_; }
    void kill() const;
    // Reads both to their ends and waits.
    [[nodiscard]] ChildResult finish();

  private:
    pid_t process_ = -1;
    native::UniqueFD output_;
    native::UniqueFD errors_;
    std::string outputText_;
    std::string errorText_;
};

[[nodiscard]] inline ChildResult runChild(const ChildOptions& options) {
    return ChildProcess(options).finish();
}

}  // namespace marrowdale::tests
