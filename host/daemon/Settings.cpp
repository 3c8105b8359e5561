#include "host/daemon/Settings.h"

#include <cerrno>
#include <cstdlib>
#include <fcntl.h>
#include <memory>
#include <string_view>
#include <sys/stat.h>
#include <unistd.h>

#include "host/requests/HarmlessText.h"

namespace marrowdale::host {

namespace {

using namespace std::string_view_literals;

constexpr std::string_view documents = "Documents";

std::string quoted(std::string_view path) {
    return "\"" + harmlessLine(path) + "\"";
}

// The folder that an XDG variable names, or its place below the home folder; none without both.
std::optional<std::string> folderOf(const Environment& environment, std::string_view variable,
                                    std::string_view belowHome) {
    auto value = environment.variable(variable);
    if (value && value->starts_with('/')) {
        return value;
    }
    const auto home = environment.variable("HOME");
    if (!home) {
        return std::nullopt;
    }
    return environment.absolutePath(*home) + "/" + std::string(belowHome);
}

Started<std::string> defaultRoot(const Environment& environment) {
    const auto home = environment.variable("HOME");
    if (!home) {
        return std::unexpected(StartFailure::refusal(
            "HOME is not set; name the storage root with --root or MARROWDALE_ROOT"));
    }
    std::string root = environment.absolutePath(*home) + "/" + std::string(documents);
    if (::mkdir(root.c_str(), 0777) != 0 && errno != EEXIST) {
        return std::unexpected(StartFailure::system(errno, "can't make " + quoted(root)));
    }
    return root;
}

Started<std::string> askedRoot(const SettingsOptions& options, const Environment& environment) {
    if (options.root) {
        return environment.absolutePath(*options.root);
    }
    if (const auto value = environment.variable("MARROWDALE_ROOT")) {
        return environment.absolutePath(*value);
    }
    return defaultRoot(environment);
}

Started<std::string> withoutLinks(const std::string& path) {
    struct Free {
        // NOLINTNEXTLINE(cppcoreguidelines-no-malloc): realpath allocates with malloc
        void operator()(char* text) const { std::free(text); }
    };
    const std::unique_ptr<char, Free> resolved(::realpath(path.c_str(), nullptr));
    if (!resolved) {
        return std::unexpected(
            StartFailure::system(errno, "can't serve the storage root " + quoted(path)));
    }
    return std::string(resolved.get());
}

// The number of the error that keeps the folder from being listed; 0 when nothing does.
int obstacleToReading(const std::string& path) {
    const int descriptor = ::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (descriptor < 0) {
        return errno;
    }
    ::close(descriptor);
    return ::faccessat(AT_FDCWD, path.c_str(), R_OK | X_OK, AT_EACCESS) == 0 ? 0 : errno;
}

bool liesBelowDocuments(std::string_view path) {
    const std::string_view above = path.substr(0, path.rfind('/'));
    return (std::string(above) + "/").contains("/Documents/"sv);
}

Started<std::string> servableRoot(const std::string& asked) {
    Started<std::string> root = withoutLinks(asked);
    if (!root) {
        return root;
    }
    if (const int code = obstacleToReading(*root); code != 0) {
        return std::unexpected(
            StartFailure::system(code, "can't read the storage root " + quoted(*root)));
    }
    if (liesBelowDocuments(*root)) {
        return std::unexpected(StartFailure::refusal(
            "can't serve the storage root " + quoted(*root) +
            ": it lies below another folder named \"Documents\", where its trash would be"));
    }
    return root;
}

}  // namespace

bool hasTrash(std::string_view rootPath) {
    return rootPath.substr(rootPath.rfind('/') + 1) == documents;
}

Started<std::string> rootPathFor(const SettingsOptions& options, const Environment& environment) {
    Started<std::string> asked = askedRoot(options, environment);
    return asked ? servableRoot(*asked) : asked;
}

Started<std::string> stateFolderFor(const SettingsOptions& options,
                                    const Environment& environment) {
    if (options.state) {
        return environment.absolutePath(*options.state);
    }
    if (const auto value = environment.variable("MARROWDALE_STATE")) {
        return environment.absolutePath(*value);
    }
    if (const auto folder = folderOf(environment, "XDG_STATE_HOME", ".local/state")) {
        return *folder + "/marrowdale";
    }
    return std::unexpected(StartFailure::refusal(
        "HOME is not set; say where the state is kept with --state or MARROWDALE_STATE"));
}

Started<Settings> settingsFor(const SettingsOptions& options, const Environment& environment) {
    Started<std::string> root = rootPathFor(options, environment);
    if (!root) {
        return std::unexpected(std::move(root.error()));
    }
    Started<std::string> state = stateFolderFor(options, environment);
    if (!state) {
        return std::unexpected(std::move(state.error()));
    }
    const auto cache = folderOf(environment, "XDG_CACHE_HOME", ".cache");
    const auto data = folderOf(environment, "XDG_DATA_HOME", ".local/share");
    return Settings{*root, *state, cache ? *cache + "/marrowdale" : "",
                    data ? *data : *state + "/data"};
}

}  // namespace marrowdale::host
