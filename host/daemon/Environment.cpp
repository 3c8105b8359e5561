#include "host/daemon/Environment.h"

#include <cstdlib>
#include <memory>
#include <unistd.h>

namespace marrowdale::host {

namespace {

std::string currentFolder() {
    struct Free {
        // NOLINTNEXTLINE(cppcoreguidelines-no-malloc): getcwd allocates with malloc
        void operator()(char* text) const { std::free(text); }
    };
    // NOLINTNEXTLINE(clang-analyzer-unix.StdCLibraryFunctions): without room it makes its own
    const std::unique_ptr<char, Free> folder(::getcwd(nullptr, 0));
    // A working folder outside the process's root is told as "(unreachable)/…".
    return folder && *folder == '/' ? std::string(folder.get()) : "/";
}

}  // namespace

Environment::Environment(std::map<std::string, std::string, std::less<>> variables,
                         std::string workingFolder)
    : variables_(std::move(variables)), workingFolder_(std::move(workingFolder)) {}

Environment Environment::ofProcess() {
    std::map<std::string, std::string, std::less<>> variables;
    for (char** entry = ::environ; entry != nullptr && *entry != nullptr; ++entry) {
        const std::string_view text(*entry);
        const auto equals = text.find('=');
        if (equals != std::string_view::npos) {
            variables.emplace(text.substr(0, equals), text.substr(equals + 1));
        }
    }
    return {std::move(variables), currentFolder()};
}

std::optional<std::string> Environment::variable(std::string_view name) const {
    const auto found = variables_.find(name);
    if (found == variables_.end() || found->second.empty()) {
        return std::nullopt;
    }
    return found->second;
}

std::string Environment::absolutePath(std::string_view path) const {
    if (path.starts_with('/')) {
        return std::string(path);
    }
    std::string absolute = workingFolder_;
    if (!absolute.ends_with('/')) {
        absolute += '/';
    }
    return absolute.append(path);
}

}  // namespace marrowdale::host
