#include <csignal>
#include <exception>
#include <iostream>
#include <span>
#include <unistd.h>

#include "host/cli/CommandLine.h"
#include "host/cli/StandardDescriptors.h"

namespace {

int run(int count, char** arguments) {
    using namespace marrowdale::host;
    // A reader that goes away early is seen when writing, so that the store is closed in order.
    std::signal(SIGPIPE, SIG_IGN);
    const Environment environment = Environment::ofProcess();
    Output output(STDOUT_FILENO);
    const std::span<const char* const> all(arguments, static_cast<std::size_t>(count));
    return static_cast<int>(CommandLine(environment, output).run(all.subspan(count > 0 ? 1 : 0)));
}

}  // namespace

int main(int count, char** arguments) {
    if (!marrowdale::host::fillStandardDescriptors()) {
        return static_cast<int>(marrowdale::host::ExitCode::couldNotStart);
    }
    try {
        return run(count, arguments);
    } catch (const std::exception& error) {
        std::cerr << "marrowdale: " << error.what() << '\n';
        return static_cast<int>(marrowdale::host::ExitCode::providerError);
    }
}
