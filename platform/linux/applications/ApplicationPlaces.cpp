#include "platform/linux/applications/ApplicationPlaces.h"

#include <algorithm>
#include <utility>

namespace marrowdale::native {

namespace {

using Variable = std::function<std::optional<std::string>(std::string_view)>;

constexpr std::string_view flatpakOfTheSystem = "/var/lib/flatpak/exports/share";

bool isAbsolute(std::string_view path) {
    return path.starts_with('/');
}

std::optional<std::string> absoluteFolder(const Variable& variable, std::string_view name) {
    auto folder = variable(name);
    return folder && isAbsolute(*folder) ? std::move(folder) : std::nullopt;
}

std::optional<std::string> dataHome(const Variable& variable) {
    if (auto folder = absoluteFolder(variable, "XDG_DATA_HOME")) {
        return folder;
    }
    const auto home = absoluteFolder(variable, "HOME");
    return home ? std::optional(*home + "/.local/share") : std::nullopt;
}

std::vector<std::string> dataFoldersOfTheSystem(const Variable& variable) {
    const auto listed = variable("XDG_DATA_DIRS");
    if (!listed) {
        return {"/usr/local/share", "/usr/share", std::string(flatpakOfTheSystem)};
    }
    std::vector<std::string> folders;
    std::string_view rest = *listed;
    while (!rest.empty()) {
        const auto end = std::min(rest.find(':'), rest.size());
        if (isAbsolute(rest.substr(0, end))) {
            folders.emplace_back(rest.substr(0, end));
        }
        rest.remove_prefix(std::min(end + 1, rest.size()));
    }
    return folders;
}

std::string localeOf(const Variable& variable) {
    for (const std::string_view name : {"LC_ALL", "LC_MESSAGES", "LANG"}) {
        if (auto locale = variable(name)) {
            const bool isNone = *locale == "C" || *locale == "POSIX" || locale->starts_with("C.");
            return isNone ? std::string() : *std::move(locale);
        }
    }
    return {};
}

void addFolder(std::vector<ApplicationFolder>& folders, std::string path, ApplicationKind kind) {
    while (path.size() > 1 && path.ends_with('/')) {
        path.pop_back();
    }
    path += "/applications";
    if (std::ranges::find(folders, path, &ApplicationFolder::path) == folders.end()) {
        folders.push_back({std::move(path), kind});
    }
}

}  // namespace

ApplicationPlaces applicationPlacesFor(const Variable& variable) {
    ApplicationPlaces places;
    if (const auto home = dataHome(variable)) {
        addFolder(places.folders, *home, ApplicationKind::user);
        addFolder(places.folders, *home + "/flatpak/exports/share", ApplicationKind::user);
    }
    for (std::string& folder : dataFoldersOfTheSystem(variable)) {
        addFolder(places.folders, std::move(folder), ApplicationKind::system);
    }
    if (const auto home = absoluteFolder(variable, "HOME")) {
        places.containersFolder = *home + "/.var/app";
    }
    places.locale = localeOf(variable);
    return places;
}

}  // namespace marrowdale::native
