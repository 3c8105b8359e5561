#pragma once

#include <expected>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/daemon/StartFailure.h"
#include "platform/foundation/Error.h"
#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale::host {

// How the program ends.
enum class ExitCode : int {
    done = 0,
    providerError = 1,  // also: the output could not be written
    wrongCommandLine = 2,
    couldNotStart = 3,
};

// What went wrong with a command, in the two forms in which it is told.
struct Failure {
    ExitCode exitCode = ExitCode::providerError;
    std::string domain;
    int code = 0;
    std::string name;     // the kind, for machines: "noSuchItem", "posix", …
    std::string message;  // one line for people; may hold any bytes
    // What the kind brings along: "itemIdentifier", or "path" where somebody named one, and so on.
    std::vector<std::pair<std::string, std::string>> details;
    FileProviderItemPtr item = nullptr;  // the one in the way, where a name was taken

    // An answer of the provider.
    [[nodiscard]] static Failure provider(const Error& error);
    // The provider serves nothing at a path, which is told as it was typed.
    [[nodiscard]] static Failure nothingAt(std::string_view path);
    [[nodiscard]] static Failure commandLine(std::string message);
    [[nodiscard]] static Failure start(const StartFailure& failure);
    // Standard output could not be written.
    [[nodiscard]] static Failure output(int code);

    // {"error": {…}} without a newline.
    [[nodiscard]] std::string json() const;
    // "marrowdale: …" without a newline, harmless on a terminal.
    [[nodiscard]] std::string line() const;
};

// What a command ends with.
using Outcome = std::expected<void, Failure>;

}  // namespace marrowdale::host
