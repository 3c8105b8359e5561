#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "host/daemon/Environment.h"
#include "host/daemon/StartFailure.h"

namespace marrowdale::host {

// What the command line says about where things are; none where it says nothing.
struct SettingsOptions {
    std::optional<std::string> root;
    std::optional<std::string> state;
};

// Where a provider's things are. Paths are absolute.
struct Settings {
    std::string rootPath;     // without links; a folder that can be read
    std::string stateFolder;  // may be missing yet
    std::string cacheFolder;  // may be missing yet; empty where there is no home folder
    std::string dataHome =
        {};  // what programs keep for the user; in the state folder without a home
};

// The trash lies below a folder named "Documents"; under a root of another name there is none.
[[nodiscard]] bool hasTrash(std::string_view rootPath);

// Where the storage root is, decided from the options, then MARROWDALE_ROOT, then $HOME/Documents,
// which is made when it is missing; nothing else is made or changed.
//
// Fails for a root that is missing, no folder, or unreadable, and for one that lies below a folder
// named "Documents" (trashing an item would take it out of the root).
[[nodiscard]] Started<std::string> rootPathFor(const SettingsOptions& options,
                                               const Environment& environment);

// Where the state is kept, whatever the root is: decided from the options, then MARROWDALE_STATE,
// then the folder that a Linux desktop has for it ($XDG_STATE_HOME, else $HOME/.local/state).
// Relative values of the XDG variables are ignored, as their standard says.
[[nodiscard]] Started<std::string> stateFolderFor(const SettingsOptions& options,
                                                  const Environment& environment);

// All of them; the cache folder is that of a Linux desktop. Fails as those above do.
[[nodiscard]] Started<Settings> settingsFor(const SettingsOptions& options,
                                            const Environment& environment);

}  // namespace marrowdale::host
