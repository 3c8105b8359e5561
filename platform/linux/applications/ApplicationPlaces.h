#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/services/ApplicationRegistry.h"

namespace marrowdale::native {

// A folder of desktop entries, which need not exist.
struct ApplicationFolder {
    std::string path;
    ApplicationKind kind = ApplicationKind::system;
    friend bool operator==(const ApplicationFolder&, const ApplicationFolder&) = default;
};

// Where applications are.
struct ApplicationPlaces {
    // What stands in an earlier folder hides what has the same identifier in a later one.
    std::vector<ApplicationFolder> folders;
    // Holds a folder for each application that keeps its data apart, named by its identifier; empty
    // where the user has no home.
    std::string containersFolder;
    // The user's language, as in "de_AT.UTF-8"; empty for the language that entries are written in.
    std::string locale;
};

// The places by the environment: $XDG_DATA_HOME (else ~/.local/share) and what Flatpak exports
// there for the user; $XDG_DATA_DIRS for the system, else /usr/local/share, /usr/share and what
// Flatpak exports for all. A folder counts once, where it is named first; relative paths are
// ignored, as the standard for these variables says. The language is LC_ALL's, LC_MESSAGES's or
// LANG's. `variable` answers none for what is unset or empty.
[[nodiscard]] ApplicationPlaces applicationPlacesFor(
    const std::function<std::optional<std::string>(std::string_view name)>& variable);

}  // namespace marrowdale::native
